// A client session whose server is not there yet: it retries calmly and
// connects once the server appears.
#include "E2eSupport.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"

#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QElapsedTimer>
#include <QHostAddress>
#include <QTcpServer>

#include <gtest/gtest.h>

using namespace e2e;

TEST(ClientRetryE2e, RefusedClientRetriesAtMostEveryFiveSecondsWithoutLeakingAndConnectsWhenTheServerAppears)
{
    PtyPair device;
    ASSERT_TRUE(device.isValid());
    const quint16 port = freeTcpPort();
    ASSERT_NE(port, 0);
    const QString config = loggingGlobalSection(1) + QStringLiteral("[Ports]\r\nCOM3=%1\r\n").arg(device.slavePath())
        + QStringLiteral("[Session1]\r\nConnector=3\r\nBaudRate=6\r\nDatabits=3\r\nTCPOption=0\r\n"
                         "IPAddress=127.0.0.1\r\nPortNumber=%1\r\nAutoActivate=1\r\n"
                         "BufferSerialData=0\r\nWaitForCr=0\r\nClientOptions=0\r\n")
              .arg(port);

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    const QString connecting = QStringLiteral("TCP/IP Status: Connecting...");
    auto attempts = [&] { return velloca.errorLog().count(connecting); };
    ASSERT_TRUE(waitUntil([&] { return attempts() >= 1; })) << qPrintable(velloca.errorLog());
    QElapsedTimer sinceFirst;
    sinceFirst.start();
    // The refusal itself shows in the log before the next attempt.
    ASSERT_TRUE(velloca.waitForLogLine(QStringLiteral("TCP/IP Status: Error"), 5000)) << qPrintable(velloca.errorLog());
    const qint64 pid = velloca.processId();
    const int descriptorsAfterFirst = openDescriptorCount(pid);

    // Watches ~11 s: the first attempt and two retries at most.
    QList<qint64> attemptTimes { 0 };
    waitUntil([&] {
        if (attempts() > attemptTimes.size())
            attemptTimes << sinceFirst.elapsed();
        return false;
    }, 11000);
    const qint64 window = sinceFirst.elapsed();
    EXPECT_LE(attemptTimes.size(), 1 + window / 5000) << attemptTimes.size() << " attempts in " << window << " ms";
    EXPECT_GE(attemptTimes.size(), 2) << "no retry within " << window << " ms";
    for (qsizetype i = 1; i < attemptTimes.size(); ++i)
        EXPECT_GE(attemptTimes[i] - attemptTimes[i - 1], 4500) << "attempt " << i;
    EXPECT_TRUE(waitUntil([&] { return openDescriptorCount(pid) <= descriptorsAfterFirst; }, 2000))
        << openDescriptorCount(pid) << " descriptors open, " << descriptorsAfterFirst << " after the first attempt";

    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, port));
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }, 7000))
        << "no connection within 7 s of the server appearing\n" << qPrintable(velloca.errorLog());
    EXPECT_TRUE(velloca.waitForLogLine(QStringLiteral("TCP/IP Status: Connected,"), 5000)) << qPrintable(velloca.errorLog());
    EXPECT_TRUE(velloca.isRunning());
}
