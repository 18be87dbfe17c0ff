// Serial side to network: receiving from the serial or virtual port into the
// hold buffer, sending it to the clients immediately or in packets, and the
// transmit time-out flush.
#include "SessionEngine.h"

#include "NumberText.h"
#include "config/GlobalOptions.h"
#include "platform/SerialPortControl.h"
#include "platform/SocketMember.h"
#include "platform/VirtualPortControl.h"

#include <QScopedValueRollback>

namespace {

constexpr int kNetworkCaption = 5091;

qint32 packetSize()
{
    const qint32 size = GlobalOptions::global().PacketSize;
    return size >= kMinPacketSize ? size : kDefaultPacketSize;
}

} // namespace

bool SessionEngine::anyConnected() const
{
    return !connectedMembers().isEmpty();
}

// The members that get serial data: the connected ones, or only the first
// client to serve with "first client only".
QList<int> SessionEngine::serialReceivers() const
{
    if (isServer() && serialRouting() == ClientRouting::FirstClient) {
        const int first = firstClientToServe();
        return first >= 0 ? QList<int> { first } : QList<int> {};
    }
    return connectedMembers();
}

int SessionEngine::firstClientToServe() const
{
    // The connected member with the lowest index. One whose client has
    // stopped sending comes after all others: such a client used to be
    // disconnected at once, and it may well have closed completely.
    int halfClosed = -1;
    for (const int i : connectedMembers()) {
        if (!m_sockets[size_t(i)]->isHalfClosed())
            return i;
        if (halfClosed < 0)
            halfClosed = i;
    }
    return halfClosed;
}

void SessionEngine::sendBlock(SocketMember *member, const QByteArray &block)
{
    // The block is lost for this peer: say so rather than drop it silently.
    // A send that finds the peer gone is told by the close that follows.
    if (!member->sendData(block) && member->state() != SocketMember::StateClosing)
        setStatusLine(NetworkLine, composeStatus(kNetworkCaption, 5099, member->errorString()));
}

void SessionEngine::SendToClients(const QByteArray &block)
{
    for (const int i : serialReceivers())
        sendBlock(m_sockets[size_t(i)], block);
}

qint32 SessionEngine::serialReadRoom()
{
    // Memory stays bounded: the clients' queues together hold at most two
    // buffers, each client its share of them and never more than one
    // buffer. A client further behind than its share while the kernel takes
    // nothing more from it is not reading. While another client keeps up,
    // such a client is let go rather than hold up the others; when none
    // keeps up, or the queues are full, the serial side waits (its flow
    // control or the writing application is held back instead).
    const QList<int> receivers = m_record.UseUDP ? QList<int> { 0 } : serialReceivers();
    if (receivers.isEmpty())
        return m_myBuffer.freeSpace();
    const qint64 capacity = m_myBuffer.capacity();
    const qint64 share = qMin(capacity, 2 * capacity / receivers.size());
    qint64 queued = 0;
    QList<int> notReading;
    for (const int i : receivers) {
        const SocketMember *member = m_sockets[size_t(i)];
        const qint64 bytes = member->bytesToWrite();
        if (bytes > share && member->bytesHeldBack() > share)
            notReading << i;
        else
            queued += bytes;
    }
    if (notReading.size() == receivers.size())
        return 0;
    for (const int i : std::as_const(notReading))
        dropClientNotReading(i);
    return queued < 2 * capacity ? m_myBuffer.freeSpace() : 0;
}

void SessionEngine::sendHeldData(bool packetMode, bool mayHold)
{
    if (m_record.UseUDP) {
        SocketMember *member = socket(0);
        if (packetMode) {
            while (m_myBuffer.count() >= packetSize()) {
                qint32 n = packetSize();
                sendBlock(member, ReadFromMyBuffer(n));
            }
        } else if (m_myBuffer.count() > 0) {
            qint32 n = -1;
            sendBlock(member, ReadFromMyBuffer(n));
        }
        return;
    }
    // With "buffer data" set and nobody connected the bytes stay held.
    if (mayHold && !anyConnected())
        return;
    if (packetMode) {
        while (m_myBuffer.count() >= packetSize()) {
            qint32 n = packetSize();
            SendToClients(ReadFromMyBuffer(n));
        }
    } else if (m_myBuffer.count() > 0) {
        qint32 n = -1;
        SendToClients(ReadFromMyBuffer(n));
    }
}

bool SessionEngine::serialInputIgnored() const
{
    return isServer() ? serialRouting() == ClientRouting::Ignore
                      : clientDirection() == ClientDirection::NoNetworkOutput;
}

void SessionEngine::moveSerialInput(const std::function<qint64()> &pending,
                                    const std::function<QByteArray(qint32)> &read, bool mayHold)
{
    const bool packetMode = m_settings.WaitForCr != 0;
    // Read only what the hold buffer can take; the rest stays in the port
    // until sending makes room (nothing is read just to be dropped).
    // Each read asks for no more than is waiting: a QIODevice sets aside the
    // whole amount asked for before it reads.
    m_serialInputHeld = false;
    for (qint64 waiting = pending(); waiting > 0; waiting = pending()) {
        const qint32 room = serialReadRoom();
        m_serialInputHeld = room <= 0;
        if (m_serialInputHeld)
            break;
        Add2MyBuffer(read(qint32(qMin<qint64>(room, waiting))));
        sendHeldData(packetMode, mayHold);
    }
    if (packetMode && pending() == 0)
        m_record.FlushTicks = 0;
}

void SessionEngine::SerialReceive()
{
    if (m_inSerialReceive)
        return;
    const QScopedValueRollback<bool> receiving(m_inSerialReceive, true);
    setLamp(0, true);
    if (serialInputIgnored()) {
        m_serialPort->discardInput();
        return;
    }
    const bool connected = anyConnected();
    const bool mayHold = m_settings.BufferSerialData != 0;
    if (!m_record.UseUDP && !mayHold && !connected) {
        m_serialPort->discardInput();
        return;
    }
    moveSerialInput([this] { return m_serialPort->inBufferCount(); },
                    [this](qint32 room) { return m_serialPort->input(room); }, mayHold);
}

void SessionEngine::VirtualReceive()
{
    if (m_inSerialReceive)
        return;
    const QScopedValueRollback<bool> receiving(m_inSerialReceive, true);
    setLamp(0, true);
    if (serialInputIgnored()) {
        m_virtualPort->discardInput();
        return;
    }
    // Data from the virtual port is always read; with nobody connected and
    // nothing to hold for, SendToClients finds no one and it is dropped.
    const bool mayHold = !m_record.UseUDP && m_settings.BufferSerialData != 0;
    moveSerialInput([this] { return m_virtualPort->available(); },
                    [this](qint32 room) { return m_virtualPort->read(room); }, mayHold);
}

void SessionEngine::resumeSerialReading()
{
    if (!isActive() || serialReadRoom() <= 0)
        return;
    if (m_settings.CreateVirtualPort == 1) {
        if (m_virtualPort->available() > 0)
            VirtualReceive();
    } else if (m_serialPort->isOpen() && m_serialPort->inBufferCount() > 0) {
        SerialReceive();
    }
}

void SessionEngine::flushOnTimeout()
{
    if (m_myBuffer.count() == 0)
        return;
    ++m_record.FlushTicks;
    if (double(m_record.FlushTicks) * kTimer2IntervalMs <= leadingNumber(m_settings.TimeoutValue))
        return;
    bool sent = false;
    if (m_record.UseUDP) {
        qint32 n = -1;
        sendBlock(socket(0), ReadFromMyBuffer(n));
        sent = true;
    } else if (anyConnected()) {
        qint32 n = -1;
        SendToClients(ReadFromMyBuffer(n));
        sent = true;
    }
    if (m_settings.BufferSerialData == 0 || sent)
        m_myBuffer.clear();
    m_record.FlushTicks = 0;
}

void SessionEngine::setLamp(int lamp, bool lit)
{
    // Every arrival of data lights a lamp: the ticks that pass it on, flush
    // it and put the lamp out must run from here on.
    if (lit)
        wakeTicks();
    if (m_lampLit[lamp] == lit)
        return;
    m_lampLit[lamp] = lit;
    Q_EMIT lampChanged(lamp, lit);
}

void SessionEngine::Timer2_Tick()
{
    if (++m_ledTicks >= 3) {
        setLamp(0, false);
        setLamp(1, false);
        m_ledTicks = 0;
    }
    drainSerialOutput();
    flushOnTimeout();
    pingWatchdogStep();
    resumeSerialReading();
    if (!tickHasWork())
        m_timer2.stop();
}

void SessionEngine::wakeTicks()
{
    if (!m_timer2.isActive())
        m_timer2.start();
}

bool SessionEngine::tickHasWork() const
{
    const bool watchdog = isActive() && !m_record.UseUDP && GlobalOptions::global().PingEnabled != 0;
    const bool serialWaiting = m_serialPort->isOpen() && m_serialPort->inBufferCount() > 0;
    const bool virtualWaiting = m_settings.CreateVirtualPort == 1 && isActive() && m_virtualPort->available() > 0;
    return m_lampLit[0] || m_lampLit[1] || m_myBuffer.count() > 0 || m_serialOutBuffer.count() > 0
        || watchdog || serialWaiting || virtualWaiting || !m_closeAfterDrain.isEmpty();
}
