#pragma once

#include <QAbstractSocket>
#include <QHostAddress>
#include <QList>
#include <QObject>
#include <QTimer>

class QSocketNotifier;

// Makes one outgoing TCP connection without blocking: one connect() per
// address, its outcome read from the socket once it turns writable.
// Qt's own connect calls connect() again on a socket whose connection was
// reset before Qt saw it complete, and each such call starts a new
// connection: against a server that accepts and resets at once, one attempt
// became a burst of them.
class TcpConnector : public QObject
{
    Q_OBJECT
public:
    explicit TcpConnector(QObject *parent = nullptr);
    // Closes a socket that was not handed out.
    ~TcpConnector() override;

    // Tries the addresses in turn, each for at most timeoutMs. connect() is
    // called before this returns; the outcome always comes later.
    void start(const QList<QHostAddress> &addresses, quint16 port, int timeoutMs);
    // Drops the attempt and closes its socket at once.
    void abort();

Q_SIGNALS:
    // The receiver owns the connected descriptor.
    void connected(int descriptor);
    // Every address failed; the reason of the last one.
    void failed(QAbstractSocket::SocketError error, const QString &reason);

private:
    void tryNext();
    void checkOutcome();
    void giveUp(int errorNumber);
    void closeSocket();

    QList<QHostAddress> m_addresses;
    quint16 m_port = 0;
    int m_fd = -1;
    QSocketNotifier *m_notifier = nullptr;
    QTimer m_timeout;
};
