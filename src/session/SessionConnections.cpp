// Keeping the network side going: client reconnection, accepting clients on
// a growing socket array, closes and socket errors.
#include "SessionEngine.h"

#include "localisation/ResourceStrings.h"
#include "platform/SocketMember.h"

namespace {

constexpr int kNetworkCaption = 5091;
// The one error number above 10000 that leaves the connection alone.
constexpr int kHarmlessErrorNumber = 40017;
// How much an accepted connection reads ahead of the session; the rest
// stays in the kernel.
constexpr qint64 kSocketReadAhead = 65536;

} // namespace

void SessionEngine::wireSocket(SocketMember *member)
{
    connect(member, &SocketMember::dataArrived, this, [this](int index, qint64) { DataArrival(index); });
    connect(member, &SocketMember::connected, this, &SessionEngine::handleConnect);
    connect(member, &SocketMember::connectionRequested, this, &SessionEngine::ConnectionRequest);
    connect(member, &SocketMember::closed, this, &SessionEngine::handlePeerClose);
    connect(member, &SocketMember::errorOccurred, this, &SessionEngine::handleSocketError);
    // A peer that catches up lets held serial input be read again. Only
    // then, and once for all the writes that one pass of the event loop
    // reports: checking the room asks every client, which with a thousand
    // clients would be a million calls for each block sent.
    connect(member, &SocketMember::bytesWritten, this, [this](int, qint64) {
        if (!m_serialInputHeld || m_resumeQueued)
            return;
        m_resumeQueued = true;
        QMetaObject::invokeMethod(this, [this] {
            m_resumeQueued = false;
            resumeSerialReading();
        }, Qt::QueuedConnection);
    });
    member->setReadBufferSize(kSocketReadAhead);
}

void SessionEngine::ConnectAttempt()
{
    if (m_record.UseUDP)
        return;
    SocketMember *member = socket(0);
    member->setRemoteHost(m_settings.IPAddress);
    member->setRemotePort(portNumberValue());
    setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5097));
    if (member->connectToRemote())
        return;
    const QString description = member->errorString();
    member->close();
    member->setRemoteHost(QString());
    member->setRemotePort(0);
    setStatusLine(NetworkLine, LoadResString(5083) + description);
    LogErrors(description);
}

void SessionEngine::handleConnect(int index)
{
    noteNewConnection(index);
    m_timer1.stop();
    setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5109));
}

void SessionEngine::showClientCount()
{
    if (m_record.ClientCount != 0)
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5109)
                                       + QStringLiteral(" (%1)").arg(m_record.ClientCount));
    else
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5098));
}

void SessionEngine::ConnectionRequest(int, qintptr requestId)
{
    // A request left alone here is closed by the socket layer at once.
    if (!isServer())
        return;
    if (m_record.AllowMultiConnect == 0 && m_record.ClientCount != 0 && !makeRoomForNewClient())
        return;
    ++m_record.ClientCount;
    int chosen = 0;
    for (int i = 1; i <= m_record.MaxSocketIndex && i < socketCount(); ++i) {
        if (socket(i)->state() == SocketMember::StateClosed) {
            chosen = i;
            break;
        }
    }
    if (chosen == 0) {
        chosen = m_record.MaxSocketIndex + 1;
        m_record.MaxSocketIndex = chosen;
    }
    SocketMember *member = createSocketMember(chosen);
    member->setLocalPort(socket(0)->localPort());
    if (!member->accept(requestId)) {
        // Keep running without this client rather than count a ghost; the
        // closed member is reused by the next request.
        --m_record.ClientCount;
        LogErrors(member->errorString());
        return;
    }
    noteNewConnection(chosen);
    showClientCount();
}

bool SessionEngine::makeRoomForNewClient()
{
    // The one client may only have stopped sending, or may have closed
    // completely unnoticed (the two look alike): it gives way to a new one,
    // which it used to do by being disconnected at once, once what it sent
    // has been taken.
    for (int i = 1; i <= m_record.MaxSocketIndex && i < socketCount(); ++i) {
        const SocketMember *member = socket(i);
        if (member->state() == SocketMember::StateConnected
            && (!member->isHalfClosed() || member->bytesAvailable() > 0))
            return false;
    }
    for (int i = 1; i <= m_record.MaxSocketIndex && i < socketCount(); ++i) {
        if (socket(i)->isHalfClosed())
            handleClose(i);
    }
    return m_record.ClientCount == 0;
}

void SessionEngine::handlePeerClose(int index)
{
    // What the peer sent before it closed is still owed to the serial side:
    // the close waits until it has been read.
    SocketMember *member = socket(index);
    if (!m_record.UseUDP && member && member->bytesAvailable() > 0) {
        m_closeAfterDrain.insert(index);
        DataArrival(index);
        return;
    }
    handleClose(index);
}

void SessionEngine::finishCloseIfDrained(int index)
{
    if (!m_closeAfterDrain.contains(index) || socket(index)->bytesAvailable() > 0)
        return;
    m_closeAfterDrain.remove(index);
    handleClose(index);
}

void SessionEngine::handleClose(int index)
{
    m_closeAfterDrain.remove(index);
    if (m_closingNow)
        return;
    m_closingNow = true;
    noteNewConnection(index);
    if (SocketMember *member = socket(index))
        member->close();
    m_record.ClientCount = qMax(0, m_record.ClientCount - 1);
    if (isServer()) {
        showClientCount();
    } else {
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5100));
        m_timer1.start();
    }
    m_closingNow = false;
}

void SessionEngine::dropClientNotReading(int index)
{
    SocketMember *member = socket(index);
    LogErrors(QStringLiteral("Client %1 disconnected: not reading").arg(member->remoteHostIP()));
    // Its queue goes with it: that is the memory to free.
    member->abort();
    handleClose(index);
}

void SessionEngine::handleSocketError(int index, int number, const QString &description)
{
    setStatusLine(NetworkLine, LoadResString(kNetworkCaption) + u' ' + LoadResString(5103));
    LogErrors(description);
    const int code = number & 0xFFFF;
    if (code > 10000 && code != kHarmlessErrorNumber)
        handleClose(index);
}
