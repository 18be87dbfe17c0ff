#include "BridgeFixture.h"

#include <QFile>

namespace {

// The session's pings go to a stand-in that answers as the test says: a
// peer that holds a TCP connection open yet ignores echo requests cannot be
// made on loopback.
class PingWatchdogTest : public BridgeTest
{
protected:
    PingWatchdogTest()
    {
        SessionPlatform platform = SessionPlatform::real(folder.filePath(QStringLiteral("ports")));
        platform.pingRemoteHost = [this](const QString &address, int timeoutMs, QObject *context,
                                         std::function<void(int)> done) {
            pinged << address;
            timeouts << timeoutMs;
            QMetaObject::invokeMethod(context, [this, done] { done(nextStatus); }, Qt::QueuedConnection);
        };
        engine = std::make_unique<SessionEngine>(platform);
        SessionSettings &s = engine->settings();
        s.Connector = kCom;
        s.ConnectorText = QStringLiteral("COM%1").arg(kCom);
        s.IPAddress = QStringLiteral("127.0.0.1");
        s.LocalIP = QStringLiteral("127.0.0.1");
        engine->record().LocalIPAddress = QStringLiteral("127.0.0.1");
        GlobalOptions::global().PingEnabled = 1;
        GlobalOptions::global().PingFrequency = 0; // every 9 ticks
        GlobalOptions::global().PingTimeout = 9;   // 1000 ms
        GlobalOptions::global().LogErrors = 1;
    }

    // Ticks by hand without running the event loop, so the session's own
    // timer adds none in between.
    void tick(int count)
    {
        for (int i = 0; i < count; ++i)
            engine->Timer2_Tick();
    }

    QStringList pinged;
    QList<int> timeouts;
    int nextStatus = 0;
};

TEST_F(PingWatchdogTest, PeriodsFollowTheFrequencyList)
{
    EXPECT_EQ(SessionEngine::pingPeriodTicks(0), 9);
    EXPECT_EQ(SessionEngine::pingPeriodTicks(1), 18);
    EXPECT_EQ(SessionEngine::pingPeriodTicks(3), 182);
    EXPECT_EQ(SessionEngine::pingPeriodTicks(13), 1092);
}

TEST_F(PingWatchdogTest, AnsweringPeersStayAndSilentOnesAreDroppedWithALogLine)
{
    activateServer();
    auto first = connectClient();
    auto second = connectClient();
    engine->record().PingTicks = 0;
    tick(8);
    EXPECT_TRUE(pinged.isEmpty()) << "not before the period is over";
    tick(1);
    EXPECT_EQ(pinged, (QStringList { "127.0.0.1", "127.0.0.1" }));
    EXPECT_EQ(timeouts.first(), 1000);
    EXPECT_EQ(engine->record().ClientCount, 2);

    ASSERT_TRUE(waitUntil([&] { return engine->pingsInFlight() == 0; }));
    EXPECT_EQ(engine->record().ClientCount, 2) << "answered pings change nothing";

    nextStatus = 11010;
    engine->record().PingTicks = 0;
    tick(9);
    ASSERT_TRUE(waitUntil([&] { return engine->record().ClientCount == 0; }));
    EXPECT_TRUE(waitUntil([&] { return first->state() == QAbstractSocket::UnconnectedState; }));
    QFile log(folder.filePath(QStringLiteral("errorlog.txt")));
    ASSERT_TRUE(log.open(QIODevice::ReadOnly));
    EXPECT_TRUE(log.readAll().contains("Velloca Error: Ping Failed - Ping Result = 11010   [IP Request Timed Out], "));
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Listening..."));
}

TEST_F(PingWatchdogTest, BusyOrDisabledSessionsAreNeverPinged)
{
    activateServer();
    auto client = connectClient();
    // Data from the peer restarts the count every time.
    for (int round = 0; round < 8; ++round) {
        tick(2);
        client->write("alive");
        ASSERT_EQ(pty.read(5), QByteArray("alive"));
    }
    EXPECT_TRUE(pinged.isEmpty());

    GlobalOptions::global().PingEnabled = 0;
    const int ticksBefore = engine->record().PingTicks;
    tick(30);
    EXPECT_TRUE(pinged.isEmpty());
    EXPECT_EQ(engine->record().PingTicks, ticksBefore) << "the count stands still while disabled";
}

TEST(PingWatchdogReal, LoopbackPeerAnswersAndKeepsItsConnection)
{
    // The real echo against 127.0.0.1: the connection must survive.
    QTemporaryDir folder;
    PtyPair pty;
    PortMap::global().setDevice(7, pty.slavePath());
    GlobalOptions::global() = GlobalOptions {};
    GlobalOptions::global().PingEnabled = 1;
    GlobalOptions::global().PingFrequency = 0;
    GlobalOptions::global().PingTimeout = 9;
    SessionEngine engine(SessionPlatform::real(folder.path()));
    engine.settings().Connector = 7;
    engine.settings().IPAddress = QStringLiteral("x");
    engine.settings().LocalIP = QStringLiteral("127.0.0.1");
    engine.settings().TCPOption = 1;
    engine.settings().PortNumber = QStringLiteral("0"); // any free port
    engine.Command1_Click();
    ASSERT_TRUE(engine.isActive());
    QTcpSocket client;
    client.connectToHost(QStringLiteral("127.0.0.1"), quint16(engine.socket(0)->localPort()));
    ASSERT_TRUE(waitUntil([&] { return engine.record().ClientCount == 1; }));
    for (int i = 0; i < 9; ++i)
        engine.Timer2_Tick();
    ASSERT_EQ(engine.pingsInFlight(), 1);
    ASSERT_TRUE(waitUntil([&] { return engine.pingsInFlight() == 0; }, 5000));
    EXPECT_EQ(engine.record().ClientCount, 1);
    EXPECT_EQ(client.state(), QAbstractSocket::ConnectedState);
    PortMap::global().clear();
    GlobalOptions::global() = GlobalOptions {};
}

} // namespace
