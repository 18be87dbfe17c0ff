// ICMP echo against loopback and against network namespaces the test
// creates for itself; nothing is ever sent beyond 127.0.0.0/8 or those
// namespaces.
#include "platform/IcmpEcho.h"
#include "platform/IcmpStatus.h"

#include "support/IcmpPermissions.h"
#include "support/Wait.h"

#include <QDir>
#include <QElapsedTimer>
#include <QFile>
#include <QPointer>
#include <QProcess>

#include <gtest/gtest.h>

#include <fcntl.h>
#include <linux/capability.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <map>
#include <memory>
#include <optional>

using namespace Qt::StringLiterals;

namespace {

constexpr quint32 kLoopbackDecimal = 16777343; // 127.0.0.1 read little-endian

// Collects the replies of one IcmpEcho by request id.
struct ReplyLog
{
    explicit ReplyLog(IcmpEcho &echo)
    {
        QObject::connect(&echo, &IcmpEcho::finished, &echo,
                         [this](quint32 id, const EchoReply &reply) {
                             ++counts[id];
                             replies[id] = reply;
                         });
    }
    bool has(quint32 id) const { return replies.count(id) > 0; }
    EchoReply waitFor(quint32 id, int timeoutMs = 10000)
    {
        EXPECT_TRUE(waitUntil([&] { return has(id); }, timeoutMs)) << "request " << id;
        EXPECT_EQ(counts[id], 1) << "request " << id;
        return replies[id];
    }
    std::map<quint32, EchoReply> replies;
    std::map<quint32, int> counts;
};

// Moves this thread into a fresh network namespace with only loopback, up,
// and back into the original one at the end. Sockets opened meanwhile
// belong to the new namespace, so its sysctls govern them.
class NetworkNamespaceScope
{
public:
    NetworkNamespaceScope()
    {
        m_original = ::open("/proc/thread-self/ns/net", O_RDONLY | O_CLOEXEC);
        if (m_original < 0) {
            m_problem = u"cannot open /proc/thread-self/ns/net: "_s + QString::fromLocal8Bit(strerror(errno));
            return;
        }
        if (::unshare(CLONE_NEWNET) != 0) {
            m_problem = u"unshare(CLONE_NEWNET) failed: "_s + QString::fromLocal8Bit(strerror(errno));
            return;
        }
        m_entered = true;
        if (!bringLoopbackUp())
            m_problem = u"cannot bring up lo in the new namespace"_s;
    }
    ~NetworkNamespaceScope()
    {
        if (m_entered && ::setns(m_original, CLONE_NEWNET) != 0)
            ADD_FAILURE() << "cannot return to the original network namespace: " << strerror(errno);
        if (m_original >= 0)
            ::close(m_original);
    }
    NetworkNamespaceScope(const NetworkNamespaceScope &) = delete;
    NetworkNamespaceScope &operator=(const NetworkNamespaceScope &) = delete;

    // Empty when the namespace is ready.
    QString problem() const { return m_problem; }

    // Writes a sysctl of this namespace, e.g. "ipv4/icmp_echo_ignore_all".
    bool setSysctl(const char *name, const QByteArray &value)
    {
        QFile file(u"/proc/sys/net/"_s + QString::fromLatin1(name));
        return file.open(QIODevice::WriteOnly) && file.write(value) == value.size();
    }

    // Runs ip(8) in this namespace; false when it is missing or fails.
    static bool ip(const QStringList &arguments)
    {
        return QProcess::execute(u"ip"_s, arguments) == 0;
    }

private:
    static bool bringLoopbackUp()
    {
        const int fd = ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        if (fd < 0)
            return false;
        ifreq request {};
        std::strncpy(request.ifr_name, "lo", IFNAMSIZ - 1);
        bool up = ::ioctl(fd, SIOCGIFFLAGS, &request) == 0;
        request.ifr_flags |= IFF_UP;
        up = up && ::ioctl(fd, SIOCSIFFLAGS, &request) == 0;
        ::close(fd);
        return up;
    }

    int m_original = -1;
    bool m_entered = false;
    QString m_problem;
};

#define ENTER_OWN_NAMESPACE(scope)                                                                 \
    NetworkNamespaceScope scope;                                                                   \
    if (!scope.problem().isEmpty())                                                                \
        GTEST_SKIP() << "needs a network namespace of its own: " << qPrintable(scope.problem())


int openDescriptorCount()
{
    return int(QDir(u"/proc/self/fd"_s).entryList(QDir::Files | QDir::System | QDir::NoDotAndDotDot).size());
}

TEST(IcmpStatusTest, IcmpAndLocalErrorsBecomeStatusCodes)
{
    const std::tuple<int, int, int> icmpRows[] = {
        { 3, 0, 11002 }, { 3, 1, 11003 }, { 3, 2, 11004 }, { 3, 3, 11005 }, { 3, 4, 11009 },
        { 3, 5, 11012 }, { 3, 9, 11002 }, { 3, 10, 11003 }, { 3, 13, 11003 }, { 4, 0, 11016 },
        { 11, 0, 11013 }, { 11, 1, 11014 }, { 12, 0, 11015 }, { 42, 0, 11050 },
    };
    for (const auto &[type, code, status] : icmpRows)
        EXPECT_EQ(statusForIcmpError(type, code), status) << type << '/' << code;
    const std::pair<int, int> localRows[] = { { ENETUNREACH, 11002 }, { EHOSTUNREACH, 11003 },
                                              { EMSGSIZE, 11009 }, { ENOBUFS, 11006 },
                                              { EPERM, 11050 }, { 0, 11050 } };
    for (const auto &[error, status] : localRows)
        EXPECT_EQ(statusForLocalError(error), status) << error;
}

TEST(IcmpEchoTest, LoopbackAnswersWithItsAddressAndTheData)
{
    if (!canSendIcmp())
        GTEST_SKIP() << "neither ICMP datagram nor raw sockets are permitted here "
                        "(net.ipv4.ping_group_range excludes our group and CAP_NET_RAW is missing)";
    IcmpEcho echo;
    ReplyLog log(echo);
    const quint32 first = echo.send(u"127.0.0.1"_s, "Testing 123", 2000);
    // Results come from the event loop, never from inside send().
    EXPECT_FALSE(log.has(first));
    EXPECT_EQ(echo.pendingCount(), 1);
    // Several requests in flight each get their own reply.
    const quint32 second = echo.send(u"127.0.0.2"_s, QByteArray(250, 'x'), 2000);
    const quint32 third = echo.send(u"127.0.0.1"_s, QByteArray(), 2000);
    EXPECT_NE(first, 0u);
    EXPECT_NE(first, second);

    EchoReply reply = log.waitFor(first);
    EXPECT_EQ(reply.Status, 0);
    EXPECT_TRUE(reply.Sent);
    EXPECT_EQ(reply.Address, kLoopbackDecimal);
    EXPECT_EQ(reply.DataSize, 11u);
    EXPECT_EQ(reply.Data, QByteArray("Testing 123"));
    EXPECT_EQ(reply.dataText(), u"Testing 123"_s);
    EXPECT_LT(reply.RoundTripTime, 2000u);

    reply = log.waitFor(second);
    EXPECT_EQ(reply.Status, 0);
    EXPECT_EQ(IPToText(reply.addressBytes()), u"127.0.0.2"_s);
    EXPECT_EQ(reply.DataSize, 250u);
    EXPECT_EQ(reply.Data, QByteArray(250, 'x'));

    reply = log.waitFor(third);
    EXPECT_EQ(reply.Status, 0);
    EXPECT_EQ(reply.DataSize, 0u);
    EXPECT_TRUE(reply.Data.isEmpty());
    EXPECT_EQ(echo.pendingCount(), 0);
}

TEST(IcmpEchoTest, BadAddressesEndWithMinusOneAndNothingSent)
{
    IcmpEcho echo;
    ReplyLog log(echo);
    const QString addresses[] = { u"localhost"_s, QString(), u"1.2.3.999"_s, u"my host"_s,
                                  u"255.255.255.255"_s, u"127.0.0.1\0x"_s, u"１２７.0.0.1"_s };
    for (const QString &address : addresses) {
        SCOPED_TRACE(address.toStdString());
        const quint32 id = echo.send(address, "Hello", 1000);
        EXPECT_FALSE(log.has(id));
        const EchoReply reply = log.waitFor(id);
        EXPECT_EQ(reply.Status, -1);
        EXPECT_FALSE(reply.Sent);
        EXPECT_EQ(reply.Address, 0u);
        EXPECT_EQ(reply.DataSize, 0u);
    }
    // More data than the reply record holds is refused before sending.
    const EchoReply tooLong = log.waitFor(echo.send(u"127.0.0.1"_s, QByteArray(251, 'x'), 1000));
    EXPECT_EQ(tooLong.Status, IpStatus::kBufferTooSmall);
    EXPECT_FALSE(tooLong.Sent);
}

TEST(IcmpEchoTest, CancelledRequestsReportNothingAndLeakNoSockets)
{
    if (!canSendIcmp())
        GTEST_SKIP() << "no ICMP socket permitted here";
    auto echo = std::make_unique<IcmpEcho>();
    ReplyLog log(*echo);
    // A first echo lets Qt set up whatever it keeps open for good.
    EXPECT_EQ(log.waitFor(echo->send(u"127.0.0.1"_s, "warm-up", 2000)).Status, 0);
    const int descriptorsBefore = openDescriptorCount();
    const quint32 badAddress = echo->send(u"nonsense"_s, "x", 1000);
    const quint32 pending = echo->send(u"127.0.0.1"_s, "x", 1000);
    echo->cancelAll();
    EXPECT_EQ(echo->pendingCount(), 0);
    for (int i = 0; i < 20; ++i)
        EXPECT_EQ(log.waitFor(echo->send(u"127.0.0.1"_s, "again", 2000)).Status, 0);
    EXPECT_FALSE(log.has(badAddress));
    EXPECT_FALSE(log.has(pending));

    // Destroying the object with requests pending is silent as well.
    echo->send(u"127.0.0.1"_s, "x", 1000);
    echo->send(u"nonsense"_s, "x", 1000);
    echo.reset();
    EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() <= descriptorsBefore; }, 5000))
        << openDescriptorCount() << " descriptors open, " << descriptorsBefore << " before";
}

TEST(IcmpEchoTest, BothSocketKindsWorkWhereTheKernelAllowsThem)
{
    ENTER_OWN_NAMESPACE(scope);
    ASSERT_TRUE(scope.setSysctl("ipv4/ping_group_range", "0 2147483647"));
    IcmpEcho echo;
    ReplyLog log(echo);
    echo.setTransport(IcmpEcho::Transport::DatagramOnly);
    EchoReply reply = log.waitFor(echo.send(u"127.0.0.1"_s, "datagram", 2000));
    EXPECT_EQ(reply.Status, 0);
    EXPECT_EQ(reply.Data, QByteArray("datagram"));

    ASSERT_TRUE(scope.setSysctl("ipv4/ping_group_range", "1 0"));
    reply = log.waitFor(echo.send(u"127.0.0.1"_s, "datagram", 2000));
    EXPECT_EQ(reply.Status, IpStatus::kGeneralFailure);
    EXPECT_FALSE(reply.Sent);

    if (!canOpenIcmpSocket(SOCK_RAW))
        GTEST_SKIP() << "raw ICMP sockets need CAP_NET_RAW";
    echo.setTransport(IcmpEcho::Transport::RawOnly);
    reply = log.waitFor(echo.send(u"127.0.0.1"_s, "raw", 2000));
    EXPECT_EQ(reply.Status, 0);
    EXPECT_EQ(reply.Address, kLoopbackDecimal);
    EXPECT_EQ(reply.Data, QByteArray("raw"));
}

TEST(IcmpEchoTest, NoAnswerWithinTheTimeoutIsRequestTimedOut)
{
    ENTER_OWN_NAMESPACE(scope);
    ASSERT_TRUE(scope.setSysctl("ipv4/icmp_echo_ignore_all", "1"));
    ASSERT_TRUE(scope.setSysctl("ipv4/ping_group_range", "0 2147483647"));
    IcmpEcho echo;
    ReplyLog log(echo);
    for (const auto transport : { IcmpEcho::Transport::DatagramOnly, IcmpEcho::Transport::RawOnly }) {
        if (transport == IcmpEcho::Transport::RawOnly && !canOpenIcmpSocket(SOCK_RAW))
            continue;
        echo.setTransport(transport);
        QElapsedTimer clock;
        clock.start();
        const EchoReply reply = log.waitFor(echo.send(u"127.0.0.1"_s, "Hello", 300));
        EXPECT_GE(clock.elapsed(), 290);
        EXPECT_EQ(reply.Status, IpStatus::kRequestTimedOut);
        EXPECT_TRUE(reply.Sent);
        EXPECT_EQ(reply.Address, 0u);
        EXPECT_EQ(reply.DataSize, 0u);
        EXPECT_EQ(reply.RoundTripTime, 0u);
    }

    QObject context;
    int watchdogStatus = 1;
    PingRemoteHost(u"127.0.0.1"_s, 200, &context, [&](int status) { watchdogStatus = status; });
    EXPECT_TRUE(waitUntil([&] { return watchdogStatus != 1; }));
    EXPECT_EQ(watchdogStatus, IpStatus::kRequestTimedOut);
}

TEST(IcmpEchoTest, WithoutIcmpPermissionTheDialogSeesFailureAndTheWatchdogSuccess)
{
    ENTER_OWN_NAMESPACE(scope);
    ASSERT_TRUE(scope.setSysctl("ipv4/ping_group_range", "1 0"));
    WithoutRawSockets noRaw;
    if (!noRaw.changed() || canOpenIcmpSocket(SOCK_RAW) || canOpenIcmpSocket(SOCK_DGRAM))
        GTEST_SKIP() << "cannot take ICMP permission away from this thread";

    IcmpEcho echo;
    ReplyLog log(echo);
    const EchoReply reply = log.waitFor(echo.send(u"127.0.0.1"_s, "Hello", 1000));
    EXPECT_EQ(reply.Status, IpStatus::kGeneralFailure);
    EXPECT_FALSE(reply.Sent);
    EXPECT_EQ(GetStatusCode(reply.Status, 1000), u"11050   [IP General Failure]"_s);

    QObject context;
    int watchdogStatus = 1;
    PingRemoteHost(u"127.0.0.1"_s, 1000, &context, [&](int status) { watchdogStatus = status; });
    EXPECT_TRUE(waitUntil([&] { return watchdogStatus != 1; }));
    EXPECT_EQ(watchdogStatus, 0);
    // A bad address stays a failure for the watchdog.
    PingRemoteHost(u"bad"_s, 1000, &context, [&](int status) { watchdogStatus = status; });
    EXPECT_TRUE(waitUntil([&] { return watchdogStatus != 0; }));
    EXPECT_EQ(watchdogStatus, -1);
}

TEST(IcmpEchoTest, NoRouteIsAFailureForTheWatchdogToo)
{
    ENTER_OWN_NAMESPACE(scope);
    if (!canSendIcmp())
        GTEST_SKIP() << "no ICMP socket permitted here";
    // The namespace has nothing but loopback, so 192.0.2.1 has no route and
    // the kernel refuses the send: that is a verdict on the peer.
    IcmpEcho echo;
    ReplyLog log(echo);
    const EchoReply reply = log.waitFor(echo.send(u"192.0.2.1"_s, "Hello", 1000));
    EXPECT_EQ(reply.Status, IpStatus::kDestNetUnreachable);
    EXPECT_FALSE(reply.Sent);

    QObject context;
    int watchdogStatus = 1;
    PingRemoteHost(u"192.0.2.1"_s, 1000, &context, [&](int status) { watchdogStatus = status; });
    EXPECT_TRUE(waitUntil([&] { return watchdogStatus != 1; }));
    EXPECT_EQ(watchdogStatus, IpStatus::kDestNetUnreachable);
}

TEST(IcmpEchoTest, IcmpErrorsAboutTheRequestEndItEarly)
{
    ENTER_OWN_NAMESPACE(scope);
    if (!canSendIcmp())
        GTEST_SKIP() << "no ICMP socket permitted here";
    // A link with nobody on the far side: address resolution for 192.0.2.2
    // fails after one try and the stack answers "host unreachable".
    if (!NetworkNamespaceScope::ip({ u"link"_s, u"add"_s, u"vell0"_s, u"type"_s, u"veth"_s, u"peer"_s,
                                     u"name"_s, u"vell1"_s })
        || !NetworkNamespaceScope::ip({ u"addr"_s, u"add"_s, u"192.0.2.1/24"_s, u"dev"_s, u"vell0"_s })
        || !NetworkNamespaceScope::ip({ u"link"_s, u"set"_s, u"vell0"_s, u"up"_s })
        || !NetworkNamespaceScope::ip({ u"link"_s, u"set"_s, u"vell1"_s, u"up"_s }))
        GTEST_SKIP() << "cannot make a veth pair with ip(8) in the test namespace";
    ASSERT_TRUE(scope.setSysctl("ipv4/neigh/vell0/mcast_solicit", "1"));
    ASSERT_TRUE(scope.setSysctl("ipv4/neigh/vell0/retrans_time_ms", "100"));

    ASSERT_TRUE(scope.setSysctl("ipv4/ping_group_range", "0 2147483647"));

    IcmpEcho echo;
    ReplyLog log(echo);
    // Each kind of socket gets its own silent address, so each waits for a
    // resolution of its own.
    const std::pair<IcmpEcho::Transport, QString> rows[] = {
        { IcmpEcho::Transport::DatagramOnly, u"192.0.2.2"_s },
        { IcmpEcho::Transport::RawOnly, u"192.0.2.3"_s },
    };
    for (const auto &[transport, address] : rows) {
        if (transport == IcmpEcho::Transport::RawOnly && !canOpenIcmpSocket(SOCK_RAW))
            continue;
        SCOPED_TRACE(address.toStdString());
        echo.setTransport(transport);
        QElapsedTimer clock;
        clock.start();
        const EchoReply reply = log.waitFor(echo.send(address, "Hello", 8000));
        EXPECT_LT(clock.elapsed(), 8000);
        EXPECT_EQ(reply.Status, IpStatus::kDestHostUnreachable);
        EXPECT_TRUE(reply.Sent);
        EXPECT_EQ(IPToText(reply.addressBytes()), u"192.0.2.1"_s); // the reporter
        EXPECT_EQ(reply.DataSize, 0u);
    }
}

TEST(IcmpEchoTest, PingRemoteHostStaysSilentOnceItsContextIsGone)
{
    if (!canSendIcmp())
        GTEST_SKIP() << "no ICMP socket permitted here";
    auto context = std::make_unique<QObject>();
    bool called = false;
    PingRemoteHost(u"127.0.0.1"_s, 1000, context.get(), [&](int) { called = true; });
    context.reset();
    IcmpEcho echo;
    ReplyLog log(echo);
    EXPECT_EQ(log.waitFor(echo.send(u"127.0.0.1"_s, "after", 1000)).Status, 0);
    EXPECT_FALSE(called);

    QObject alive;
    int status = 1;
    PingRemoteHost(u"127.0.0.1"_s, 1000, &alive, [&](int result) { status = result; });
    EXPECT_TRUE(waitUntil([&] { return status != 1; }));
    EXPECT_EQ(status, 0);
}

TEST(IcmpEchoTest, HostNamesResolveToTheirFirstIPv4Address)
{
    QObject context;
    const std::pair<QString, QString> rows[] = {
        { u"localhost"_s, u"127.0.0.1"_s },
        { u"127.0.0.1"_s, u"127.0.0.1"_s },
        { u"no-such-host.invalid"_s, QString() },
        { QString(), QString() },
    };
    for (const auto &[name, expected] : rows) {
        SCOPED_TRACE(name.toStdString());
        std::optional<QString> result;
        GetIPFromHostName(name, &context, [&](const QString &address) { result = address; });
        EXPECT_FALSE(result.has_value());
        EXPECT_TRUE(waitUntil([&] { return result.has_value(); }, 30000));
        EXPECT_EQ(result.value_or(u"(none)"_s), expected);
    }

    auto gone = std::make_unique<QObject>();
    bool called = false;
    GetIPFromHostName(u"localhost"_s, gone.get(), [&](const QString &) { called = true; });
    gone.reset();
    std::optional<QString> later;
    GetIPFromHostName(u"localhost"_s, &context, [&](const QString &address) { later = address; });
    EXPECT_TRUE(waitUntil([&] { return later.has_value(); }, 30000));
    EXPECT_FALSE(called);
}

} // namespace
