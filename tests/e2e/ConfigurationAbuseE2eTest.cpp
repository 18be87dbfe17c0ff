// Configuration files no one should write: far too many sessions, absurd
// numbers, garbage. The program starts in bounded time and memory and ends
// cleanly on SIGTERM.
#include "E2eSupport.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"

#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QDir>
#include <QElapsedTimer>
#include <QFile>
#include <QFileInfo>
#include <QRandomGenerator>

#include <gtest/gtest.h>

using namespace e2e;

namespace {

// Starts, waits for the start-up to finish, then ends with SIGTERM.
void expectBoundedStartAndCleanEnd(VellocaProcess &velloca, qint64 maxResidentKiB)
{
    QElapsedTimer clock;
    clock.start();
    ASSERT_TRUE(velloca.waitForStartUp(20000)) << "no start-up within 20 s; stderr:\n"
                                               << velloca.standardError().constData();
    const qint64 resident = residentKiB(velloca.processId());
    EXPECT_LT(resident, maxResidentKiB) << "VmRSS " << resident << " KiB";
    ::testing::Test::RecordProperty("startUpMs", int(clock.elapsed()));
    ::testing::Test::RecordProperty("residentKiB", int(resident));
    ASSERT_TRUE(velloca.terminate(5000)) << "still running 5 s after SIGTERM";
    EXPECT_EQ(velloca.exitStatus(), QProcess::NormalExit);
    EXPECT_EQ(velloca.exitCode(), 0) << velloca.standardError().constData();
}

} // namespace

TEST(ConfigurationAbuseE2e, TenThousandSessionsOpenAtTheLoaderLimitAndAreAllSavedAgain)
{
    QByteArray config = "[Velloca]\r\nNumSessions=10000\r\nLogErrors=1\r\n";
    for (int n = 1; n <= 10000; ++n)
        config += "[Session" + QByteArray::number(n) + "]\r\nConnector=0\r\nPortNumber=" + QByteArray::number(n) + "\r\n";
    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config)) << velloca.standardError().constData();
    expectBoundedStartAndCleanEnd(velloca, 1024 * 1024);
    if (HasFatalFailure())
        return;
    const QString saved = fileText(velloca.defaultConfigPath());
    // Only 256 were opened; the others are passed on, not dropped.
    EXPECT_EQ(iniValue(saved, "Velloca", "NumSessions"), "10000");
    EXPECT_EQ(iniValue(saved, "Session256", "PortNumber"), "256");
    EXPECT_EQ(iniValue(saved, "Session257", "PortNumber"), "257");
    EXPECT_EQ(iniValue(saved, "Session10000", "PortNumber"), "10000");
}

TEST(ConfigurationAbuseE2e, GarbageDuplicatesAndAbsurdNumbersStartAndReportTheBadSessions)
{
    PtyPair device;
    ASSERT_TRUE(device.isValid());
    QByteArray garbage(32 * 1024, Qt::Uninitialized);
    QRandomGenerator random(99);
    for (char &byte : garbage)
        byte = char(random.bounded(256));
    const quint16 goodPort = freeTcpPort();
    ASSERT_NE(goodPort, 0);
    const QByteArray config = "[Velloca]\r\nNumSessions=3\r\nLogErrors=1\r\nPacketSize=1099511627776\r\n"
        + garbage + "\r\n"
        + "LongLine=" + QByteArray(1024 * 1024, 'y') + "\r\n"
        + "[Ports]\r\nCOM3=" + QFile::encodeName(device.slavePath()) + "\r\n"
        // A port number no TCP port has.
        + "[Session1]\r\nConnector=0\r\nTCPOption=1\r\nIPAddress=127.0.0.1\r\nPortNumber=99999\r\nAutoActivate=1\r\n"
        // A baud rate no list has, on a real device.
        + "[Session2]\r\nConnector=3\r\nBaudRate=1099511627776\r\nTCPOption=1\r\nLocalIP=127.0.0.1\r\n"
          "IPAddress=127.0.0.1\r\nPortNumber=" + QByteArray::number(goodPort) + "\r\nAutoActivate=1\r\n"
        // Duplicate sections: the first one counts, the second may not break it.
        + "[Session1]\r\nPortNumber=1\r\n[Velloca]\r\nNumSessions=5000\r\n"
        + "[Session3]\r\nConnector=-7\r\nBufferSize=99999999999\r\nPortNumber=-5\r\nAutoActivate=1\r\n"
        + garbage;
    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config)) << velloca.standardError().constData();
    EXPECT_TRUE(velloca.waitForLogLine(QStringLiteral("TCP/IP Status: Error - Invalid Port Number"), 20000))
        << qPrintable(velloca.errorLog().left(4000)) << velloca.standardError().constData();
    expectBoundedStartAndCleanEnd(velloca, 300 * 1024);
    if (HasFatalFailure())
        return;
    EXPECT_FALSE(velloca.errorLog().contains(QStringLiteral("Server Mode, Local Port: 99999")));
    const QString saved = fileText(velloca.defaultConfigPath());
    EXPECT_EQ(iniValue(saved, "Velloca", "NumSessions"), "3");
}
