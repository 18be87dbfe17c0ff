#include "QtSocketMember.h"

#include "ConnectionRequestServer.h"
#include "HostAddressText.h"
#include "LocalAddresses.h"
#include "StreamWriter.h"
#include "TcpConnector.h"

#include <QCoreApplication>
#include <QHostInfo>
#include <QNetworkProxy>
#include <QSet>
#include <QTcpSocket>
#include <QTimer>
#include <QUdpSocket>

#include <cstring>
#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

namespace {

// How long a locally closed connection may take to hand its queued bytes to
// the peer before it is cut.
constexpr int kLingerMs = 10000;
// How long one address may take to answer a connection attempt.
constexpr int kConnectTimeoutMs = 30000;

// Connection requests announced but not yet taken over. A listening member
// enters a descriptor before announcing it and closes it afterwards unless
// accept() took it out; accept() takes only ids found here, so it can never
// adopt an unrelated descriptor.
QSet<qintptr> &pendingRequests()
{
    static QSet<qintptr> requests;
    return requests;
}

// Lets a locally closed connection send what is still queued, then deletes
// it; it no longer belongs to any member. The application holds it
// meanwhile, so one still lingering when the program ends is freed too.
void closeGracefully(QTcpSocket *socket)
{
    socket->setParent(QCoreApplication::instance());
    QObject::connect(socket, &QAbstractSocket::disconnected, socket, &QObject::deleteLater);
    if (socket->state() == QAbstractSocket::ConnectedState)
        socket->disconnectFromHost();
    else
        socket->abort();
    if (socket->state() == QAbstractSocket::UnconnectedState) {
        socket->deleteLater();
        return;
    }
    QTimer::singleShot(kLingerMs, socket, [socket] {
        socket->abort();
        socket->deleteLater();
    });
}

} // namespace

QtSocketMember::QtSocketMember(int index, QObject *parent)
    : SocketMember(index, parent)
{
}

QtSocketMember::~QtSocketMember()
{
    releaseTransport();
}

void QtSocketMember::setProtocol(int protocol)
{
    m_protocol = protocol == Udp ? Udp : Tcp;
}

int QtSocketMember::protocol() const
{
    return m_protocol;
}

void QtSocketMember::setRemoteHost(const QString &host)
{
    m_remoteHost = host;
}

QString QtSocketMember::remoteHost() const
{
    return m_remoteHost;
}

void QtSocketMember::setRemotePort(int port)
{
    m_remotePort = port;
}

int QtSocketMember::remotePort() const
{
    return m_remotePort;
}

void QtSocketMember::setLocalPort(int port)
{
    m_localPort = port;
}

int QtSocketMember::localPort() const
{
    if (m_server && m_server->isListening())
        return m_server->serverPort();
    if (m_tcp && m_tcp->localPort() != 0)
        return m_tcp->localPort();
    if (m_udp && m_udp->localPort() != 0)
        return m_udp->localPort();
    return m_localPort;
}

QString QtSocketMember::localIP() const
{
    const QStringList addresses = localIPv4Addresses();
    return addresses.isEmpty() ? QString() : addresses.first();
}

QString QtSocketMember::remoteHostIP() const
{
    return m_peerAddress;
}

int QtSocketMember::state() const
{
    return m_state;
}

bool QtSocketMember::isHalfClosed() const
{
    return m_halfClosed && m_state == StateConnected;
}

bool QtSocketMember::isBusy() const
{
    return m_state != StateClosed && m_state != StateClosing && m_state != StateError;
}

bool QtSocketMember::bind(int localPort, const QString &localAddress)
{
    if (localPort < 0 || localPort > 65535)
        return fail(SocketErrorNumber::kInvalidArgument,
                    QStringLiteral("Local port %1 is out of range (0-65535)").arg(localPort));
    if (isBusy())
        return fail(SocketErrorNumber::kAlreadyConnected,
                    QStringLiteral("Cannot bind: the socket is in use (state %1)").arg(m_state));
    const QString addressText = localAddress.trimmed();
    QHostAddress address(QHostAddress::AnyIPv4);
    if (!addressText.isEmpty() && !address.setAddress(addressText))
        return fail(ErrAddressNotAvailable,
                    QStringLiteral("Local address \"%1\" is not an IP address").arg(localAddress));
    if (!isLocalAddress(address))
        return fail(ErrAddressNotAvailable,
                    QStringLiteral("Local address %1 is not an address of this machine")
                        .arg(addressText));
    releaseTransport();
    m_state = StateClosed;
    return m_protocol == Udp ? bindUdp(localPort, address, addressText)
                             : bindTcp(localPort, address, addressText);
}

bool QtSocketMember::bindTcp(int port, const QHostAddress &address, const QString &addressText)
{
    auto *server = new ConnectionRequestServer(this);
    server->setProxy(QNetworkProxy::NoProxy);
    if (!server->listenHeld(address, quint16(port))) {
        const SocketFailure failure = describeSocketError(
            server->serverError(), SocketActivity::Binding, addressText, port, server->errorString());
        delete server;
        return fail(failure.number, failure.description);
    }
    // The kernel queues connections from here on; they are handed out only
    // once listen() is called.
    connect(server, &ConnectionRequestServer::connectionRequested, this,
            &QtSocketMember::handleConnectionRequest);
    connect(server, &ConnectionRequestServer::acceptFailed, this, &QtSocketMember::handleAcceptFailure);
    m_server = server;
    m_localPort = server->serverPort();
    m_state = StateOpen;
    return true;
}

bool QtSocketMember::listen()
{
    if (m_protocol != Tcp)
        return fail(SocketErrorNumber::kNotSupported,
                    QStringLiteral("A UDP socket cannot listen for connections"));
    if (m_state == StateListening)
        return true;
    if (!m_server && !bind(m_localPort))
        return false;
    if (!m_server)
        return fail(SocketErrorNumber::kInvalidArgument,
                    QStringLiteral("Cannot listen: the socket is in use (state %1)").arg(m_state));
    m_server->setAccepting(true);
    m_state = StateListening;
    return true;
}

bool QtSocketMember::connectToRemote()
{
    if (m_protocol != Tcp)
        return fail(SocketErrorNumber::kNotSupported,
                    QStringLiteral("A UDP socket does not connect; bind it instead"));
    const QString host = m_remoteHost.trimmed();
    const QString target = endpointText(host, m_remotePort);
    if (m_state == StateConnected)
        return fail(SocketErrorNumber::kAlreadyConnected,
                    QStringLiteral("Already connected to %1").arg(m_peerAddress));
    if (m_state == StateResolvingHost || m_state == StateConnecting)
        return fail(SocketErrorNumber::kAlreadyInProgress,
                    QStringLiteral("A connection to %1 is already being made").arg(target));
    if (isBusy())
        return fail(SocketErrorNumber::kAlreadyConnected,
                    QStringLiteral("Cannot connect: the socket is in use (state %1)").arg(m_state));
    if (host.isEmpty())
        return fail(ErrHostNotFound, QStringLiteral("No remote host given"));
    if (!isValidPort(m_remotePort))
        return fail(ErrAddressNotAvailable,
                    QStringLiteral("Remote port %1 is out of range (1-65535)").arg(m_remotePort));
    QHostAddress literal;
    if (!literal.setAddress(host) && !isPlausibleHostName(host))
        return fail(ErrHostNotFound,
                    QStringLiteral("\"%1\" is neither an IP address nor a host name").arg(host));

    releaseTransport();
    m_peerAddress.clear();
    if (!literal.isNull()) {
        startConnecting({ literal });
        return true;
    }
    m_state = StateResolvingHost;
    m_lookupId = QHostInfo::lookupHost(host, this, [this](const QHostInfo &info) {
        m_lookupId = -1;
        QList<QHostAddress> addresses;
        for (const QHostAddress &address : info.addresses()) {
            if (address.protocol() == QAbstractSocket::IPv4Protocol)
                addresses << address;
        }
        if (addresses.isEmpty())
            failConnecting(QAbstractSocket::HostNotFoundError, info.errorString());
        else
            startConnecting(addresses);
    });
    return true;
}

void QtSocketMember::startConnecting(const QList<QHostAddress> &addresses)
{
    m_state = StateConnecting;
    auto *connector = new TcpConnector(this);
    connect(connector, &TcpConnector::connected, this, &QtSocketMember::adoptConnection);
    connect(connector, &TcpConnector::failed, this, &QtSocketMember::failConnecting);
    m_connector = connector;
    connector->start(addresses, quint16(m_remotePort), kConnectTimeoutMs);
}

void QtSocketMember::adoptConnection(int descriptor)
{
    dropConnector();
    QTcpSocket *socket = createTcpSocket();
    if (!socket->setSocketDescriptor(descriptor)) {
        const QString reason = socket->errorString();
        ::close(descriptor);
        failConnecting(QAbstractSocket::UnknownSocketError, reason);
        return;
    }
    m_state = StateConnected;
    m_peerAddress = dottedAddress(socket->peerAddress());
    Q_EMIT connected(index());
}

void QtSocketMember::failConnecting(QAbstractSocket::SocketError error, const QString &reason)
{
    const SocketFailure failure = describeSocketError(error, SocketActivity::Connecting,
                                                      m_remoteHost.trimmed(), m_remotePort, reason);
    releaseTransport();
    m_state = StateError;
    reportError(failure);
}

void QtSocketMember::dropConnector()
{
    if (TcpConnector *connector = m_connector) {
        m_connector = nullptr;
        connector->disconnect(this);
        connector->abort();
        connector->deleteLater();
    }
}

bool QtSocketMember::accept(qintptr requestId)
{
    if (m_protocol != Tcp)
        return fail(SocketErrorNumber::kNotSupported,
                    QStringLiteral("A UDP socket cannot accept a connection"));
    if (isBusy())
        return fail(SocketErrorNumber::kAlreadyConnected,
                    QStringLiteral("Cannot accept: the socket is in use (state %1)").arg(m_state));
    if (!pendingRequests().remove(requestId))
        return fail(SocketErrorNumber::kInvalidArgument,
                    QStringLiteral("No connection request %1 is waiting").arg(requestId));
    releaseTransport();
    QTcpSocket *socket = createTcpSocket();
    if (!socket->setSocketDescriptor(requestId)) {
        const QString reason = socket->errorString();
        releaseTransport();
        // Qt does not take the descriptor when it refuses it.
        ::close(int(requestId));
        m_state = StateClosed;
        return fail(SocketErrorNumber::kGeneralFailure,
                    QStringLiteral("Cannot take over the connection: %1").arg(reason));
    }
    m_peerAddress = dottedAddress(socket->peerAddress());
    m_state = StateConnected;
    keepSendingSide();
    return true;
}

void QtSocketMember::keepSendingSide()
{
    // Without a descriptor to spare, a half-close ends the connection.
    const int descriptor = ::fcntl(int(m_tcp->socketDescriptor()), F_DUPFD_CLOEXEC, 0);
    if (descriptor < 0)
        return;
    auto *writer = new StreamWriter(descriptor, this);
    connect(writer, &StreamWriter::bytesWritten, this, [this](qint64 bytes) { Q_EMIT bytesWritten(index(), bytes); });
    connect(writer, &StreamWriter::broken, this, [this] {
        if (m_state == StateConnected || m_state == StateClosing)
            announcePeerClose();
    });
    m_writer = writer;
}

QTcpSocket *QtSocketMember::createTcpSocket()
{
    auto *socket = new QTcpSocket(this);
    socket->setProxy(QNetworkProxy::NoProxy);
    socket->setReadBufferSize(m_readBufferSize);
    connect(socket, &QTcpSocket::errorOccurred, this, &QtSocketMember::handleTcpError);
    connect(socket, &QTcpSocket::disconnected, this, &QtSocketMember::handleTcpDisconnected);
    connect(socket, &QTcpSocket::readyRead, this,
            [this] { Q_EMIT dataArrived(index(), m_tcp ? m_tcp->bytesAvailable() : 0); });
    connect(socket, &QTcpSocket::bytesWritten, this,
            [this](qint64 bytes) { Q_EMIT bytesWritten(index(), bytes); });
    m_tcp = socket;
    return socket;
}

void QtSocketMember::handleTcpError(QAbstractSocket::SocketError error)
{
    // A close by the peer is reported by disconnected() right after (or
    // already was, when a send found it).
    if (error == QAbstractSocket::RemoteHostClosedError
        && (m_state == StateConnected || m_state == StateClosing))
        return;
    const bool wasConnected = m_state == StateConnected;
    const SocketFailure failure = describeSocketError(
        error, wasConnected ? SocketActivity::Connected : SocketActivity::Connecting,
        wasConnected ? m_peerAddress : m_remoteHost.trimmed(),
        wasConnected ? m_tcp->peerPort() : m_remotePort, m_tcp->errorString());
    releaseTransport();
    m_state = StateError;
    reportError(failure);
}

void QtSocketMember::handleTcpDisconnected()
{
    if (m_state != StateConnected)
        return;
    // The peer may only have stopped sending and still wait for an answer.
    if (m_writer && !m_writer->isBroken()) {
        m_halfClosed = true;
        m_writer->watchForEnd();
        return;
    }
    announcePeerClose();
}

void QtSocketMember::announcePeerClose()
{
    m_state = StateClosing;
    if (m_writer)
        m_writer->disconnect(this);
    Q_EMIT closed(index());
}

void QtSocketMember::handleConnectionRequest(qintptr descriptor)
{
    pendingRequests().insert(descriptor);
    Q_EMIT connectionRequested(index(), descriptor);
    // Nobody took it: close it now, so the client learns at once instead of
    // waiting on a connection that carries nothing.
    if (pendingRequests().remove(descriptor))
        ::close(int(descriptor));
}

void QtSocketMember::handleAcceptFailure(int errorNumber)
{
    // Reported as the control's out-of-memory error, which leaves the
    // listening socket open: the acceptor resumes by itself once
    // descriptors are free, while the Windows-sockets numbers for these
    // failures would make the session close it.
    reportError({ SocketErrorNumber::kOutOfResources,
                  QStringLiteral("Cannot accept connections on port %1: %2; waiting clients are turned away for now")
                      .arg(localPort())
                      .arg(QString::fromLocal8Bit(std::strerror(errorNumber))) });
}

bool QtSocketMember::sendData(const QByteArray &bytes)
{
    if (m_protocol == Udp)
        return sendDatagram(bytes);
    if (m_state != StateConnected || !m_tcp)
        return fail(SocketErrorNumber::kNotConnected,
                    QStringLiteral("Not connected; %1 bytes not sent").arg(bytes.size()));
    if (bytes.isEmpty())
        return true;
    if (m_writer) {
        if (m_writer->write(bytes))
            return true;
        // The connection is gone; closed() follows.
        m_state = StateClosing;
        return fail(ErrConnectionReset, QStringLiteral("Connection to %1 lost (%2); %3 bytes not sent")
                                            .arg(m_peerAddress, m_writer->errorString())
                                            .arg(bytes.size()));
    }
    if (m_tcp->write(bytes) != bytes.size())
        return fail(SocketErrorNumber::kGeneralFailure,
                    QStringLiteral("Cannot send to %1: %2").arg(m_peerAddress, m_tcp->errorString()));
    return true;
}

QByteArray QtSocketMember::getData(qint64 maxBytes)
{
    if (m_protocol == Udp)
        return takeDatagram();
    if (!m_tcp)
        return {};
    const QByteArray bytes = maxBytes < 0 ? m_tcp->readAll() : m_tcp->read(maxBytes);
    // Qt resumes reading a full buffer from the kernel only once the buffer
    // has been emptied. After a partial read, setting the cap anew re-arms it,
    // so data still held in the kernel is announced by a later dataArrived().
    if (m_readBufferSize > 0 && m_tcp->bytesAvailable() > 0) {
        m_tcp->setReadBufferSize(m_readBufferSize + 1);
        m_tcp->setReadBufferSize(m_readBufferSize);
    }
    return bytes;
}

qint64 QtSocketMember::bytesAvailable() const
{
    if (m_protocol == Udp)
        return m_udp && m_udp->hasPendingDatagrams() ? qMax<qint64>(0, m_udp->pendingDatagramSize())
                                                     : 0;
    return m_tcp ? m_tcp->bytesAvailable() : 0;
}

qint64 QtSocketMember::bytesToWrite() const
{
    if (m_protocol == Udp)
        return m_waitingBytes;
    if (m_writer)
        return m_writer->bytesToWrite();
    return m_tcp ? m_tcp->bytesToWrite() : 0;
}

qint64 QtSocketMember::bytesHeldBack() const
{
    if (m_protocol == Udp)
        return m_waitingBytes;
    if (m_writer)
        return m_writer->bytesHeldBack();
    if (!m_tcp || m_tcp->bytesToWrite() == 0)
        return 0;
    // Bytes that the kernel would take have simply not been written yet.
    pollfd writable { int(m_tcp->socketDescriptor()), POLLOUT, 0 };
    if (::poll(&writable, 1, 0) > 0 && (writable.revents & POLLOUT))
        return 0;
    return m_tcp->bytesToWrite();
}

void QtSocketMember::setReadBufferSize(qint64 bytes)
{
    m_readBufferSize = qMax<qint64>(0, bytes);
    if (m_tcp)
        m_tcp->setReadBufferSize(m_readBufferSize);
}

void QtSocketMember::close()
{
    releaseTransport();
    m_state = StateClosed;
}

void QtSocketMember::abort()
{
    if (QTcpSocket *socket = m_tcp) {
        socket->disconnect(this);
        socket->abort();
    }
    close();
}

int QtSocketMember::lastError() const
{
    return m_lastError;
}

QString QtSocketMember::errorString() const
{
    return m_errorString;
}

void QtSocketMember::releaseTransport()
{
    dropConnector();
    m_halfClosed = false;
    if (StreamWriter *writer = m_writer) {
        m_writer = nullptr;
        writer->disconnect(this);
        writer->finish(kLingerMs);
    }
    if (QTcpSocket *socket = m_tcp) {
        m_tcp = nullptr;
        socket->disconnect(this);
        closeGracefully(socket);
    }
    if (ConnectionRequestServer *server = m_server) {
        m_server = nullptr;
        server->disconnect(this);
        server->setAccepting(false);
        server->close();
        server->deleteLater();
    }
    if (QUdpSocket *socket = m_udp) {
        m_udp = nullptr;
        socket->disconnect(this);
        socket->close();
        socket->deleteLater();
    }
    if (m_lookupId >= 0) {
        QHostInfo::abortHostLookup(m_lookupId);
        m_lookupId = -1;
    }
    m_waitingDatagrams.clear();
    m_waitingBytes = 0;
}

bool QtSocketMember::fail(int number, const QString &description)
{
    m_lastError = number;
    m_errorString = description;
    return false;
}

void QtSocketMember::reportError(const SocketFailure &failure)
{
    fail(failure.number, failure.description);
    Q_EMIT errorOccurred(index(), failure.number, failure.description);
}
