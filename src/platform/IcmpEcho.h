#pragma once

#include "IcmpStatus.h"

#include <QByteArray>
#include <QMetaType>
#include <QObject>
#include <QString>

#include <functional>
#include <map>

// What one ICMP echo request came back with.
struct EchoReply
{
    // Echoed bytes the record can hold; a request with more data is refused
    // with IpStatus::kBufferTooSmall, as the reply would not fit.
    static constexpr int kDataCapacity = 250;

    // The replying IPv4 address (or the router that reported an error),
    // kept as its four bytes in network order read as a little-endian
    // number: 127.0.0.1 is 16777343 on every host. 0 when nothing came back.
    quint32 Address = 0;
    qint32 Status = 0;         // IpStatus code
    quint32 RoundTripTime = 0; // milliseconds
    quint32 DataSize = 0;      // echoed bytes
    QByteArray Data;           // the echoed bytes, at most kDataCapacity
    // True once the request has left this machine. False with
    // IpStatus::kGeneralFailure means no ICMP socket could be opened or the
    // kernel refused to send (no permission): the status says nothing
    // about the peer. False with -1 means the address was not dotted text.
    bool Sent = false;

    // Address as the signed decimal number the ping dialog shows.
    qint32 addressDecimal() const { return qint32(Address); }
    // The four address bytes in network order.
    QByteArray addressBytes() const;
    // Data up to the first NUL byte, as text.
    QString dataText() const;
};
Q_DECLARE_METATYPE(EchoReply)

// Sends ICMP echo requests without ever blocking the event loop: each
// request gets its own non-blocking ICMP socket, and its reply, ICMP error
// or time-out arrives through a socket notifier or a timer.
//
// The socket is an unprivileged ICMP datagram socket where the kernel
// allows one (sysctl net.ipv4.ping_group_range names the caller's group),
// otherwise a raw ICMP socket (needs CAP_NET_RAW). With neither the request
// ends with IpStatus::kGeneralFailure and Sent false.
class IcmpEcho : public QObject
{
    Q_OBJECT
public:
    enum class Transport { Automatic, DatagramOnly, RawOnly };

    explicit IcmpEcho(QObject *parent = nullptr);
    // Pending requests end silently: their sockets close, nothing is emitted.
    ~IcmpEcho() override;

    // Which kind of ICMP socket new requests may use; Automatic tries the
    // datagram socket first.
    void setTransport(Transport transport);

    // Starts one echo request to a dotted-decimal IPv4 address (the forms
    // inet_addr() accepts; anything else, a host name or empty text
    // included, ends with -1 and nothing is sent) carrying data, waiting
    // timeoutMs (at least 1) for the reply. Returns the request's id, never
    // 0. finished() follows exactly once for it, always later from the event
    // loop, never from inside send().
    quint32 send(const QString &address, const QByteArray &data, int timeoutMs);

    // Ends every pending request without a finished() signal.
    void cancelAll();

    int pendingCount() const;

Q_SIGNALS:
    void finished(quint32 requestId, const EchoReply &reply);

private:
    class Request;
    void complete(quint32 requestId, const EchoReply &reply);

    Transport m_transport = Transport::Automatic;
    quint32 m_lastRequestId = 0;
    std::map<quint32, Request *> m_requests; // children of this object
};

// Dotted decimal text of four address bytes in network order
// ("\x7f\0\0\x01" → "127.0.0.1"); empty text unless there are exactly four.
QString IPToText(const QByteArray &addressBytes);

// Looks the host name up without blocking and calls done with the dotted
// text of its first IPv4 address, or with empty text when it does not
// resolve (an empty name included). A dotted address resolves to itself.
// done runs later from the event loop, and not at all once context is gone.
void GetIPFromHostName(const QString &hostName, QObject *context,
                       std::function<void(const QString &address)> done);

// One watchdog ping: an echo request with the data "Hello" to a dotted
// address, waiting timeoutMs (the caller takes it from PingTimeoutMsFor()
// of the global PingTimeout and keeps PingTimeoutMs in step). done gets the
// status: 0 when the peer answered, and also 0 when no echo could be sent
// at all for lack of permission, because an unsent ping is no evidence of
// a dead peer; any other value is a failure to show with GetStatusCode().
// done runs later from the event loop, and not at all once context is gone.
void PingRemoteHost(const QString &address, int timeoutMs, QObject *context,
                    std::function<void(int status)> done);
