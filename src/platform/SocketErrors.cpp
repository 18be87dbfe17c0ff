#include "SocketErrors.h"

#include "SocketMember.h"

QString endpointText(const QString &host, int port)
{
    if (host.isEmpty())
        return QStringLiteral("port %1").arg(port);
    return QStringLiteral("%1:%2").arg(host).arg(port);
}

namespace {

QString localEndpointText(const QString &host, int port)
{
    if (host.isEmpty())
        return QStringLiteral("Local port %1").arg(port);
    return QStringLiteral("Local address %1:%2").arg(host).arg(port);
}

SocketFailure networkFailure(SocketActivity activity, const QString &endpoint,
                             const QString &qtText)
{
    switch (activity) {
    case SocketActivity::Connecting:
        return {SocketMember::ErrHostUnreachable,
                QStringLiteral("Cannot reach %1: %2").arg(endpoint, qtText)};
    case SocketActivity::Connected:
        return {SocketMember::ErrConnectionAborted,
                QStringLiteral("Connection to %1 aborted: %2").arg(endpoint, qtText)};
    default:
        return {SocketErrorNumber::kNetworkDown,
                QStringLiteral("Network error on %1: %2").arg(endpoint, qtText)};
    }
}

} // namespace

SocketFailure describeSocketError(QAbstractSocket::SocketError error, SocketActivity activity,
                                  const QString &host, int port, const QString &qtText)
{
    const QString endpoint = endpointText(host, port);
    switch (error) {
    case QAbstractSocket::ConnectionRefusedError:
        return {SocketMember::ErrConnectionRefused,
                QStringLiteral("Connection refused by %1").arg(endpoint)};
    case QAbstractSocket::HostNotFoundError:
        return {SocketMember::ErrHostNotFound, QStringLiteral("Host not found: %1").arg(host)};
    case QAbstractSocket::SocketTimeoutError:
        if (activity == SocketActivity::Connecting)
            return {SocketMember::ErrTimedOut,
                    QStringLiteral("Connection to %1 timed out").arg(endpoint)};
        return {SocketMember::ErrTimedOut, QStringLiteral("Timed out on %1").arg(endpoint)};
    case QAbstractSocket::RemoteHostClosedError:
        return {SocketMember::ErrConnectionReset,
                QStringLiteral("Connection closed by %1").arg(endpoint)};
    case QAbstractSocket::AddressInUseError:
        return {SocketMember::ErrAddressInUse,
                QStringLiteral("%1 is already in use").arg(localEndpointText(host, port))};
    case QAbstractSocket::SocketAddressNotAvailableError:
        return {SocketMember::ErrAddressNotAvailable,
                QStringLiteral("%1 is not available on this machine")
                    .arg(localEndpointText(host, port))};
    case QAbstractSocket::NetworkError:
        return networkFailure(activity, endpoint, qtText);
    case QAbstractSocket::SocketAccessError:
        return {SocketErrorNumber::kAccessDenied,
                QStringLiteral("Permission denied for %1: %2").arg(endpoint, qtText)};
    case QAbstractSocket::SocketResourceError:
        return {SocketErrorNumber::kNoBuffers,
                QStringLiteral("Out of socket resources: %1").arg(qtText)};
    case QAbstractSocket::DatagramTooLargeError:
        return {SocketErrorNumber::kMessageTooLong,
                QStringLiteral("Datagram too large to send to %1").arg(endpoint)};
    case QAbstractSocket::UnsupportedSocketOperationError:
        return {SocketErrorNumber::kNotSupported,
                QStringLiteral("Operation not supported: %1").arg(qtText)};
    case QAbstractSocket::OperationError:
    case QAbstractSocket::UnfinishedSocketOperationError:
        return {SocketErrorNumber::kInvalidArgument, qtText};
    default:
        return {SocketErrorNumber::kGeneralFailure,
                QStringLiteral("Socket error on %1: %2").arg(endpoint, qtText)};
    }
}
