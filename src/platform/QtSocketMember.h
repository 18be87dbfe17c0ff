#pragma once

#include "SocketErrors.h"
#include "SocketMember.h"

#include <QHostAddress>
#include <QList>
#include <QPointer>

class ConnectionRequestServer;
class StreamWriter;
class TcpConnector;
class QTcpSocket;
class QUdpSocket;

// A socket member over Qt Network: a QTcpSocket for a TCP client (connected
// by a TcpConnector) or an accepted connection (sending through a
// StreamWriter), a ConnectionRequestServer for a listening member, a
// QUdpSocket for UDP. Nothing here blocks: host names are looked up
// asynchronously and every outcome of connectToRemote() arrives as a signal.
//
// Conventions beyond SocketMember:
// - localPort() is the port actually in use while the member is bound,
//   listening or connected (so bind(0) reveals the chosen port), otherwise
//   the value last set.
// - A TCP client always connects from an ephemeral local port, with one
//   connect() per address tried: a connection reset before the member saw it
//   complete fails the attempt instead of starting another.
// - bind() on a TCP member already binds and listens in the kernel but holds
//   incoming connections back until listen(), so "port in use" shows at bind.
// - States used: 0 closed, 1 open (UDP bound, or TCP bound before listen),
//   2 listening, 4 resolving the host name, 6 connecting, 7 connected,
//   8 closed by the peer, 9 failed (after errorOccurred()).
// - dataArrived() carries bytesAvailable(). With a read buffer cap, data
//   left in the kernel is announced again once getData() has made room,
//   whether it took all buffered bytes or only part of them.
// - After the peer closes, the state is StateClosing (8) until close(); data
//   received before the close can still be taken with getData(). A reset by
//   the peer counts as a close: Qt does not tell the two apart.
// - An accepted connection sends on a descriptor of its own (StreamWriter).
//   When its peer stops sending it stays connected and half-closed: a FIN
//   does not tell a half-close from a complete close, so the connection
//   ends (closed()) only once a send fails or it is found reset or timed
//   out. A client connection ends at the peer's FIN.
// - UDP: getData() returns the next whole datagram whatever maxBytes says;
//   bytesAvailable() is the size of the next datagram. sendData() goes to
//   RemoteHost:RemotePort; with no RemoteHost it answers the sender of the
//   last datagram received, at the address and port that datagram came
//   from (RemotePort 0 takes that port too). A host name is looked up once
//   per RemoteHost text; datagrams sent meanwhile wait for the answer and are
//   dropped (with lastError() set) if the name does not resolve.
// - Failures inside a call return false and set lastError(); they never also
//   raise errorOccurred(), so the caller handles each failure exactly once.
class QtSocketMember : public SocketMember
{
    Q_OBJECT
public:
    explicit QtSocketMember(int index, QObject *parent = nullptr);
    ~QtSocketMember() override;

    void setProtocol(int protocol) override;
    int protocol() const override;
    void setRemoteHost(const QString &host) override;
    QString remoteHost() const override;
    void setRemotePort(int port) override;
    int remotePort() const override;
    void setLocalPort(int port) override;
    int localPort() const override;
    QString localIP() const override;
    QString remoteHostIP() const override;
    int state() const override;
    bool isHalfClosed() const override;

    bool bind(int localPort, const QString &localAddress = {}) override;
    bool connectToRemote() override;
    bool listen() override;
    bool accept(qintptr requestId) override;
    bool sendData(const QByteArray &bytes) override;
    QByteArray getData(qint64 maxBytes = -1) override;
    qint64 bytesAvailable() const override;
    qint64 bytesToWrite() const override;
    qint64 bytesHeldBack() const override;
    void setReadBufferSize(qint64 bytes) override;
    void close() override;
    void abort() override;

    int lastError() const override;
    QString errorString() const override;

private:
    void startConnecting(const QList<QHostAddress> &addresses);
    void adoptConnection(int descriptor);
    void failConnecting(QAbstractSocket::SocketError error, const QString &reason);
    void dropConnector();
    void handleTcpError(QAbstractSocket::SocketError error);
    void handleTcpDisconnected();
    void keepSendingSide();
    void announcePeerClose();
    void handleConnectionRequest(qintptr descriptor);
    void handleAcceptFailure(int errorNumber);
    void handleUdpReadyRead();
    void handleUdpError(QAbstractSocket::SocketError error);

    QTcpSocket *createTcpSocket();
    bool ensureUdpSocket();
    bool bindTcp(int port, const QHostAddress &address, const QString &addressText);
    bool bindUdp(int port, const QHostAddress &address, const QString &addressText);
    bool sendDatagram(const QByteArray &bytes);
    QByteArray takeDatagram();
    bool writeDatagram(const QByteArray &bytes, const QHostAddress &address, int port);
    void resolveDatagramHost();
    void sendWaitingDatagrams(const QHostAddress &address);
    // Drops every transport object without any further signal to the session.
    void releaseTransport();
    bool fail(int number, const QString &description);
    void reportError(const SocketFailure &failure);
    bool isBusy() const;

    int m_protocol = Tcp;
    QString m_remoteHost;
    int m_remotePort = 0;
    int m_localPort = 0;
    int m_state = StateClosed;
    int m_lastError = 0;
    QString m_errorString;
    qint64 m_readBufferSize = 0;
    bool m_inDatagramCall = false;

    QPointer<TcpConnector> m_connector;
    QPointer<QTcpSocket> m_tcp;
    // The sending side of an accepted connection, and whether its peer has
    // stopped sending.
    QPointer<StreamWriter> m_writer;
    bool m_halfClosed = false;
    QPointer<ConnectionRequestServer> m_server;
    QPointer<QUdpSocket> m_udp;
    QString m_peerAddress;

    // UDP: the sender of the last datagram, the answer of the last name
    // lookup, and datagrams waiting for a lookup in progress.
    QHostAddress m_lastSender;
    quint16 m_lastSenderPort = 0;
    QString m_resolvedName;
    QHostAddress m_resolvedAddress;
    int m_lookupId = -1;
    QList<QByteArray> m_waitingDatagrams;
    qint64 m_waitingBytes = 0;
};
