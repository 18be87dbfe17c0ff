// Misbehaving command-channel clients against the running program: it stays
// up, stays small and still answers everyone who asks properly, in order.
#include "CommandClient.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"

#include "support/Wait.h"

#include <QFile>

#include <gtest/gtest.h>

#include <memory>
#include <sys/stat.h>
#include <vector>

using namespace e2e;

namespace {

// Taken by an inactive session, and refused for a topic nobody has: an
// alternation shows whether the replies keep their order.
const QByteArray kAccepted = "Session1\t[COMSETTINGS=9600,N,8,1]";
const QByteArray kRefused = "Nobody\t[ACTIVATE]";

} // namespace

TEST(CommandChannelAbuseE2e, HugeBinaryPipelinedConcurrentAndBrokenRequestsLeaveItAnsweringInOrderWithBoundedMemory)
{
    PtyServerRun run;
    // Session1 stays inactive so that its settings may change.
    ASSERT_TRUE(run.start({}, QStringLiteral("[Session2]\r\nConnector=0\r\n"), 2));
    ASSERT_TRUE(run.velloca.waitForLogLine(QStringLiteral("COM Status: Open")));
    {
        CommandClient first(run.velloca);
        ASSERT_TRUE(first.isConnected());
        ASSERT_EQ(first.send("Session1\t[DEACTIVATE]"), "accepted");
    }
    const qint64 pid = run.velloca.processId();

    struct stat info {};
    ASSERT_EQ(::lstat(QFile::encodeName(commandChannelPath(run.velloca)).constData(), &info), 0);
    EXPECT_TRUE(S_ISSOCK(info.st_mode));
    EXPECT_EQ(info.st_mode & 07777, mode_t(0600));

    {
        CommandClient probe(run.velloca);
        ASSERT_EQ(probe.send(kAccepted), "accepted") << "the command used as the accepted one is refused";
        ASSERT_EQ(probe.send(kRefused), "refused");
    }
    const qint64 residentAtStart = residentKiB(pid);
    ASSERT_GT(residentAtStart, 0);

    {
        SCOPED_TRACE("1 MB without a line end");
        CommandClient huge(run.velloca);
        ASSERT_TRUE(huge.isConnected());
        huge.write(QByteArray(1024 * 1024, 'A'));
        // The "refused" may be lost with the connection while the client is
        // still writing; what counts is that the client is let go.
        EXPECT_TRUE(waitUntil([&] { return !huge.isConnected(); }, 5000)) << "the flooding client was kept";
    }
    {
        SCOPED_TRACE("NUL bytes and bytes that are not UTF-8");
        CommandClient binary(run.velloca);
        EXPECT_EQ(binary.send(QByteArray("Session1\t[DEACT\0IVATE]", 23)), "refused");
        EXPECT_EQ(binary.send("Session1\t[\xff\xfe\x80]"), "refused");
        EXPECT_EQ(binary.send(QByteArray(100, '\0')), "refused");
        EXPECT_EQ(binary.send(kAccepted), "accepted");
    }
    {
        SCOPED_TRACE("100 requests in one write");
        CommandClient pipelined(run.velloca);
        QByteArray burst;
        QList<QByteArray> expected;
        for (int i = 0; i < 100; ++i) {
            burst += (i % 3 == 0 ? kRefused : kAccepted) + '\n';
            expected << (i % 3 == 0 ? "refused" : "accepted");
        }
        ASSERT_TRUE(pipelined.write(burst));
        EXPECT_EQ(pipelined.replies(100, 10000), expected);
    }
    {
        SCOPED_TRACE("50 clients at once");
        std::vector<std::unique_ptr<CommandClient>> clients;
        for (int i = 0; i < 50; ++i)
            clients.push_back(std::make_unique<CommandClient>(run.velloca));
        for (int i = 0; i < 50; ++i) {
            ASSERT_TRUE(clients[size_t(i)]->isConnected()) << "client " << i;
            clients[size_t(i)]->write((i % 2 ? kRefused : kAccepted) + '\n' + kAccepted + '\n');
        }
        for (int i = 0; i < 50; ++i) {
            const QList<QByteArray> expected { i % 2 ? "refused" : "accepted", "accepted" };
            EXPECT_EQ(clients[size_t(i)]->replies(2, 5000), expected) << "client " << i;
        }
    }
    {
        SCOPED_TRACE("clients that go away in the middle of a line");
        for (int i = 0; i < 30; ++i) {
            CommandClient broken(run.velloca);
            ASSERT_TRUE(broken.isConnected());
            broken.write("Session1\t[COMSETT");
            broken.socket().flush();
            if (i % 2)
                broken.socket().abort();
            else
                broken.socket().disconnectFromServer();
        }
    }
    EXPECT_TRUE(run.velloca.isRunning()) << run.velloca.standardError().constData();
    const qsizetype opensBefore = run.velloca.errorLog().count(QStringLiteral("COM Status: Open"));
    CommandClient after(run.velloca);
    EXPECT_EQ(after.send(kRefused), "refused");
    EXPECT_EQ(after.send(kAccepted), "accepted");
    EXPECT_EQ(after.send("Session1\t[ACTIVATE]"), "accepted");
    EXPECT_TRUE(waitUntil([&] { return run.velloca.errorLog().count(QStringLiteral("COM Status: Open")) > opensBefore; }))
        << qPrintable(run.velloca.errorLog());

    const qint64 residentAtEnd = residentKiB(pid);
    EXPECT_LT(residentAtEnd - residentAtStart, 20 * 1024)
        << "VmRSS grew from " << residentAtStart << " KiB to " << residentAtEnd << " KiB";
    ASSERT_TRUE(run.velloca.terminate(2000));
    EXPECT_EQ(run.velloca.exitCode(), 0);
}
