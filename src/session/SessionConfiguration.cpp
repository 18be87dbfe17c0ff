// A session's settings as one value: put into the engine after a load, taken
// out of it for a save. The engine is the one place that holds them; a
// window only shows and edits them.
#include "SessionEngine.h"

#include "config/ConfigurationFile.h"
#include "platform/SocketMember.h"

namespace {

// A list index the list does not have leaves the setting as it was, the way
// a list control refuses it.
void takeIndex(int &setting, int index, qsizetype count)
{
    if (index >= 0 && index < count)
        setting = index;
}

} // namespace

void SessionEngine::takeLocalAddress()
{
    m_record.LocalIPAddress = socket(0)->localIP();
    // Without an address of its own the machine cannot serve.
    if (m_record.LocalIPAddress.isEmpty())
        m_record.TCPOption = 0;
    m_settings.LocalIP = m_record.LocalIPAddress;
}

void SessionEngine::applyConfiguration(const SessionConfig &config)
{
    const SessionSettings &from = config.settings;
    SessionSettings &s = m_settings;
    takeIndex(s.Connector, from.Connector, SessionLists::kConnectorCount);
    takeIndex(s.BaudRate, from.BaudRate, SessionLists::kBaudRates.size());
    takeIndex(s.Parity, from.Parity, qsizetype(SessionLists::kParityIds.size()));
    takeIndex(s.Databits, from.Databits, SessionLists::kDataBits.size());
    takeIndex(s.Stopbits, from.Stopbits, SessionLists::kStopBits.size());
    takeIndex(s.FlowControl, from.FlowControl, qsizetype(SessionLists::kFlowControlIds.size()));
    takeIndex(s.BufferSize, from.BufferSize, SessionLists::kBufferSizes.size());
    s.ConnectorText = SessionLists::connectorName(s.Connector);
    s.BufferSerialData = from.BufferSerialData == 1 ? 1 : 0;
    s.CreateVirtualPort = from.CreateVirtualPort == 1 ? 1 : 0;
    s.UseUDP = from.UseUDP == 1 ? 1 : 0;
    s.LocalIP = from.LocalIP;
    s.IPAddress = from.IPAddress;
    s.PortNumber = from.PortNumber;
    s.TCPOption = from.TCPOption == 0 ? 0 : 1;
    s.WaitForCr = from.WaitForCr == 1 ? 1 : 0;
    s.TimeoutValue = from.TimeoutValue;

    copySessionOptions(config.options, m_record);

    setCommandTopic(s.ConnectorText);
    if (!from.SessionDescription.isEmpty()) {
        s.SessionDescription = from.SessionDescription;
        setCaption(from.SessionDescription);
    }
    Q_EMIT configurationChanged();
}

SessionConfig SessionEngine::currentConfiguration() const
{
    SessionConfig config;
    config.settings = m_settings;
    copySessionOptions(m_record, config.options);
    config.AutoActivate = isActive() ? 1 : 0;
    return config;
}
