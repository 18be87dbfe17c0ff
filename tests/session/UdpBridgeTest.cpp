#include "BridgeFixture.h"

#include <QFile>
#include <QNetworkDatagram>
#include <QUdpSocket>

namespace {

// The peer sends from an ephemeral port, as ordinary UDP clients do.
class UdpBridgeTest : public BridgeTest
{
protected:
    void activateUdpServer()
    {
        const int port = freePort();
        ASSERT_TRUE(peer.bind(QHostAddress::LocalHost, 0));
        engine->settings().UseUDP = 1;
        engine->settings().TCPOption = 1;
        engine->settings().PortNumber = QString::number(port);
        engine->Command1_Click();
        ASSERT_TRUE(engine->isActive());
        EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Listening..."));
        // The session answers whoever sent last, at the port it came from.
        peer.writeDatagram("hello", QHostAddress::LocalHost, quint16(port));
        ASSERT_EQ(pty.read(5), QByteArray("hello"));
    }

    QList<QByteArray> receiveDatagrams(int totalBytes, int timeoutMs = 10000)
    {
        QList<QByteArray> datagrams;
        int received = 0;
        waitUntil([&] {
            while (peer.hasPendingDatagrams()) {
                datagrams << peer.receiveDatagram().data();
                received += int(datagrams.last().size());
            }
            return received >= totalBytes;
        }, timeoutMs);
        return datagrams;
    }

    QUdpSocket peer;
};

TEST_F(UdpBridgeTest, PacketModeCutsAtPacketSizeAndFlushesTheRestAfterTheTimeout)
{
    engine->settings().WaitForCr = 1;
    engine->settings().TimeoutValue = QStringLiteral("150");
    activateUdpServer();
    const QByteArray data = randomBytes(4500);
    ASSERT_TRUE(pty.write(data));
    const QList<QByteArray> datagrams = receiveDatagrams(4500);
    ASSERT_EQ(datagrams.size(), 3);
    EXPECT_EQ(datagrams[0].size(), 2000);
    EXPECT_EQ(datagrams[1].size(), 2000);
    EXPECT_EQ(datagrams[2].size(), 500);
    EXPECT_TRUE(datagrams[0] + datagrams[1] + datagrams[2] == data);
    EXPECT_EQ(engine->myBuffer().count(), 0);
}

TEST_F(UdpBridgeTest, ImmediateModeSendsWhatArrivedAndDatagramsReachTheSerialSide)
{
    activateUdpServer();
    ASSERT_TRUE(pty.write("one block"));
    const QList<QByteArray> datagrams = receiveDatagrams(9);
    ASSERT_FALSE(datagrams.isEmpty());
    EXPECT_EQ(datagrams.join(), QByteArray("one block"));

    const QByteArray big = randomBytes(8000);
    peer.writeDatagram(big, QHostAddress::LocalHost, quint16(engine->socket(0)->localPort()));
    EXPECT_TRUE(pty.read(big.size()) == big);
}

} // namespace

namespace {

TEST_F(UdpBridgeTest, SendThatFailsIsShownAndLogged)
{
    GlobalOptions::global().LogErrors = 1;
    GlobalOptions::global().PacketSize = 70000; // more than one datagram carries
    engine->settings().WaitForCr = 1;
    engine->settings().TimeoutValue = QStringLiteral("100000");
    engine->settings().BufferSize = 6; // 131072 bytes
    activateUdpServer();
    ASSERT_TRUE(pty.write(randomBytes(70000)));
    const QString failure = QStringLiteral("TCP/IP Status: Error - Datagram too large");
    EXPECT_TRUE(waitUntil([&] { return engine->statusLine(SessionEngine::NetworkLine).startsWith(failure); }))
        << engine->statusLine(SessionEngine::NetworkLine).toStdString();
    QFile log(folder.filePath(QStringLiteral("errorlog.txt")));
    ASSERT_TRUE(log.open(QIODevice::ReadOnly));
    EXPECT_TRUE(QString::fromUtf8(log.readAll()).contains(failure));
}

} // namespace
