// The serial device disappears under an active session (an adapter pulled
// out): said once, no spinning, and a clear error when it is reactivated.
#include "CommandClient.h"
#include "E2eSupport.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"

#include "support/Wait.h"

#include <QElapsedTimer>

#include <gtest/gtest.h>

using namespace e2e;

TEST(DeviceLossE2e, VanishedDeviceIsReportedOnceWithoutBusyLoopAndReactivationNamesThePath)
{
    PtyServerRun run;
    ASSERT_TRUE(run.start());
    const QString path = run.device.slavePath();
    const qint64 pid = run.velloca.processId();
    const QString lost = QStringLiteral("COM Status: Error - ");
    auto lossLines = [&] {
        QStringList found;
        for (const QString &line : run.velloca.logLines()) {
            if (line.contains(lost))
                found << line;
        }
        return found;
    };

    run.device.closeMaster();
    ASSERT_TRUE(waitUntil([&] { return !lossLines().isEmpty(); }, 5000)) << qPrintable(run.velloca.errorLog());
    EXPECT_TRUE(lossLines().first().contains(path)) << qPrintable(lossLines().first());

    // Nothing may happen here: a fixed look over two seconds.
    const qint64 cpuBefore = cpuTimeMs(pid);
    QElapsedTimer wall;
    wall.start();
    waitUntil([] { return false; }, 2000);
    const qint64 cpuUsed = cpuTimeMs(pid) - cpuBefore;
    const qint64 elapsed = wall.elapsed();
    EXPECT_LT(cpuUsed * 20, elapsed) << cpuUsed << " ms of CPU in " << elapsed << " ms";
    EXPECT_EQ(lossLines().size(), 1) << qPrintable(lossLines().join(u'\n'));
    ASSERT_TRUE(run.velloca.isRunning());

    CommandClient commands(run.velloca);
    ASSERT_TRUE(commands.isConnected());
    EXPECT_EQ(commands.send("Session1\t[DEACTIVATE]"), "accepted");
    EXPECT_TRUE(run.velloca.waitForLogLine(QStringLiteral("COM Status: Closed")));
    const qsizetype before = lossLines().size();
    EXPECT_EQ(commands.send("Session1\t[ACTIVATE]"), "accepted");
    ASSERT_TRUE(waitUntil([&] { return lossLines().size() > before; }, 5000)) << qPrintable(run.velloca.errorLog());
    EXPECT_TRUE(lossLines().last().contains(path)) << qPrintable(lossLines().last());
    // The failed activation leaves the session inactive: activating again
    // is a real change and is taken.
    EXPECT_EQ(commands.send("Session1\t[ACTIVATE]"), "accepted");
    EXPECT_TRUE(run.velloca.isRunning());
    ASSERT_TRUE(run.velloca.terminate(2000));
    EXPECT_EQ(run.velloca.exitCode(), 0);
}
