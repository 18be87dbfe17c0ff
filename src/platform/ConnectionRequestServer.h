#pragma once

#include "ConnectionAcceptor.h"

#include <QTcpServer>

// A listening socket that hands each incoming connection out as its raw
// descriptor instead of queueing a QTcpSocket, so the connection can be
// taken over by another member or refused (closed) at once.
//
// QTcpServer only binds and listens here. Its own accepting hides most
// accept failures and, out of descriptors, keeps retrying at full speed, so
// a ConnectionAcceptor accepts instead.
class ConnectionRequestServer : public QTcpServer
{
    Q_OBJECT
public:
    using QTcpServer::QTcpServer;

    // Binds and listens; connections wait in the kernel until
    // setAccepting(true).
    bool listenHeld(const QHostAddress &address, quint16 port)
    {
        if (!listen(address, port))
            return false;
        pauseAccepting();
        m_acceptor = new ConnectionAcceptor(int(socketDescriptor()), this);
        connect(m_acceptor, &ConnectionAcceptor::accepted, this, &ConnectionRequestServer::connectionRequested);
        connect(m_acceptor, &ConnectionAcceptor::acceptFailed, this, &ConnectionRequestServer::acceptFailed);
        return true;
    }
    void setAccepting(bool accepting)
    {
        if (m_acceptor)
            m_acceptor->setEnabled(accepting);
    }

Q_SIGNALS:
    // The receiver owns the descriptor from here on.
    void connectionRequested(qintptr descriptor);
    // Accepting failed (errno); once per episode, see ConnectionAcceptor.
    void acceptFailed(int errorNumber);

private:
    ConnectionAcceptor *m_acceptor = nullptr;
};
