// The UDP side of a socket member: binding, datagrams in and out, and the
// non-blocking lookup of a RemoteHost given by name.
#include "QtSocketMember.h"

#include "HostAddressText.h"

#include <QHostInfo>
#include <QNetworkDatagram>
#include <QNetworkProxy>
#include <QScopedValueRollback>
#include <QUdpSocket>

#include <algorithm>
#include <utility>

namespace {

// Datagrams held while a host name is being looked up.
constexpr qint64 kMaxWaitingDatagramBytes = 1 << 20;

} // namespace

bool QtSocketMember::bindUdp(int port, const QHostAddress &address, const QString &addressText)
{
    auto *socket = new QUdpSocket(this);
    socket->setProxy(QNetworkProxy::NoProxy);
    // Without DontShareAddress Qt sets SO_REUSEADDR, and two UDP sockets
    // could then share a port silently.
    if (!socket->bind(address, quint16(port), QAbstractSocket::DontShareAddress)) {
        const SocketFailure failure = describeSocketError(
            socket->error(), SocketActivity::Binding, addressText, port, socket->errorString());
        delete socket;
        return fail(failure.number, failure.description);
    }
    connect(socket, &QUdpSocket::readyRead, this, &QtSocketMember::handleUdpReadyRead);
    connect(socket, &QUdpSocket::errorOccurred, this, &QtSocketMember::handleUdpError);
    m_udp = socket;
    m_localPort = socket->localPort();
    m_state = StateOpen;
    return true;
}

bool QtSocketMember::ensureUdpSocket()
{
    if (m_udp)
        return true;
    if (isBusy())
        return fail(SocketErrorNumber::kInvalidArgument,
                    QStringLiteral("Cannot send a datagram: the socket is in use (state %1)")
                        .arg(m_state));
    return bind(0);
}

bool QtSocketMember::sendDatagram(const QByteArray &bytes)
{
    if (!ensureUdpSocket())
        return false;
    const QString host = m_remoteHost.trimmed();
    if (host.isEmpty() && m_lastSender.isNull())
        return fail(ErrAddressNotAvailable, QStringLiteral("No remote host to send the datagram to"));
    // Without a remote host the member answers the last sender, at the port
    // its datagram came from: a client sends from a port of its own.
    const int port = host.isEmpty() || m_remotePort <= 0 ? m_lastSenderPort : m_remotePort;
    if (!isValidPort(port))
        return fail(ErrAddressNotAvailable,
                    QStringLiteral("Remote port %1 is out of range (1-65535); datagram not sent")
                        .arg(port));
    if (host.isEmpty())
        return writeDatagram(bytes, m_lastSender, port);
    const QHostAddress literal(host);
    if (!literal.isNull())
        return writeDatagram(bytes, literal, port);
    if (!isPlausibleHostName(host))
        return fail(ErrHostNotFound,
                    QStringLiteral("\"%1\" is neither an IP address nor a host name").arg(host));
    if (host == m_resolvedName && !m_resolvedAddress.isNull())
        return writeDatagram(bytes, m_resolvedAddress, port);
    if (m_waitingBytes + bytes.size() > kMaxWaitingDatagramBytes)
        return fail(SocketErrorNumber::kNoBuffers,
                    QStringLiteral("Still looking up %1; datagram dropped").arg(host));
    m_waitingDatagrams.append(bytes);
    m_waitingBytes += bytes.size();
    if (m_lookupId < 0)
        resolveDatagramHost();
    return true;
}

bool QtSocketMember::writeDatagram(const QByteArray &bytes, const QHostAddress &address, int port)
{
    QScopedValueRollback guard(m_inDatagramCall, true);
    if (m_udp->writeDatagram(bytes, address, quint16(port)) == bytes.size())
        return true;
    const SocketFailure failure =
        describeSocketError(m_udp->error(), SocketActivity::Datagram, dottedAddress(address), port,
                            m_udp->errorString());
    return fail(failure.number, failure.description);
}

void QtSocketMember::resolveDatagramHost()
{
    const QString name = m_remoteHost.trimmed();
    m_lookupId = QHostInfo::lookupHost(name, this, [this, name](const QHostInfo &info) {
        m_lookupId = -1;
        const QList<QHostAddress> addresses = info.addresses();
        const auto ipv4 = std::find_if(addresses.begin(), addresses.end(), [](const QHostAddress &a) {
            return a.protocol() == QAbstractSocket::IPv4Protocol;
        });
        if (ipv4 == addresses.end()) {
            fail(ErrHostNotFound, QStringLiteral("Host not found: %1; %2 datagrams dropped")
                                      .arg(name).arg(m_waitingDatagrams.size()));
            m_waitingDatagrams.clear();
            m_waitingBytes = 0;
            return;
        }
        m_resolvedName = name;
        m_resolvedAddress = *ipv4;
        sendWaitingDatagrams(*ipv4);
    });
}

void QtSocketMember::sendWaitingDatagrams(const QHostAddress &address)
{
    const QList<QByteArray> datagrams = std::exchange(m_waitingDatagrams, {});
    m_waitingBytes = 0;
    const int port = m_remotePort > 0 ? m_remotePort : m_lastSenderPort;
    for (const QByteArray &datagram : datagrams) {
        if (!m_udp || !writeDatagram(datagram, address, port))
            return;
    }
}

void QtSocketMember::handleUdpReadyRead()
{
    // One announcement per datagram: Qt announces the next one once this one
    // has been read.
    if (m_udp && m_udp->hasPendingDatagrams())
        Q_EMIT dataArrived(index(), qMax<qint64>(0, m_udp->pendingDatagramSize()));
}

void QtSocketMember::handleUdpError(QAbstractSocket::SocketError error)
{
    if (m_inDatagramCall || !m_udp)
        return;
    reportError(describeSocketError(error, SocketActivity::Datagram, m_peerAddress,
                                    m_lastSenderPort, m_udp->errorString()));
}

QByteArray QtSocketMember::takeDatagram()
{
    if (!m_udp || !m_udp->hasPendingDatagrams())
        return {};
    QScopedValueRollback guard(m_inDatagramCall, true);
    const QNetworkDatagram datagram = m_udp->receiveDatagram();
    if (!datagram.senderAddress().isNull()) {
        m_lastSender = datagram.senderAddress();
        m_lastSenderPort = quint16(datagram.senderPort());
        m_peerAddress = dottedAddress(m_lastSender);
    }
    return datagram.data();
}
