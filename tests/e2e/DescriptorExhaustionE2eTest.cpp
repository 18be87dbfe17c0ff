// Clients that use up the program's descriptors: it turns the surplus away
// instead of spinning, logs the episode once, keeps its command channel and
// serves new clients again as soon as descriptors are free.
#include "CommandClient.h"
#include "E2eSupport.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"
#include "RawStreams.h"

#include "support/Wait.h"

#include <QElapsedTimer>

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

using namespace e2e;

namespace {

const QByteArray kRefused = "Nobody\t[ACTIVATE]";

// True once the program has closed (or reset) the connection.
bool closedByProgram(int fd)
{
    char byte = 0;
    const ssize_t n = ::recv(fd, &byte, 1, MSG_DONTWAIT);
    return n == 0 || (n < 0 && errno != EAGAIN);
}

} // namespace

TEST(DescriptorExhaustionE2e, SurplusClientsAreTurnedAwayWithoutSpinningAndServiceResumes)
{
    PtyServerRun run;
    ASSERT_TRUE(run.start());
    const qint64 pid = run.velloca.processId();
    ASSERT_EQ(CommandClient(run.velloca).send(kRefused), "refused");

    // Room for a few more descriptors than are open now.
    rlimit limit {};
    ASSERT_EQ(::prlimit(pid_t(pid), RLIMIT_NOFILE, nullptr, &limit), 0);
    limit.rlim_cur = rlim_t(openDescriptorCount(pid) + 5);
    ASSERT_EQ(::prlimit(pid_t(pid), RLIMIT_NOFILE, &limit, nullptr), 0);

    QList<int> clients;
    const auto anyTurnedAway = [&] { return std::any_of(clients.cbegin(), clients.cend(), closedByProgram); };
    EXPECT_TRUE(waitUntil([&] {
        clients << connectTcp(run.port);
        return anyTurnedAway() || clients.size() >= 50;
    }, 20000)) << "no client was turned away";

    // Further clients, on both sockets, while the descriptors stay used up.
    const qint64 cpuBefore = cpuTimeMs(pid);
    QElapsedTimer wall;
    wall.start();
    while (wall.elapsed() < 2000) {
        clients << connectTcp(run.port);
        CommandClient(run.velloca, 100).write(kRefused + '\n');
        QTest::qWait(50);
    }
    const qint64 cpuMs = cpuTimeMs(pid) - cpuBefore;
    EXPECT_LT(cpuMs * 5, wall.elapsed()) << cpuMs << " ms of CPU in " << wall.elapsed() << " ms";
    EXPECT_TRUE(waitUntil([&] { return closedByProgram(clients.last()); }, 5000)) << "the last client hangs";

    // Reset, not closed: a closed client may only have stopped sending, and
    // is counted until something sent to it fails.
    const linger reset { 1, 0 };
    for (const int fd : std::as_const(clients)) {
        ::setsockopt(fd, SOL_SOCKET, SO_LINGER, &reset, sizeof reset);
        ::close(fd);
    }
    ASSERT_TRUE(waitUntil([&] { return run.velloca.logLines().last().contains(QStringLiteral("Listening...")); }))
        << qPrintable(run.velloca.errorLog());
    EXPECT_EQ(CommandClient(run.velloca).send(kRefused), "refused") << "the command channel is gone";
    const qsizetype linesBefore = run.velloca.logLines().size();
    const int next = connectTcp(run.port);
    EXPECT_TRUE(waitUntil([&] {
        return run.velloca.logLines().mid(linesBefore).join(u'\n').contains(QStringLiteral("Connected (1)"));
    })) << "the next client is not served";
    ::close(next);

    EXPECT_EQ(run.velloca.errorLog().count(QStringLiteral("Cannot accept connections")), 1)
        << qPrintable(run.velloca.errorLog());
    EXPECT_EQ(QString::fromLocal8Bit(run.velloca.standardError()).count(QStringLiteral("cannot accept connections")), 1)
        << run.velloca.standardError().constData();
}
