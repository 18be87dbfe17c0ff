// Odd datagrams against a UDP session: empty, as large as UDP allows, and
// from more than one sender.
#include "E2eSupport.h"
#include "PtyServerRun.h"

#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QHostAddress>
#include <QUdpSocket>

#include <gtest/gtest.h>

using namespace e2e;

TEST(UdpE2e, EmptyLargestAndForeignDatagramsAreSurvivedAndTheNextOneIsStillBridged)
{
    PtyPair device;
    ASSERT_TRUE(device.isValid());
    QUdpSocket probe;
    ASSERT_TRUE(probe.bind(QHostAddress::LocalHost, 0));
    const quint16 port = probe.localPort();
    probe.close();
    // A 65536-byte buffer, so that even the largest datagram fits.
    const QString config = loggingGlobalSection(1) + QStringLiteral("[Ports]\r\nCOM3=%1\r\n").arg(device.slavePath())
        + QStringLiteral("[Session1]\r\nConnector=3\r\nBaudRate=12\r\nDatabits=3\r\nUseUDP=1\r\nTCPOption=1\r\n"
                         "LocalIP=127.0.0.1\r\nIPAddress=127.0.0.1\r\nPortNumber=%1\r\nAutoActivate=1\r\n"
                         "BufferSize=5\r\nBufferSerialData=0\r\nWaitForCr=0\r\n")
              .arg(port);

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Listening..."), port)))
        << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForLogLine(QStringLiteral("COM Status: Open")));

    QUdpSocket first;
    QUdpSocket second;
    ASSERT_TRUE(first.bind(QHostAddress::LocalHost, 0));
    ASSERT_TRUE(second.bind(QHostAddress::LocalHost, 0));
    auto send = [&](QUdpSocket &sender, const QByteArray &datagram) {
        return sender.writeDatagram(datagram, QHostAddress::LocalHost, port) == datagram.size();
    };

    {
        SCOPED_TRACE("empty datagram, then an ordinary one");
        ASSERT_TRUE(send(first, QByteArray()));
        ASSERT_TRUE(send(first, "after empty\r"));
        EXPECT_EQ(device.read(12), QByteArray("after empty\r"));
        EXPECT_TRUE(velloca.isRunning());
    }
    {
        SCOPED_TRACE("65507 bytes, the largest UDP datagram over IPv4");
        const QByteArray largest = allByteValues(65507, 4);
        ASSERT_TRUE(send(first, largest)) << qPrintable(first.errorString());
        EXPECT_TRUE(sameBytes(device.read(int(largest.size()), 10000), largest));
        ASSERT_TRUE(send(first, "after largest\r"));
        EXPECT_EQ(device.read(14), QByteArray("after largest\r"));
        EXPECT_TRUE(velloca.isRunning());
    }
    {
        SCOPED_TRACE("a second sender, then the first again");
        ASSERT_TRUE(send(second, "from second\r"));
        EXPECT_EQ(device.read(12), QByteArray("from second\r"));
        ASSERT_TRUE(send(first, "from first\r"));
        EXPECT_EQ(device.read(11), QByteArray("from first\r"));
    }
    {
        SCOPED_TRACE("a burst of empty datagrams from both");
        for (int i = 0; i < 200; ++i)
            ASSERT_TRUE(send(i % 2 ? first : second, QByteArray()));
        ASSERT_TRUE(send(second, "still here\r"));
        EXPECT_EQ(device.read(11), QByteArray("still here\r"));
    }
    EXPECT_TRUE(velloca.isRunning());
    ASSERT_TRUE(velloca.terminate(2000));
    EXPECT_EQ(velloca.exitCode(), 0) << velloca.standardError().constData();
}
