#pragma once

#include <QByteArray>
#include <QObject>
#include <QString>

// A virtual COM port: a port that local applications open like a serial
// device while the session holds the other end. The session drives it only
// through these operations so that tests can put a double in its place.
class VirtualPortControl : public QObject
{
    Q_OBJECT
public:
    using QObject::QObject;
    ~VirtualPortControl() override = default;

    // Creates the port under a name such as "COM5". False when it cannot be
    // made; errorString() then says why.
    virtual bool createPort(const QString &name) = 0;
    // Removes the session's port. True when no port of this session exists
    // afterwards (also when there was none).
    virtual bool removePort() = 0;
    // The two set-up calls made right after a successful creation.
    virtual void setStrictBaudrate(bool on) = 0;
    virtual void setSignalEvents(bool on) = 0;

    // True while a local application holds the port open.
    virtual bool isOpenedByApplication() const = 0;
    // Bytes the application has written that can be read now.
    virtual qint64 available() const = 0;
    virtual QByteArray read(qint64 maxBytes) = 0;
    // Writes the bytes to the application; returns how many were taken.
    virtual qint64 write(const QByteArray &bytes) = 0;
    virtual void discardInput() = 0;
    virtual QString errorString() const = 0;

Q_SIGNALS:
    // The application has written data.
    void dataReceived();
    // An application opened (true) or closed (false) the port.
    void openedOrClosed(bool opened);
};
