#pragma once

#include "SerialPortControl.h"
#include "SerialSettingsText.h"

#include <QSerialPort>

class PortMap;

// SerialPortControl over QSerialPort. COMn is looked up in the port map
// (the [Ports] section), so any tty, including a pty slave, can stand in.
class TtySerialPort : public SerialPortControl
{
    Q_OBJECT
public:
    explicit TtySerialPort(const PortMap &ports, QObject *parent = nullptr);
    ~TtySerialPort() override;

    void setPortNumber(int number) override;
    int portNumber() const override { return m_portNumber; }
    bool setSettings(const QString &settings) override;
    QString settings() const override;
    void setHandshaking(int handshaking) override;
    int handshaking() const override { return m_handshaking; }
    void setInBufferSize(int bytes) override;
    void setOutBufferSize(int bytes) override;

    bool open() override;
    void close() override;
    bool isOpen() const override { return m_port.isOpen(); }
    QString errorString() const override { return m_errorString; }

    qint64 inBufferCount() const override;
    void discardInput() override;
    QByteArray input(qint64 maxBytes = -1) override;
    int outBufferSize() const override { return m_outBufferSize; }
    int outBufferCount() const override;
    void output(const QByteArray &bytes) override;

    QString devicePath() const;

private:
    bool applyLineSettings();
    void handleReadyRead();
    void handleError(QSerialPort::SerialPortError error);
    void fail(const QString &what);

    const PortMap &m_ports;
    QSerialPort m_port;
    int m_portNumber = 1;
    SerialLineSettings m_lineSettings;
    int m_handshaking = NoHandshaking;
    int m_outBufferSize = 8192;
    QString m_errorString;
};
