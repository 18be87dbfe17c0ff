#include "IcmpEcho.h"

#include "IcmpStatus.h"

#include <QCoreApplication>
#include <QElapsedTimer>
#include <QHostAddress>
#include <QHostInfo>
#include <QPointer>
#include <QSocketNotifier>
#include <QStringList>
#include <QTimer>
#include <QtEndian>

#include <arpa/inet.h>
#include <linux/errqueue.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <optional>

namespace {

constexpr quint8 kIcmpEchoReply = 0;
constexpr quint8 kIcmpEchoRequest = 8;
constexpr int kIcmpHeaderSize = 8;
// Room for an IP header with options, the ICMP header and the largest
// datagram an echo can come back in.
constexpr int kReceiveBufferSize = 65536 + 128;
// Reads per notifier wake-up: a raw socket sees every ICMP packet of the
// host, so a flood of foreign traffic must not keep us in one handler.
constexpr int kMaxReadsPerWakeUp = 64;

quint16 nextSequence()
{
    static std::atomic<quint16> sequence { 0 };
    return ++sequence;
}

quint16 internetChecksum(const QByteArray &bytes)
{
    quint32 sum = 0;
    const auto *data = reinterpret_cast<const uchar *>(bytes.constData());
    qsizetype i = 0;
    for (; i + 1 < bytes.size(); i += 2)
        sum += quint32(data[i]) << 8 | data[i + 1];
    if (i < bytes.size())
        sum += quint32(data[i]) << 8;
    while (sum >> 16)
        sum = (sum & 0xffff) + (sum >> 16);
    return quint16(~sum);
}

quint32 addressFromNetworkOrder(in_addr_t networkOrder)
{
    uchar bytes[4];
    std::memcpy(bytes, &networkOrder, sizeof bytes);
    return qFromLittleEndian<quint32>(bytes);
}

// inet_addr() with the failures it cannot report itself.
std::optional<in_addr_t> parseDottedAddress(const QString &address)
{
    if (address.isEmpty() || address.contains(QChar(0)))
        return std::nullopt;
    const QByteArray latin1 = address.toLatin1();
    if (QString::fromLatin1(latin1) != address)
        return std::nullopt;
    const in_addr_t converted = inet_addr(latin1.constData());
    if (converted == INADDR_NONE)
        return std::nullopt;
    return converted;
}

EchoReply failure(int status, bool sent = false)
{
    EchoReply reply;
    reply.Status = status;
    reply.Sent = sent;
    return reply;
}

// One datagram into `data`, its sender into `from` and its ancillary data
// into `control`.
msghdr messageHeader(iovec &data, sockaddr_in &from, char *control, size_t controlSize)
{
    msghdr message {};
    message.msg_name = &from;
    message.msg_namelen = sizeof from;
    message.msg_iov = &data;
    message.msg_iovlen = 1;
    message.msg_control = control;
    message.msg_controllen = controlSize;
    return message;
}

} // namespace

QByteArray EchoReply::addressBytes() const
{
    QByteArray bytes(4, '\0');
    qToLittleEndian(Address, bytes.data());
    return bytes;
}

QString EchoReply::dataText() const
{
    const qsizetype end = Data.indexOf('\0');
    return QString::fromLocal8Bit(end < 0 ? Data : Data.left(end));
}

// One echo request in flight: its socket, notifier and time-out. A request
// that ends before anything is sent (bad address, no socket) has no socket
// and ends on a zero time-out, so its result still arrives from the event
// loop and cancelAll() still drops it.
class IcmpEcho::Request : public QObject
{
public:
    Request(IcmpEcho &owner, quint32 id) : QObject(&owner), m_owner(owner), m_id(id)
    {
        m_timer.setSingleShot(true);
        m_timer.setTimerType(Qt::PreciseTimer);
        connect(&m_timer, &QTimer::timeout, this, &Request::handleTimeout);
    }

    ~Request() override { closeSocket(); }

    void start(Transport transport, const QString &address, const QByteArray &data, int timeoutMs)
    {
        const std::optional<in_addr_t> destination = parseDottedAddress(address);
        if (!destination)
            return endSoon(failure(IpStatus::kBadIpFormat));
        if (data.size() > EchoReply::kDataCapacity)
            return endSoon(failure(IpStatus::kBufferTooSmall));
        if (!openSocket(transport))
            return endSoon(failure(IpStatus::kGeneralFailure));

        m_sequence = nextSequence();
        // A datagram socket's kernel puts its own identifier in; a raw
        // socket sees every echo reply of the host and needs ours to filter.
        m_identifier = quint16(getpid());
        QByteArray packet(kIcmpHeaderSize, '\0');
        packet[0] = char(kIcmpEchoRequest);
        qToBigEndian(m_identifier, packet.data() + 4);
        qToBigEndian(m_sequence, packet.data() + 6);
        packet += data;
        if (m_raw)
            qToBigEndian(internetChecksum(packet), packet.data() + 2);

        sockaddr_in to {};
        to.sin_family = AF_INET;
        to.sin_addr.s_addr = *destination;
        m_elapsed.start();
        ::gettimeofday(&m_sentAt, nullptr);
        if (::sendto(m_fd, packet.constData(), size_t(packet.size()), MSG_DONTWAIT,
                     reinterpret_cast<const sockaddr *>(&to), sizeof to) < 0) {
            const int error = errno;
            closeSocket();
            // Not permitted (a firewall rule, a broadcast) is as good as no
            // ICMP at all; no route is a real verdict on the peer.
            const bool refusedLocally = error == EPERM || error == EACCES;
            return endSoon(failure(refusedLocally ? IpStatus::kGeneralFailure : statusForLocalError(error)));
        }

        m_notifier = new QSocketNotifier(m_fd, QSocketNotifier::Read, this);
        connect(m_notifier, &QSocketNotifier::activated, this, &Request::handleReadable);
        m_timer.start(qMax(timeoutMs, 1));
    }

private:
    bool openSocket(Transport transport)
    {
        constexpr int kType = SOCK_NONBLOCK | SOCK_CLOEXEC;
        if (transport != Transport::RawOnly)
            m_fd = ::socket(AF_INET, SOCK_DGRAM | kType, IPPROTO_ICMP);
        if (m_fd < 0 && transport != Transport::DatagramOnly) {
            m_fd = ::socket(AF_INET, SOCK_RAW | kType, IPPROTO_ICMP);
            m_raw = m_fd >= 0;
        }
        if (m_fd < 0)
            return false;
        // ICMP errors about our request (unreachable, TTL expired) come
        // back on the error queue with their type, code and sender.
        const int on = 1;
        ::setsockopt(m_fd, SOL_IP, IP_RECVERR, &on, sizeof on);
        // The kernel's arrival time keeps event-loop delays out of the
        // round-trip time.
        ::setsockopt(m_fd, SOL_SOCKET, SO_TIMESTAMP, &on, sizeof on);
        return true;
    }

    void closeSocket()
    {
        delete m_notifier; // before the descriptor goes, or the dispatcher polls a dead fd
        m_notifier = nullptr;
        if (m_fd >= 0)
            ::close(m_fd);
        m_fd = -1;
    }

    void endSoon(const EchoReply &reply)
    {
        m_result = reply;
        m_timer.start(0);
    }

    void end(EchoReply reply)
    {
        closeSocket();
        m_timer.stop();
        m_owner.complete(m_id, reply); // deletes this later
    }

    void handleTimeout()
    {
        if (m_fd < 0)
            return end(m_result);
        EchoReply reply;
        reply.Status = IpStatus::kRequestTimedOut;
        reply.Sent = true;
        end(reply);
    }

    void handleReadable()
    {
        // Ending the request emits finished(), whose receiver may delete us.
        const QPointer<Request> self(this);
        for (int reads = 0; reads < kMaxReadsPerWakeUp && self && m_fd >= 0; ++reads) {
            if (!readErrorQueue() && (!self || m_fd < 0 || !readReply()))
                return;
        }
    }

    // The error queue entry for our request, if there is one; true when an
    // entry was read, ours or not.
    bool readErrorQueue()
    {
        char payload[576];
        char control[512];
        sockaddr_in from {};
        iovec iov { payload, sizeof payload };
        msghdr message = messageHeader(iov, from, control, sizeof control);
        const ssize_t size = ::recvmsg(m_fd, &message, MSG_ERRQUEUE | MSG_DONTWAIT);
        if (size < 0)
            return false;
        // The payload is our own request as it left: match it like a reply.
        if (size >= kIcmpHeaderSize && !isOurs(QByteArray(payload, int(size)), kIcmpEchoRequest))
            return true;
        for (cmsghdr *c = CMSG_FIRSTHDR(&message); c; c = CMSG_NXTHDR(&message, c)) {
            if (c->cmsg_level != SOL_IP || c->cmsg_type != IP_RECVERR)
                continue;
            const auto *error = reinterpret_cast<const sock_extended_err *>(CMSG_DATA(c));
            EchoReply reply;
            reply.Sent = true;
            reply.RoundTripTime = quint32(m_elapsed.elapsed());
            if (error->ee_origin == SO_EE_ORIGIN_ICMP) {
                reply.Status = statusForIcmpError(error->ee_type, error->ee_code);
                const auto *offender = reinterpret_cast<const sockaddr_in *>(SO_EE_OFFENDER(error));
                if (offender->sin_family == AF_INET)
                    reply.Address = addressFromNetworkOrder(offender->sin_addr.s_addr);
            } else {
                reply.Status = statusForLocalError(int(error->ee_errno));
            }
            end(reply);
            return true;
        }
        return true;
    }

    // One datagram from the socket; true when one was read, ours or not.
    bool readReply()
    {
        QByteArray buffer(kReceiveBufferSize, Qt::Uninitialized);
        char control[256];
        sockaddr_in from {};
        iovec iov { buffer.data(), size_t(buffer.size()) };
        msghdr message = messageHeader(iov, from, control, sizeof control);
        const ssize_t size = ::recvmsg(m_fd, &message, MSG_DONTWAIT);
        if (size < 0) {
            // A pending socket error (EHOSTUNREACH …) is read here once; its
            // details are on the error queue, which the next round reads.
            return errno != EAGAIN && errno != EWOULDBLOCK;
        }
        buffer.truncate(size);
        if (m_raw) {
            // Raw sockets deliver the IP header too.
            if (buffer.isEmpty())
                return true;
            const int headerSize = (uchar(buffer.at(0)) & 0x0f) * 4;
            buffer.remove(0, headerSize);
        }
        if (!isOurs(buffer, kIcmpEchoReply))
            return true;
        EchoReply reply;
        reply.Sent = true;
        reply.Status = IpStatus::kSuccess;
        reply.RoundTripTime = roundTripMs(message);
        reply.Address = addressFromNetworkOrder(from.sin_addr.s_addr);
        const QByteArray echoed = buffer.mid(kIcmpHeaderSize);
        reply.DataSize = quint32(echoed.size());
        reply.Data = echoed.left(EchoReply::kDataCapacity);
        end(reply);
        return true;
    }

    // From the kernel's arrival stamp when there is one; never more than
    // the time we measured ourselves, so a clock step cannot inflate it.
    quint32 roundTripMs(msghdr &message) const
    {
        const qint64 measured = m_elapsed.elapsed();
        for (cmsghdr *c = CMSG_FIRSTHDR(&message); c; c = CMSG_NXTHDR(&message, c)) {
            if (c->cmsg_level != SOL_SOCKET || c->cmsg_type != SCM_TIMESTAMP)
                continue;
            timeval arrived;
            std::memcpy(&arrived, CMSG_DATA(c), sizeof arrived);
            const qint64 stampedUs = (qint64(arrived.tv_sec) - m_sentAt.tv_sec) * 1000000
                + (qint64(arrived.tv_usec) - m_sentAt.tv_usec);
            const qint64 stamped = stampedUs / 1000;
            return quint32(qBound<qint64>(0, stamped, measured));
        }
        return quint32(measured);
    }

    bool isOurs(const QByteArray &icmp, quint8 type) const
    {
        if (icmp.size() < kIcmpHeaderSize || quint8(icmp.at(0)) != type || icmp.at(1) != 0)
            return false;
        if (qFromBigEndian<quint16>(icmp.constData() + 6) != m_sequence)
            return false;
        return !m_raw || qFromBigEndian<quint16>(icmp.constData() + 4) == m_identifier;
    }

    IcmpEcho &m_owner;
    const quint32 m_id;
    int m_fd = -1;
    bool m_raw = false;
    quint16 m_identifier = 0;
    quint16 m_sequence = 0;
    QSocketNotifier *m_notifier = nullptr;
    QTimer m_timer;
    QElapsedTimer m_elapsed;
    timeval m_sentAt {};
    EchoReply m_result;
};

IcmpEcho::IcmpEcho(QObject *parent) : QObject(parent)
{
    qRegisterMetaType<EchoReply>();
}

IcmpEcho::~IcmpEcho()
{
    cancelAll();
}

void IcmpEcho::setTransport(Transport transport)
{
    m_transport = transport;
}

quint32 IcmpEcho::send(const QString &address, const QByteArray &data, int timeoutMs)
{
    if (++m_lastRequestId == 0)
        ++m_lastRequestId;
    const quint32 id = m_lastRequestId;
    auto *request = new Request(*this, id);
    m_requests.emplace(id, request);
    request->start(m_transport, address, data, timeoutMs);
    return id;
}

void IcmpEcho::cancelAll()
{
    for (auto &[id, request] : m_requests)
        delete request;
    m_requests.clear();
}

int IcmpEcho::pendingCount() const
{
    return int(m_requests.size());
}

void IcmpEcho::complete(quint32 requestId, const EchoReply &reply)
{
    const auto found = m_requests.find(requestId);
    if (found == m_requests.end())
        return;
    // Called from the request's own notifier or timer: let it unwind first.
    found->second->deleteLater();
    m_requests.erase(found);
    Q_EMIT finished(requestId, reply);
}

QString IPToText(const QByteArray &addressBytes)
{
    if (addressBytes.size() != 4)
        return {};
    QStringList parts;
    for (char byte : addressBytes)
        parts << QString::number(uchar(byte));
    return parts.join(QLatin1Char('.'));
}

void GetIPFromHostName(const QString &hostName, QObject *context,
                       std::function<void(const QString &address)> done)
{
    if (!context)
        context = QCoreApplication::instance();
    QHostInfo::lookupHost(hostName, context, [done = std::move(done)](const QHostInfo &info) {
        for (const QHostAddress &address : info.addresses()) {
            bool isIPv4 = false;
            const quint32 value = address.toIPv4Address(&isIPv4);
            if (isIPv4) {
                done(QHostAddress(value).toString());
                return;
            }
        }
        done(QString());
    });
}

void PingRemoteHost(const QString &address, int timeoutMs, QObject *context,
                    std::function<void(int status)> done)
{
    auto *echo = new IcmpEcho(context ? context : QCoreApplication::instance());
    QObject::connect(echo, &IcmpEcho::finished, echo,
                     [echo, done = std::move(done)](quint32, const EchoReply &reply) {
                         echo->deleteLater();
                         const bool noEchoPossible = !reply.Sent && reply.Status == IpStatus::kGeneralFailure;
                         done(noEchoPossible ? IpStatus::kSuccess : reply.Status);
                     });
    echo->send(address, QByteArrayLiteral("Hello"), timeoutMs);
}
