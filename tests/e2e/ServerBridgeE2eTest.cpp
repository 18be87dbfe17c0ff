// The whole program as a user runs it: a configuration on disk, sessions
// activated at start-up, a pty as the serial device and real TCP clients.
#include "E2eSupport.h"
#include "VellocaProcess.h"

#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QHostAddress>
#include <QTcpSocket>

#include <gtest/gtest.h>

#include <memory>

using namespace e2e;

namespace {

QString globalSection(int sessions)
{
    return QStringLiteral("[Velloca]\r\nNumSessions=%1\r\nLogErrors=1\r\nPacketSize=2000\r\n").arg(sessions);
}

std::unique_ptr<QTcpSocket> connectedClient(quint16 port)
{
    auto client = std::make_unique<QTcpSocket>();
    client->connectToHost(QHostAddress::LocalHost, port);
    waitUntil([&] { return client->state() == QAbstractSocket::ConnectedState
                           || client->state() == QAbstractSocket::UnconnectedState; });
    return client;
}

} // namespace

TEST(ServerBridgeE2e, AutoActivatedServerOnMappedPtyCarriesEveryByteValueBothWays)
{
    PtyPair device;
    ASSERT_TRUE(device.isValid());
    const quint16 port = freeTcpPort();
    ASSERT_NE(port, 0);
    const QString config = globalSection(1) + QStringLiteral("[Ports]\r\nCOM3=%1\r\n").arg(device.slavePath())
        + serverSessionSection(1, 3, port, true);

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Listening..."), port)))
        << qPrintable(velloca.errorLog());
    EXPECT_TRUE(velloca.waitForLogLine(QStringLiteral("COM Status: Open")));

    const auto client = connectedClient(port);
    ASSERT_EQ(client->state(), QAbstractSocket::ConnectedState) << qPrintable(client->errorString());
    // Serial bytes that come before the session counts the client are dropped.
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Connected (1)"), port)))
        << qPrintable(velloca.errorLog());

    const QByteArray fromDevice = allByteValues(6 * 1024, 1);
    ASSERT_TRUE(device.write(fromDevice));
    EXPECT_TRUE(sameBytes(readFromSocket(*client, int(fromDevice.size())), fromDevice));

    const QByteArray fromNetwork = allByteValues(6 * 1024, 7);
    ASSERT_EQ(client->write(fromNetwork), fromNetwork.size());
    EXPECT_TRUE(sameBytes(device.read(int(fromNetwork.size()), 10000), fromNetwork));

    EXPECT_TRUE(velloca.isRunning());
}

TEST(ServerBridgeE2e, OnlySessionsSavedAsActiveListenAfterStartUp)
{
    PtyPair devices[3];
    quint16 ports[3] = {};
    QString config = globalSection(3) + QStringLiteral("[Ports]\r\n");
    for (int i = 0; i < 3; ++i) {
        ASSERT_TRUE(devices[i].isValid());
        config += QStringLiteral("COM%1=%2\r\n").arg(i + 3).arg(devices[i].slavePath());
    }
    for (int i = 0; i < 3; ++i) {
        ports[i] = freeTcpPort();
        ASSERT_NE(ports[i], 0);
        config += serverSessionSection(i + 1, i + 3, ports[i], i != 1);
    }

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    const QString listening = QStringLiteral("TCP/IP Status: Listening...");
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(listening, ports[0]))) << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(listening, ports[2]))) << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForStartUp());

    const auto first = connectedClient(ports[0]);
    const auto second = connectedClient(ports[1]);
    const auto third = connectedClient(ports[2]);
    EXPECT_EQ(first->state(), QAbstractSocket::ConnectedState);
    EXPECT_EQ(third->state(), QAbstractSocket::ConnectedState);
    EXPECT_EQ(second->state(), QAbstractSocket::UnconnectedState);
    EXPECT_EQ(second->error(), QAbstractSocket::ConnectionRefusedError) << qPrintable(second->errorString());

    // Each active session bridges its own device and no other.
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("Connected (1)"), ports[0])));
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("Connected (1)"), ports[2])));
    ASSERT_TRUE(devices[0].write("first device\r"));
    ASSERT_TRUE(devices[2].write("third device\r"));
    EXPECT_EQ(readFromSocket(*first, 13), QByteArray("first device\r"));
    EXPECT_EQ(readFromSocket(*third, 13), QByteArray("third device\r"));
    third->write("to the third\n");
    EXPECT_EQ(devices[2].read(13), QByteArray("to the third\n"));
    EXPECT_TRUE(first->readAll().isEmpty());
    EXPECT_TRUE(devices[0].read(1, 200).isEmpty());
    EXPECT_TRUE(devices[1].read(1, 200).isEmpty());

    // The inactive session has nothing to say in the log.
    const QString secondPortEnding = QStringLiteral("Local Port: %1").arg(ports[1]);
    for (const QString &line : velloca.logLines())
        EXPECT_FALSE(line.endsWith(secondPortEnding)) << qPrintable(line);
}
