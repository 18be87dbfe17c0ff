#include "PtyServerRun.h"

#include "E2eSupport.h"

namespace e2e {

QString loggingGlobalSection(int sessions)
{
    return QStringLiteral("[Velloca]\r\nNumSessions=%1\r\nLogErrors=1\r\nPacketSize=2000\r\n").arg(sessions);
}

::testing::AssertionResult PtyServerRun::start(const QString &extraKeys, const QString &more, int sessions)
{
    if (!device.isValid())
        return ::testing::AssertionFailure() << "no pty";
    port = freeTcpPort();
    if (port == 0)
        return ::testing::AssertionFailure() << "no free port";
    const QString config = loggingGlobalSection(sessions)
        + QStringLiteral("[Ports]\r\nCOM3=%1\r\n").arg(device.slavePath())
        + serverSessionSection(1, 3, port, true) + QStringLiteral("Databits=3\r\n") + extraKeys + more;
    if (!velloca.start(config.toUtf8()))
        return ::testing::AssertionFailure() << "not started: " << velloca.standardError().constData();
    if (!velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Listening..."), port)))
        return ::testing::AssertionFailure() << "never listened; log:\n" << qPrintable(velloca.errorLog());
    if (!velloca.waitForLogLine(QStringLiteral("COM Status: Open")))
        return ::testing::AssertionFailure() << "device not opened; log:\n" << qPrintable(velloca.errorLog());
    if (!velloca.waitForStartUp())
        return ::testing::AssertionFailure() << "start-up did not finish";
    return ::testing::AssertionSuccess();
}

} // namespace e2e
