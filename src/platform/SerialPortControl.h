#pragma once

#include <QByteArray>
#include <QObject>
#include <QString>

// The serial side of a session when it is a real (or pty) serial device.
// The session drives it only through these operations so that tests can put
// a double in its place.
class SerialPortControl : public QObject
{
    Q_OBJECT
public:
    // Handshaking values.
    enum Handshaking { NoHandshaking = 0, XonXoff = 1, RtsCts = 2 };

    using QObject::QObject;
    ~SerialPortControl() override = default;

    // COMn, 1..256 (other numbers are accepted and fail at open()).
    virtual void setPortNumber(int number) = 0;
    virtual int portNumber() const = 0;
    // "baud,parity,data,stop", e.g. "19200,E,7,2"; parity N E O M S, stop
    // bits 1, 1.5 or 2. Takes effect at once on an open port. Returns false
    // (and keeps the old settings) when the text or the device refuses it.
    virtual bool setSettings(const QString &settings) = 0;
    virtual QString settings() const = 0;
    virtual void setHandshaking(int handshaking) = 0;
    virtual int handshaking() const = 0;
    virtual void setInBufferSize(int bytes) = 0;
    virtual void setOutBufferSize(int bytes) = 0;

    // PortOpen = true / false / read back. open() returns false and sets
    // errorString() when the device cannot be opened or configured.
    virtual bool open() = 0;
    virtual void close() = 0;
    virtual bool isOpen() const = 0;
    virtual QString errorString() const = 0;

    virtual qint64 inBufferCount() const = 0;
    virtual void discardInput() = 0;
    // Takes up to maxBytes received bytes (all of them when maxBytes < 0).
    virtual QByteArray input(qint64 maxBytes = -1) = 0;
    // The transmit queue: its capacity and how much of it is still unsent.
    virtual int outBufferSize() const = 0;
    virtual int outBufferCount() const = 0;
    // Queues the bytes for transmission.
    virtual void output(const QByteArray &bytes) = 0;

Q_SIGNALS:
    // Raised when data has arrived.
    void commEventRaised();
    // Queued bytes went out to the device: the transmit queue has room.
    void outputWritten();
    // The device failed while open (unplugged adapter, closed pty): the
    // port has been closed and errorString() says why.
    void deviceLost(const QString &description);
};
