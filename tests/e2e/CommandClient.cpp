#include "CommandClient.h"

#include "VellocaProcess.h"

#include "support/Wait.h"

namespace e2e {

QString commandChannelPath(const VellocaProcess &velloca)
{
    return velloca.virtualPortFolder() + QStringLiteral("/control");
}

CommandClient::CommandClient(const VellocaProcess &velloca, int timeoutMs)
{
    m_socket.connectToServer(commandChannelPath(velloca));
    waitUntil([this] { return m_socket.state() == QLocalSocket::ConnectedState
                              || m_socket.state() == QLocalSocket::UnconnectedState; }, timeoutMs);
}

QByteArray CommandClient::send(const QByteArray &request, int timeoutMs)
{
    if (!write(request + '\n'))
        return {};
    const QList<QByteArray> lines = replies(1, timeoutMs);
    return lines.isEmpty() ? QByteArray() : lines.first();
}

bool CommandClient::write(const QByteArray &bytes)
{
    return m_socket.write(bytes) == bytes.size();
}

QList<QByteArray> CommandClient::replies(int count, int timeoutMs)
{
    waitUntil([&] {
        m_received += m_socket.readAll();
        return m_received.count('\n') >= count;
    }, timeoutMs);
    QList<QByteArray> lines;
    while (lines.size() < count) {
        const qsizetype end = m_received.indexOf('\n');
        if (end < 0)
            break;
        lines << m_received.left(end);
        m_received.remove(0, end + 1);
    }
    return lines;
}

} // namespace e2e
