// Network to serial side: data arriving on a socket member goes into the
// serial output buffer, which each timer tick drains at the pace of the
// serial port's transmit queue or into the virtual port.
#include "SessionEngine.h"

#include "platform/SerialPortControl.h"
#include "platform/SocketMember.h"
#include "platform/VirtualPortControl.h"

#include <QScopedValueRollback>

int SessionEngine::firstConnectedIndex() const
{
    // A client that has stopped sending has nothing more to write; it must
    // not keep the next client's data out.
    // Member 0 listens in the server role, so the clients start at 1.
    for (const int i : connectedMembers()) {
        if (i >= 1 && !m_sockets[size_t(i)]->isHalfClosed())
            return i;
    }
    return m_record.MaxSocketIndex + 1;
}

void SessionEngine::DataArrival(int index)
{
    SocketMember *member = socket(index);
    if (!member)
        return;
    m_record.PingTicks = 0;
    setLamp(1, true);

    const bool networkIgnored = isServer() ? networkRouting() == ClientRouting::Ignore
                                           : clientDirection() == ClientDirection::NoSerialOutput;
    const bool notFirstClient = !m_record.UseUDP && isServer() && networkRouting() == ClientRouting::FirstClient
        && index != firstConnectedIndex();
    if (networkIgnored || notFirstClient) {
        member->getData();
        finishCloseIfDrained(index);
        return;
    }
    if (m_record.UseUDP) {
        // A datagram that does not fit is dropped: UDP promises nothing more.
        Add2SerialOutBuffer(member->getData());
    } else {
        // Over TCP only what fits is read; the rest stays in the socket and
        // TCP flow control holds the sender until the drain makes room.
        const qint32 room = m_serialOutBuffer.freeSpace();
        if (room > 0)
            Add2SerialOutBuffer(member->getData(room));
    }
    // Pass it on now rather than on the next tick: a lone message would
    // otherwise wait up to a whole tick.
    drainSerialOutput();
    finishCloseIfDrained(index);
}

void SessionEngine::resumeNetworkReading()
{
    if (m_record.UseUDP)
        return;
    for (int i = 0; i <= m_record.MaxSocketIndex && i < socketCount(); ++i) {
        if (m_serialOutBuffer.freeSpace() == 0)
            return;
        if (m_sockets[size_t(i)]->bytesAvailable() > 0)
            DataArrival(i);
    }
}

void SessionEngine::drainSerialOutput()
{
    const qint32 held = m_serialOutBuffer.count();
    if (held == 0 || m_draining)
        return;
    const QScopedValueRollback<bool> draining(m_draining, true);
    if (m_settings.CreateVirtualPort == 1) {
        if (m_virtualPort->isOpenedByApplication()) {
            // The pty takes what it can; the rest waits for the next tick.
            const QByteArrayView front = m_serialOutBuffer.frontSpan();
            const qint64 written = m_virtualPort->write(QByteArray(front.data(), front.size()));
            if (written > 0)
                m_serialOutBuffer.drop(qint32(written));
        } else if (m_settings.BufferSerialData == 0) {
            m_serialOutBuffer.clear();
        }
    } else if (m_serialPort->isOpen()) {
        const int free = m_serialPort->outBufferSize() - m_serialPort->outBufferCount();
        if (free > 0) {
            qint32 n = qMin(held, qint32(free));
            m_serialPort->output(ReadFromSerialOutBuffer(n));
        }
    }
    resumeNetworkReading();
}
