#include "TtySerialPort.h"

#include "PortMap.h"

#include <QFileInfo>

#include <sys/stat.h>
#include <sys/sysmacros.h>

namespace {

// The transmit queue the session paces itself against never reports more
// than this, however much QSerialPort still holds.
constexpr int kMaxOutBufferSize = 8192;

QSerialPort::FlowControl flowControlFor(int handshaking)
{
    switch (handshaking) {
    case SerialPortControl::XonXoff: return QSerialPort::SoftwareControl;
    case SerialPortControl::RtsCts: return QSerialPort::HardwareControl;
    default: return QSerialPort::NoFlowControl;
    }
}

// A reason in words, checked before QSerialPort tries: its own messages do
// not name the device and say little about a path that is no tty.
QString whyNotATty(const QString &path)
{
    struct stat info {};
    if (::stat(QFile::encodeName(path).constData(), &info) != 0)
        return QStringLiteral("%1 does not exist").arg(path);
    if (!S_ISCHR(info.st_mode))
        return QStringLiteral("%1 is not a serial device").arg(path);
    return {};
}

bool isPseudoTerminal(const QString &path)
{
    // Unix98 pty slaves have the major numbers 136 to 143.
    struct stat info {};
    if (::stat(QFile::encodeName(path).constData(), &info) != 0 || !S_ISCHR(info.st_mode))
        return false;
    return major(info.st_rdev) >= 136 && major(info.st_rdev) <= 143;
}

} // namespace

TtySerialPort::TtySerialPort(const PortMap &ports, QObject *parent)
    : SerialPortControl(parent), m_ports(ports)
{
    m_port.setReadBufferSize(8192);
    connect(&m_port, &QSerialPort::readyRead, this, &TtySerialPort::handleReadyRead);
    connect(&m_port, &QSerialPort::errorOccurred, this, &TtySerialPort::handleError);
    connect(&m_port, &QSerialPort::bytesWritten, this, &SerialPortControl::outputWritten);
}

TtySerialPort::~TtySerialPort() = default;

QString TtySerialPort::devicePath() const
{
    return m_ports.devicePath(m_portNumber);
}

void TtySerialPort::setPortNumber(int number)
{
    m_portNumber = number;
}

bool TtySerialPort::setSettings(const QString &settings)
{
    const auto parsed = parseSerialSettings(settings);
    if (!parsed) {
        m_errorString = QStringLiteral("Invalid serial settings \"%1\"").arg(settings);
        return false;
    }
    const SerialLineSettings previous = m_lineSettings;
    m_lineSettings = *parsed;
    if (m_port.isOpen() && !applyLineSettings()) {
        m_lineSettings = previous;
        applyLineSettings();
        return false;
    }
    return true;
}

QString TtySerialPort::settings() const
{
    return formatSerialSettings(m_lineSettings);
}

void TtySerialPort::setHandshaking(int handshaking)
{
    m_handshaking = handshaking;
    if (m_port.isOpen())
        m_port.setFlowControl(flowControlFor(handshaking));
}

void TtySerialPort::setInBufferSize(int bytes)
{
    // Bounded so that a session that stops reading leaves the data in the
    // device, where flow control can hold the sender back.
    m_port.setReadBufferSize(qMax(bytes, 1));
}

void TtySerialPort::setOutBufferSize(int bytes)
{
    m_outBufferSize = qBound(1, bytes, kMaxOutBufferSize);
}

bool TtySerialPort::applyLineSettings()
{
    // termios has no 1.5 stop bits. A UART sends 1.5 stop bits for 5-bit
    // words when asked for 2, which is the only place 1.5 is meant.
    const QSerialPort::StopBits stopBits = m_lineSettings.stopBits == QSerialPort::OneAndHalfStop
        ? QSerialPort::TwoStop : m_lineSettings.stopBits;
    bool ok = m_port.setBaudRate(m_lineSettings.baudRate)
        && m_port.setStopBits(stopBits)
        && m_port.setFlowControl(flowControlFor(m_handshaking));
    // Linux ptys always keep 8 data bits without parity: there is no wire
    // for them to matter on, so a pty standing in for a device is not
    // refused for that.
    const bool framingOk = m_port.setParity(m_lineSettings.parity) && m_port.setDataBits(m_lineSettings.dataBits);
    if (!framingOk && !isPseudoTerminal(devicePath()))
        ok = false;
    if (!ok)
        m_errorString = QStringLiteral("%1 refused the settings %2: %3")
                            .arg(devicePath(), settings(), m_port.errorString());
    return ok;
}

bool TtySerialPort::open()
{
    if (m_port.isOpen())
        return true;
    const QString path = devicePath();
    if (m_portNumber < 1) {
        m_errorString = QStringLiteral("COM%1 is not a valid port number").arg(m_portNumber);
        return false;
    }
    if (const QString reason = whyNotATty(path); !reason.isEmpty()) {
        m_errorString = reason;
        return false;
    }
    m_port.setPortName(path);
    if (!m_port.open(QIODevice::ReadWrite)) {
        fail(QStringLiteral("Cannot open %1: %2").arg(path, m_port.errorString()));
        return false;
    }
    if (!applyLineSettings()) {
        const QString reason = m_errorString;
        m_port.close();
        m_errorString = reason;
        return false;
    }
    m_errorString.clear();
    return true;
}

void TtySerialPort::close()
{
    if (m_port.isOpen())
        m_port.close();
}

qint64 TtySerialPort::inBufferCount() const
{
    return m_port.isOpen() ? m_port.bytesAvailable() : 0;
}

void TtySerialPort::discardInput()
{
    if (!m_port.isOpen())
        return;
    m_port.clear(QSerialPort::Input);
    m_port.readAll();
}

QByteArray TtySerialPort::input(qint64 maxBytes)
{
    if (!m_port.isOpen())
        return {};
    return maxBytes < 0 ? m_port.readAll() : m_port.read(maxBytes);
}

int TtySerialPort::outBufferCount() const
{
    if (!m_port.isOpen())
        return 0;
    return int(qMin<qint64>(m_port.bytesToWrite(), m_outBufferSize));
}

void TtySerialPort::output(const QByteArray &bytes)
{
    if (m_port.isOpen() && !bytes.isEmpty())
        m_port.write(bytes);
}

void TtySerialPort::handleReadyRead()
{
    Q_EMIT commEventRaised();
}

void TtySerialPort::handleError(QSerialPort::SerialPortError error)
{
    // A device that fails to read has gone (unplugged adapter, hung-up
    // pty) and would keep signalling; other errors are reported through
    // the return values of the calls that caused them.
    if ((error != QSerialPort::ResourceError && error != QSerialPort::ReadError) || !m_port.isOpen())
        return;
    const QString reason = QStringLiteral("%1 stopped working: %2").arg(devicePath(), m_port.errorString());
    // Closed from the event loop, not from inside QSerialPort's own signal.
    QMetaObject::invokeMethod(this, [this, reason] {
        if (!m_port.isOpen())
            return;
        m_port.close();
        m_errorString = reason;
        Q_EMIT deviceLost(reason);
    }, Qt::QueuedConnection);
}

void TtySerialPort::fail(const QString &what)
{
    m_errorString = what;
    m_port.clearError();
}
