#pragma once

#include <QByteArray>
#include <QLocalSocket>
#include <QString>

class VellocaProcess;

// A connection to the running program's command channel.
namespace e2e {

QString commandChannelPath(const VellocaProcess &velloca);

class CommandClient
{
public:
    explicit CommandClient(const VellocaProcess &velloca, int timeoutMs = 5000);

    bool isConnected() const { return m_socket.state() == QLocalSocket::ConnectedState; }
    QLocalSocket &socket() { return m_socket; }
    // Sends one request line (the line end is added) and returns the reply
    // line without its end; empty when none came in time.
    QByteArray send(const QByteArray &request, int timeoutMs = 5000);
    // Sends raw bytes as they are.
    bool write(const QByteArray &bytes);
    // The next `count` reply lines, or fewer when the time is up.
    QList<QByteArray> replies(int count, int timeoutMs = 5000);

private:
    QLocalSocket m_socket;
    QByteArray m_received;
};

} // namespace e2e
