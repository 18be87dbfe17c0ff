#include "SessionEngine.h"

#include "ErrorLog.h"
#include "config/GlobalOptions.h"
#include "localisation/ResourceStrings.h"
#include "platform/SerialPortControl.h"
#include "platform/SocketMember.h"
#include "platform/VirtualPortControl.h"

SessionEngine::SessionEngine(SessionPlatform platform, QObject *parent)
    : QObject(parent), m_platform(std::move(platform))
{
    m_serialPort = m_platform.makeSerialPort(this);
    m_virtualPort = m_platform.makeVirtualPort(this);
    createSocketMember(0);
    wirePlatform();
    m_statusLines[ComLine] = LoadResString(5090);
    m_statusLines[NetworkLine] = LoadResString(5091);
    m_caption = LoadResString(5119) + QStringLiteral(" - ") + LoadResString(5120);
    m_commandTopic = SessionLists::connectorName(0);
    takeLocalAddress();
}

SessionEngine::~SessionEngine() = default;

void SessionEngine::wirePlatform()
{
    connect(m_serialPort, &SerialPortControl::commEventRaised, this, &SessionEngine::SerialReceive);
    connect(m_serialPort, &SerialPortControl::deviceLost, this, [this](const QString &description) {
        // The device went away under an active session: say so; the session
        // stays active and reopens the device on the next activation.
        setStatusLine(ComLine, LoadResString(5082) + description);
    });
    // Refill the transmit queue as soon as the device takes bytes, not only
    // on the next tick, so a fast line is not held to one queue per tick.
    connect(m_serialPort, &SerialPortControl::outputWritten, this, &SessionEngine::drainSerialOutput);
    connect(m_virtualPort, &VirtualPortControl::dataReceived, this, &SessionEngine::VirtualReceive);
    connect(m_virtualPort, &VirtualPortControl::openedOrClosed, this, &SessionEngine::VirtualOpenClose);
    connect(this, &SessionEngine::statusLineChanged, this,
            [this](int, const QString &text) { LogErrors(text); });

    m_timer1.setInterval(kTimer1IntervalMs);
    connect(&m_timer1, &QTimer::timeout, this, &SessionEngine::ConnectAttempt);
    m_timer2.setInterval(kTimer2IntervalMs);
    connect(&m_timer2, &QTimer::timeout, this, &SessionEngine::Timer2_Tick);
    m_timer2.start();
}

void SessionEngine::LogErrors(const QString &message)
{
    const SocketMember *first = socket(0);
    ErrorLogContext context;
    context.LocalIPAddress = m_record.LocalIPAddress;
    context.TCPOption = m_record.TCPOption;
    context.RemoteHost = first->remoteHost();
    context.RemotePort = first->remotePort();
    context.LocalPort = first->localPort();
    writeErrorLogLine(context, message, GlobalOptions::global());
}

void SessionEngine::VirtualOpenClose(bool opened)
{
    if (m_record.UseUDP)
        return;
    if (m_settings.CreateVirtualPort != 1 || isServer() || m_record.ConnectOnVirtualOpen == 0)
        return;
    SocketMember *member = socket(0);
    if (opened) {
        setStatusLine(NetworkLine, LoadResString(5091) + u' ' + LoadResString(5097));
        if (member->state() != SocketMember::StateConnected)
            member->connectToRemote();
    } else {
        setStatusLine(NetworkLine, LoadResString(5091) + u' ' + LoadResString(5100));
        if (member->state() == SocketMember::StateConnected)
            member->close();
    }
}

SocketMember *SessionEngine::socket(int index) const
{
    if (index < 0 || index >= socketCount())
        return nullptr;
    return m_sockets[size_t(index)];
}

SocketMember *SessionEngine::createSocketMember(int index)
{
    while (socketCount() <= index) {
        m_sockets.push_back(m_platform.makeSocketMember(socketCount(), this));
        wireSocket(m_sockets.back());
    }
    return m_sockets[size_t(index)];
}

void SessionEngine::setStatusLine(StatusLine line, const QString &text)
{
    if (m_statusLines[line] == text)
        return;
    m_statusLines[line] = text;
    Q_EMIT statusLineChanged(line, text);
}

void SessionEngine::setCaption(const QString &caption)
{
    if (m_caption == caption)
        return;
    m_caption = caption;
    Q_EMIT captionChanged(caption);
}

void SessionEngine::setCommandTopic(const QString &topic)
{
    if (m_commandTopic == topic)
        return;
    m_commandTopic = topic;
    Q_EMIT commandTopicChanged(topic);
}

void SessionEngine::setActivity(Activity activity)
{
    if (m_activity == activity)
        return;
    m_activity = activity;
    Q_EMIT activateCaptionChanged(activateCaption());
}

QString SessionEngine::activateCaption() const
{
    // The button offers the opposite of the state.
    return LoadResString(isActive() ? 5118 : 5087);
}

void SessionEngine::setSettingsLocked(bool locked)
{
    if (m_settingsLocked == locked)
        return;
    m_settingsLocked = locked;
    Q_EMIT settingsLockChanged(locked);
}

QList<int> SessionEngine::connectedMembers() const
{
    QList<int> connected;
    for (int i = 0; i <= m_record.MaxSocketIndex && i < socketCount(); ++i) {
        if (m_sockets[size_t(i)]->state() == SocketMember::StateConnected)
            connected << i;
    }
    return connected;
}

QStringList SessionEngine::connectedClientAddresses() const
{
    QStringList addresses;
    for (const int i : connectedMembers())
        addresses << m_sockets[size_t(i)]->remoteHostIP();
    return addresses;
}
