// Activate / De-Activate of a session: opening and closing both sides,
// sizing the buffers and locking the settings while it runs.
#include "SessionEngine.h"

#include "NumberText.h"
#include "localisation/ResourceStrings.h"
#include "platform/SerialPortControl.h"
#include "platform/SocketMember.h"
#include "platform/VirtualPortControl.h"

#include <cmath>

namespace {

constexpr int kSerialQueueSize = 8192;
constexpr int kComCaption = 5090;
constexpr int kNetworkCaption = 5091;

// Flow-control entry -> handshaking value, and whether the flow-control flag
// is set (Opto-RS is hardware handshaking with the flag cleared).
// Handshaking by flow-control entry: None, Xon/Xoff, Hardware, Opto-RS (which
// is hardware handshaking too).
constexpr int kHandshaking[] = { SerialPortControl::NoHandshaking, SerialPortControl::XonXoff,
                                 SerialPortControl::RtsCts, SerialPortControl::RtsCts };

QString listEntry(const QStringList &entries, int index)
{
    return index >= 0 && index < entries.size() ? entries[index] : QString();
}

} // namespace

QString SessionEngine::composeStatus(int captionId, int stateId, const QString &detail) const
{
    QString text = LoadResString(captionId) + u' ' + LoadResString(stateId);
    if (!detail.isEmpty())
        text += u' ' + detail;
    return text;
}

int SessionEngine::portNumberValue() const
{
    return int(std::lround(leadingNumber(m_settings.PortNumber)));
}

void SessionEngine::Command1_Click()
{
    m_record.UseUDP = m_settings.UseUDP != 0;
    m_record.PingTicks = 0;
    m_timer1.stop();
    wakeTicks();
    if (isActive())
        deactivate();
    else
        activate();
}

void SessionEngine::deactivate()
{
    if (m_settings.CreateVirtualPort == 1) {
        if (!m_virtualPort->removePort()) {
            // The port is still there: the session stays active so that the
            // next press tries again.
            setStatusLine(ComLine, LoadResString(5084));
            return;
        }
        setStatusLine(ComLine, LoadResString(5085));
    } else {
        m_serialPort->close();
        setStatusLine(ComLine, composeStatus(kComCaption, 5100));
    }
    for (int i = 0; i <= m_record.MaxSocketIndex && i < socketCount(); ++i) {
        socket(i)->close();
        socket(i)->setLocalPort(0);
    }
    m_record.ClientCount = 0;
    socket(0)->setProtocol(SocketMember::Tcp);
    setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5100));
    setSettingsLocked(false);
    setActivity(Activity::Inactive);
}

void SessionEngine::activate()
{
    // Only a client has a remote host; a server's field is hidden and unused.
    if (configuredRole() == Role::Client && m_settings.IPAddress.isEmpty()) {
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5088));
        return;
    }
    const double port = leadingNumber(m_settings.PortNumber);
    if (port < 0 || port > 65535) {
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5089));
        return;
    }
    m_record.ComPortNumber = m_settings.Connector;
    if (m_record.ComPortNumber == 0) {
        if (m_settings.SessionDescription.isEmpty())
            setCaption(LoadResString(5119) + QStringLiteral(" - ") + LoadResString(5120));
        setStatusLine(ComLine, LoadResString(kComCaption));
        setStatusLine(NetworkLine, LoadResString(kNetworkCaption));
        return;
    }
    if (m_record.ComPortNumber < 0 || m_record.ComPortNumber >= SessionLists::kConnectorCount) {
        setStatusLine(ComLine, composeStatus(kComCaption, 5095)
                                   + QStringLiteral(" (\"%1\" names no connector)").arg(m_settings.ConnectorText));
        return;
    }

    const QString portName = QStringLiteral("COM%1").arg(m_record.ComPortNumber);
    if (m_settings.CreateVirtualPort == 1) {
        m_virtualPort->removePort();
        if (!m_virtualPort->createPort(portName)) {
            QString text = LoadResString(5092) + u' ' + portName;
            if (!m_virtualPort->errorString().isEmpty())
                text += QStringLiteral(" (%1)").arg(m_virtualPort->errorString());
            setStatusLine(ComLine, text);
            return;
        }
        m_virtualPort->setStrictBaudrate(true);
        m_virtualPort->setSignalEvents(true);
        setStatusLine(ComLine, LoadResString(5093) + u' ' + portName + u' ' + LoadResString(5094));
        if (!sizeBuffers()) {
            m_virtualPort->removePort();
            return;
        }
    } else if (!openPhysicalPort()) {
        return;
    }

    SocketMember *member = socket(0);
    if (m_record.UseUDP) {
        member->setProtocol(SocketMember::Udp);
    } else {
        member->close();
        member->setProtocol(SocketMember::Tcp);
    }

    const int portValue = portNumberValue();
    if (configuredRole() == Role::Client) {
        m_record.TCPOption = 0;
        member->setRemoteHost(m_settings.IPAddress);
        member->setRemotePort(portValue);
        const bool waitForVirtualOpen = m_settings.CreateVirtualPort == 1 && m_record.ConnectOnVirtualOpen != 0;
        if (waitForVirtualOpen) {
            if (m_record.UseUDP)
                member->bind(portValue);
        } else {
            setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5097));
            if (m_record.UseUDP) {
                member->bind(portValue);
            } else if (!member->connectToRemote()) {
                failSocketStart(member->errorString());
                return;
            }
        }
    } else {
        m_record.TCPOption = 1;
        // A server answers whoever sent last, never the client role's host.
        member->setRemoteHost(QString());
        member->setLocalPort(portValue);
        if (m_record.UseUDP)
            member->setRemotePort(portValue);
        if (!member->bind(portValue, m_settings.LocalIP)
            || (!m_record.UseUDP && !member->listen())) {
            failSocketStart(member->errorString());
            return;
        }
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5098));
    }

    if (m_settings.SessionDescription.isEmpty())
        setCaption(m_settings.ConnectorText + QStringLiteral(" - ") + LoadResString(5120));
    setSettingsLocked(true);
    setActivity(Activity::Active);
}

bool SessionEngine::openPhysicalPort()
{
    m_serialPort->close();
    m_serialPort->setPortNumber(m_record.ComPortNumber);
    if (!m_serialPort->setSettings(serialSettingsText())) {
        failSerialOpen(m_serialPort->errorString());
        return false;
    }
    m_serialPort->setHandshaking(kHandshaking[qBound(0, m_settings.FlowControl, 3)]);
    m_serialPort->setInBufferSize(kSerialQueueSize);
    m_serialPort->setOutBufferSize(kSerialQueueSize);
    if (!sizeBuffers())
        return false;
    if (!m_serialPort->open() || !m_serialPort->isOpen()) {
        // "Port not available" stays the words scripts look for; the
        // reason follows in parentheses.
        const QString reason = m_serialPort->errorString();
        m_serialPort->close();
        setStatusLine(ComLine, composeStatus(kComCaption, 5095)
                                   + (reason.isEmpty() ? QString() : QStringLiteral(" (%1)").arg(reason)));
        return false;
    }
    setStatusLine(ComLine, composeStatus(kComCaption, 5096));
    return true;
}

QString SessionEngine::serialSettingsText() const
{
    const int parity = m_settings.Parity;
    const bool parityKnown = parity >= 0 && parity < int(SessionLists::kParityLetters.size());
    return QStringLiteral("%1,%2,%3,%4")
        .arg(listEntry(SessionLists::kBaudRates, m_settings.BaudRate))
        .arg(parityKnown ? QChar::fromLatin1(SessionLists::kParityLetters[size_t(parity)]) : QChar())
        .arg(listEntry(SessionLists::kDataBits, m_settings.Databits))
        .arg(listEntry(SessionLists::kStopBits, m_settings.Stopbits));
}

bool SessionEngine::sizeBuffers()
{
    const qint32 size = qint32(leadingNumber(listEntry(SessionLists::kBufferSizes, m_settings.BufferSize)));
    if (m_myBuffer.resize(size) && m_serialOutBuffer.resize(size))
        return true;
    failSerialOpen(QStringLiteral("not enough memory for two buffers of %1 bytes").arg(size));
    return false;
}

void SessionEngine::failSerialOpen(const QString &description)
{
    m_serialPort->close();
    setStatusLine(ComLine, composeStatus(kComCaption, 5099, description));
}

void SessionEngine::failSocketStart(const QString &description)
{
    SocketMember *member = socket(0);
    member->close();
    member->setRemoteHost(QString());
    member->setRemotePort(0);
    setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5099, description));
    closeSerialSide();
}

void SessionEngine::closeSerialSide()
{
    if (m_settings.CreateVirtualPort == 1) {
        setStatusLine(ComLine, LoadResString(m_virtualPort->removePort() ? 5085 : 5084));
        return;
    }
    m_serialPort->close();
    setStatusLine(ComLine, composeStatus(kComCaption, 5100));
}
