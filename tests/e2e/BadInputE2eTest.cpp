// Whatever the command line and the configuration file hold, the program
// starts, keeps running and ends cleanly.
#include "E2eSupport.h"
#include "VellocaProcess.h"

#include <QFile>
#include <QFileInfo>
#include <QRandomGenerator>

#include <gtest/gtest.h>

using namespace e2e;

TEST(BadInputE2e, GarbageDefaultFileIsSurvivedAndItsLinesKept)
{
    QByteArray garbage(64 * 1024, Qt::Uninitialized);
    QRandomGenerator random(20240607);
    for (char &byte : garbage)
        byte = char(random.bounded(256));
    const QByteArray longLine = "LongLine=" + QByteArray(1024 * 1024, 'x');
    const QByteArray configuration = garbage + "\n" + longLine + "\n" + garbage;

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(configuration)) << velloca.standardError().constData();
    ASSERT_TRUE(velloca.waitForStartUp()) << velloca.standardError().constData();
    EXPECT_TRUE(velloca.isRunning());

    ASSERT_TRUE(velloca.terminate(2000)) << "still running 2 s after SIGTERM";
    EXPECT_EQ(velloca.exitStatus(), QProcess::NormalExit);
    EXPECT_EQ(velloca.exitCode(), 0) << velloca.standardError().constData();
    const QString saved = fileText(velloca.defaultConfigPath());
    EXPECT_EQ(iniValue(saved, "Velloca", "NumSessions"), "1");
    // Compared line by line: a substring search for a 1 MB needle is slow.
    // The line keeps its own line end (LF) as well.
    const QStringList savedLines = saved.split(QLatin1Char('\n'));
    EXPECT_TRUE(savedLines.contains(QString::fromLatin1(longLine))) << "the 1 MB line was not kept";
}

TEST(BadInputE2e, ServiceSwitchesEndTheProgramWithAMessageAndTouchNothing)
{
    // Only removal is tried, and only where no service is installed: it must
    // fail with a message. Installing would change the machine's services.
    if (QFileInfo::exists(QStringLiteral("/etc/systemd/system/velloca.service")))
        GTEST_SKIP() << "a velloca service is installed on this machine";
    for (const QString &word : { QStringLiteral(" -u "), QStringLiteral("/U") }) {
        SCOPED_TRACE(qPrintable(word));
        VellocaProcess velloca;
        ASSERT_TRUE(velloca.start(QByteArray(), { word }));
        ASSERT_TRUE(velloca.waitForExit(10000));
        EXPECT_EQ(velloca.exitStatus(), QProcess::NormalExit);
        EXPECT_EQ(velloca.exitCode(), 1);
        const QByteArray message = velloca.standardError();
        EXPECT_TRUE(message.contains("service did not uninstall successfully.")) << message.constData();
        EXPECT_FALSE(QFileInfo::exists(velloca.defaultConfigPath()));
        EXPECT_FALSE(QFileInfo::exists(velloca.errorLogPath()));
    }
}
