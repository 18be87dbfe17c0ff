#pragma once

#include <QTcpServer>

// A listening socket that hands each incoming connection out as its raw
// descriptor instead of queueing a QTcpSocket, so the connection can be
// taken over by another member or refused (closed) at once.
class ConnectionRequestServer : public QTcpServer
{
    Q_OBJECT
public:
    using QTcpServer::QTcpServer;

Q_SIGNALS:
    // The receiver owns the descriptor from here on.
    void connectionRequested(qintptr descriptor);

protected:
    void incomingConnection(qintptr descriptor) override
    {
        Q_EMIT connectionRequested(descriptor);
    }
};
