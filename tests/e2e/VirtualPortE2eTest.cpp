// A client session that offers a virtual port and connects only while an
// application holds that port open.
#include "E2eSupport.h"
#include "VellocaProcess.h"

#include "support/Wait.h"

#include <QFile>
#include <QHostAddress>
#include <QTcpServer>
#include <QTcpSocket>

#include <gtest/gtest.h>

#include <fcntl.h>
#include <unistd.h>

using namespace e2e;

namespace {

// Opens the virtual port as a terminal program would, then makes the
// descriptor non-blocking so the test can keep the event loop running.
int openLikeAnApplication(const QString &path)
{
    const int fd = ::open(QFile::encodeName(path).constData(), O_RDWR | O_NOCTTY);
    if (fd >= 0)
        ::fcntl(fd, F_SETFL, ::fcntl(fd, F_GETFL) | O_NONBLOCK);
    return fd;
}

} // namespace

TEST(VirtualPortE2e, ClientConnectsWhileTheApplicationHoldsTheVirtualPort)
{
    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, 0));
    const QString config = QStringLiteral("[Velloca]\r\n"
                                          "NumSessions=1\r\n"
                                          "LogErrors=1\r\n"
                                          "[Session1]\r\n"
                                          "Connector=5\r\n"
                                          "CreateVirtualPort=1\r\n"
                                          "TCPOption=0\r\n"
                                          "IPAddress=127.0.0.1\r\n"
                                          "PortNumber=%1\r\n"
                                          "ConnectOnVirtualOpen=1\r\n"
                                          "ClientOptions=0\r\n"
                                          "BufferSerialData=0\r\n"
                                          "WaitForCr=0\r\n"
                                          "AutoActivate=1\r\n")
                               .arg(server.serverPort());

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    ASSERT_TRUE(velloca.waitForLogLine(QStringLiteral("Virtual Port COM5 created"))) << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForStartUp());
    const QString link = velloca.virtualPortFolder() + QStringLiteral("/COM5");
    ASSERT_TRUE(isSymbolicLink(link));

    // Nobody holds the port yet: the session must not even try to connect.
    EXPECT_FALSE(waitUntil([&] {
        return server.hasPendingConnections() || velloca.errorLog().contains(QStringLiteral("Connecting..."));
    }, 500));

    auto logCount = [&](const QString &text) { return velloca.errorLog().count(text); };
    const QString connected = QStringLiteral("TCP/IP Status: Connected,");
    const QString closed = QStringLiteral("TCP/IP Status: Closed,");
    for (int round = 1; round <= 2; ++round) {
        SCOPED_TRACE(round == 1 ? "first open" : "open again after closing");
        const qsizetype connectedBefore = logCount(connected);
        const int fd = openLikeAnApplication(link);
        ASSERT_GE(fd, 0) << qPrintable(link);
        ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); })) << qPrintable(velloca.errorLog());
        QTcpSocket *peer = server.nextPendingConnection();
        // Bytes the application writes before the session sees the
        // connection would be dropped.
        ASSERT_TRUE(waitUntil([&] { return logCount(connected) > connectedBefore; }));

        const QByteArray fromApplication = allByteValues(4096, round);
        ASSERT_TRUE(writeToFd(fd, fromApplication));
        EXPECT_TRUE(sameBytes(readFromSocket(*peer, int(fromApplication.size())), fromApplication));

        const QByteArray fromServer = allByteValues(4096, round + 10);
        ASSERT_EQ(peer->write(fromServer), fromServer.size());
        EXPECT_TRUE(sameBytes(readFromFd(fd, int(fromServer.size())), fromServer));

        const qsizetype closedBefore = logCount(closed);
        ::close(fd);
        EXPECT_TRUE(waitUntil([&] { return peer->state() == QAbstractSocket::UnconnectedState; }))
            << "the connection stayed up after the application closed the port";
        EXPECT_TRUE(waitUntil([&] { return logCount(closed) > closedBefore; }));
        delete peer;
    }

    ASSERT_TRUE(velloca.terminate(2000));
    EXPECT_EQ(velloca.exitCode(), 0) << velloca.standardError().constData();
    EXPECT_FALSE(isSymbolicLink(link)) << "the virtual port's link outlived the program";
}
