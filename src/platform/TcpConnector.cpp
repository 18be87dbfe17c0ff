#include "TcpConnector.h"

#include <QSocketNotifier>

#include <cerrno>
#include <cstring>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

// The Qt error that names the same failure, for describeSocketError().
QAbstractSocket::SocketError socketErrorFor(int errorNumber)
{
    switch (errorNumber) {
    case ECONNREFUSED:
        return QAbstractSocket::ConnectionRefusedError;
    case ETIMEDOUT:
        return QAbstractSocket::SocketTimeoutError;
    case ECONNRESET:
    case ECONNABORTED:
    case EPIPE:
        return QAbstractSocket::RemoteHostClosedError;
    case ENETUNREACH:
    case EHOSTUNREACH:
    case ENETDOWN:
    case EHOSTDOWN:
        return QAbstractSocket::NetworkError;
    case EACCES:
    case EPERM:
        return QAbstractSocket::SocketAccessError;
    case EADDRNOTAVAIL:
    case EMFILE:
    case ENFILE:
    case ENOBUFS:
    case ENOMEM:
        return QAbstractSocket::SocketResourceError;
    default:
        return QAbstractSocket::UnknownSocketError;
    }
}

} // namespace

TcpConnector::TcpConnector(QObject *parent)
    : QObject(parent)
{
    m_timeout.setSingleShot(true);
    connect(&m_timeout, &QTimer::timeout, this, [this] { giveUp(ETIMEDOUT); });
}

TcpConnector::~TcpConnector()
{
    closeSocket();
}

void TcpConnector::start(const QList<QHostAddress> &addresses, quint16 port, int timeoutMs)
{
    m_addresses = addresses;
    m_port = port;
    m_timeout.setInterval(timeoutMs);
    if (m_addresses.isEmpty()) {
        giveUp(EADDRNOTAVAIL);
        return;
    }
    tryNext();
}

void TcpConnector::abort()
{
    m_addresses.clear();
    m_timeout.stop();
    closeSocket();
}

void TcpConnector::tryNext()
{
    closeSocket();
    const QHostAddress address = m_addresses.takeFirst();
    sockaddr_storage storage {};
    socklen_t length = 0;
    if (address.protocol() == QAbstractSocket::IPv6Protocol) {
        auto *v6 = reinterpret_cast<sockaddr_in6 *>(&storage);
        v6->sin6_family = AF_INET6;
        v6->sin6_port = htons(m_port);
        const Q_IPV6ADDR bytes = address.toIPv6Address();
        std::memcpy(&v6->sin6_addr, &bytes, sizeof bytes);
        v6->sin6_scope_id = address.scopeId().toUInt();
        length = sizeof *v6;
    } else {
        auto *v4 = reinterpret_cast<sockaddr_in *>(&storage);
        v4->sin_family = AF_INET;
        v4->sin_port = htons(m_port);
        v4->sin_addr.s_addr = htonl(address.toIPv4Address());
        length = sizeof *v4;
    }
    m_fd = ::socket(storage.ss_family, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (m_fd < 0) {
        giveUp(errno);
        return;
    }
    // Interrupted, the attempt still goes on; its outcome is read below.
    if (::connect(m_fd, reinterpret_cast<const sockaddr *>(&storage), length) != 0 && errno != EINPROGRESS
        && errno != EINTR) {
        giveUp(errno);
        return;
    }
    m_notifier = new QSocketNotifier(qintptr(m_fd), QSocketNotifier::Write, this);
    connect(m_notifier, &QSocketNotifier::activated, this, &TcpConnector::checkOutcome);
    m_timeout.start();
}

void TcpConnector::checkOutcome()
{
    int error = 0;
    socklen_t length = sizeof error;
    if (::getsockopt(m_fd, SOL_SOCKET, SO_ERROR, &error, &length) != 0)
        error = errno;
    if (error != 0) {
        giveUp(error);
        return;
    }
    m_timeout.stop();
    const int connectedFd = m_fd;
    m_fd = -1;
    closeSocket();
    Q_EMIT connected(connectedFd);
}

void TcpConnector::giveUp(int errorNumber)
{
    m_timeout.stop();
    closeSocket();
    if (!m_addresses.isEmpty()) {
        tryNext();
        return;
    }
    const QAbstractSocket::SocketError error = socketErrorFor(errorNumber);
    const QString reason = QString::fromLocal8Bit(std::strerror(errorNumber));
    // Also a failure found inside start() is told only afterwards.
    QMetaObject::invokeMethod(this, [this, error, reason] { Q_EMIT failed(error, reason); },
                              Qt::QueuedConnection);
}

void TcpConnector::closeSocket()
{
    if (m_notifier) {
        m_notifier->setEnabled(false);
        m_notifier->deleteLater();
        m_notifier = nullptr;
    }
    if (m_fd >= 0) {
        ::close(m_fd);
        m_fd = -1;
    }
}
