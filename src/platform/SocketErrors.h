#pragma once

#include <QAbstractSocket>
#include <QString>

// Error numbers a socket member reports besides those the session compares
// (SocketMember::ErrorNumber). They follow the Windows-sockets numbering so
// every failure reads the same way in the error log, and all but the first
// lie above 10000, so the session closes the connection on any of them.
namespace SocketErrorNumber {
// The control's out-of-memory error: below 10000, so the session keeps the
// member (a listening socket that runs out of descriptors goes on listening).
inline constexpr int kOutOfResources = 7;
inline constexpr int kAccessDenied = 10013;      // WSAEACCES: e.g. a port below 1024
inline constexpr int kInvalidArgument = 10022;   // WSAEINVAL: bad value, unknown request id
inline constexpr int kAlreadyInProgress = 10037; // WSAEALREADY: connect while connecting
inline constexpr int kMessageTooLong = 10040;    // WSAEMSGSIZE: datagram too large
inline constexpr int kNotSupported = 10045;      // WSAEOPNOTSUPP: not for this protocol
inline constexpr int kNetworkDown = 10050;       // WSAENETDOWN: other network failures
inline constexpr int kNoBuffers = 10055;         // WSAENOBUFS: out of sockets or memory
inline constexpr int kAlreadyConnected = 10056;  // WSAEISCONN: member busy
inline constexpr int kNotConnected = 10057;      // WSAENOTCONN: send without a connection
inline constexpr int kGeneralFailure = 10107;    // WSASYSCALLFAILURE: anything else
}

struct SocketFailure
{
    int number = 0;
    QString description;
};

// What the member was doing when Qt reported an error. Qt lumps several
// causes into one error code; the activity tells them apart (a network
// error while connecting means the host is unreachable, once connected it
// means the connection was aborted).
enum class SocketActivity { Connecting, Connected, Binding, Datagram };

// Number and user-facing description of a Qt socket error. host and port
// name the other end (or the local address when binding); qtText is Qt's
// own wording, appended where it adds detail.
SocketFailure describeSocketError(QAbstractSocket::SocketError error, SocketActivity activity,
                                  const QString &host, int port, const QString &qtText);

// "host:port"; "port N" without a host.
QString endpointText(const QString &host, int port);
