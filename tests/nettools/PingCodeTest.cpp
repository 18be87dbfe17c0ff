#include "nettools/PingCode.h"

#include "config/GlobalOptions.h"
#include "platform/IcmpEcho.h"
#include "support/Wait.h"

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

// Keeps the application-wide ping values of one test from leaking out.
struct PingGlobalsScope
{
    PingGlobalsScope() : timeoutIndex(GlobalOptions::global().PingTimeout), timeoutMs(PingTimeoutMs) {}
    ~PingGlobalsScope()
    {
        GlobalOptions::global().PingTimeout = timeoutIndex;
        PingTimeoutMs = timeoutMs;
    }
    int timeoutIndex;
    int timeoutMs;
};

TEST(PingCodeTest, EveryPingTakesItsTimeoutFromTheGlobalOption)
{
    PingGlobalsScope scope;
    IcmpEcho echo;
    const std::pair<int, int> rows[] = { { 0, 100 }, { 9, 1000 }, { 19, 2000 }, { -1, 500 } };
    for (const auto &[index, timeoutMs] : rows) {
        GlobalOptions::global().PingTimeout = index;
        PingTimeoutMs = 7;
        Ping(echo, u"not an address"_s, u"Hello"_s);
        EXPECT_EQ(PingTimeoutMs, timeoutMs) << index;
    }
    echo.cancelAll();
}

TEST(PingCodeTest, DataTextIsSentAndEchoedUnchanged)
{
    PingGlobalsScope scope;
    GlobalOptions::global().PingTimeout = 19;
    IcmpEcho echo;
    std::optional<EchoReply> reply;
    QObject::connect(&echo, &IcmpEcho::finished, [&](quint32, const EchoReply &r) { reply = r; });
    const QString data = u"Grüße 123"_s;
    Ping(echo, u"127.0.0.1"_s, data);
    ASSERT_TRUE(waitUntil([&] { return reply.has_value(); }));
    if (reply->Status == 11050 && !reply->Sent)
        GTEST_SKIP() << "no ICMP socket permitted here";
    EXPECT_EQ(reply->Status, 0);
    EXPECT_EQ(reply->dataText(), data);
    EXPECT_EQ(reply->DataSize, quint32(data.toLocal8Bit().size()));
}

} // namespace
