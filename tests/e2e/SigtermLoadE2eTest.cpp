// SIGTERM while data streams both ways through a pty session and a virtual
// port: a quick, clean end that leaves nothing behind.
#include "E2eSupport.h"
#include "PtyServerRun.h"
#include "RawStreams.h"

#include "support/Wait.h"

#include <QCoreApplication>
#include <QDeadlineTimer>
#include <QElapsedTimer>
#include <QFile>
#include <QFileInfo>

#include <gtest/gtest.h>

#include <csignal>
#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

using namespace e2e;

TEST(SigtermLoadE2e, SigtermMidTransferExitsWithinTwoSecondsCleanlyAndLeavesNothingBehind)
{
    PtyServerRun run;
    const quint16 virtualPort = freeTcpPort();
    ASSERT_NE(virtualPort, 0);
    const QString virtualSession = QStringLiteral("[Session2]\r\nConnector=5\r\nCreateVirtualPort=1\r\nTCPOption=1\r\n"
                                                  "LocalIP=127.0.0.1\r\nIPAddress=127.0.0.1\r\nPortNumber=%1\r\n"
                                                  "AutoActivate=1\r\nBufferSerialData=0\r\nWaitForCr=0\r\n")
                                       .arg(virtualPort);
    ASSERT_TRUE(run.start({}, virtualSession, 2));
    ASSERT_TRUE(run.velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Listening..."), virtualPort)))
        << qPrintable(run.velloca.errorLog());
    const QString link = run.velloca.virtualPortFolder() + QStringLiteral("/COM5");
    const QString control = run.velloca.virtualPortFolder() + QStringLiteral("/control");
    ASSERT_TRUE(isSymbolicLink(link));
    ASSERT_TRUE(QFileInfo::exists(control));

    const int client = connectTcp(run.port);
    const int virtualClient = connectTcp(virtualPort);
    const int application = ::open(QFile::encodeName(link).constData(), O_RDWR | O_NOCTTY | O_NONBLOCK);
    ASSERT_GE(client, 0);
    ASSERT_GE(virtualClient, 0);
    ASSERT_GE(application, 0);
    ASSERT_TRUE(run.velloca.waitForLogLine(serverLogLine(QStringLiteral("Connected (1)"), run.port)));
    ASSERT_TRUE(run.velloca.waitForLogLine(serverLogLine(QStringLiteral("Connected (1)"), virtualPort)));

    const QByteArray chunk = allByteValues(8192, 5);
    const int writers[] = { client, virtualClient, application, run.device.masterFd() };
    auto pump = [&](int ms) {
        QDeadlineTimer deadline(ms);
        while (!deadline.hasExpired() && run.velloca.isRunning()) {
            for (const int fd : writers) {
                [[maybe_unused]] const ssize_t n = ::write(fd, chunk.constData(), size_t(chunk.size()));
                discardInput(fd);
            }
            QCoreApplication::processEvents(QEventLoop::AllEvents, 5);
        }
    };
    pump(500);
    ASSERT_TRUE(run.velloca.isRunning());

    QElapsedTimer sinceSignal;
    sinceSignal.start();
    ::kill(pid_t(run.velloca.processId()), SIGTERM);
    pump(2000);
    ASSERT_TRUE(run.velloca.waitForExit(100)) << "still running " << sinceSignal.elapsed() << " ms after SIGTERM";
    EXPECT_LE(sinceSignal.elapsed(), 2100);
    EXPECT_EQ(run.velloca.exitStatus(), QProcess::NormalExit);
    EXPECT_EQ(run.velloca.exitCode(), 0) << run.velloca.standardError().constData();
    EXPECT_FALSE(isSymbolicLink(link)) << "the virtual port's link outlived the program";
    EXPECT_FALSE(QFileInfo::exists(control)) << "the command channel outlived the program";
    EXPECT_TRUE(run.velloca.processesOfThisRun().isEmpty());
    for (const int fd : writers) {
        if (fd != run.device.masterFd())
            ::close(fd);
    }
}
