#include "BridgeFixture.h"

#include "platform/SerialPortControl.h"

#include <QElapsedTimer>
#include <QFile>
#include <QRegularExpression>

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

QStringList logLines(const QTemporaryDir &folder)
{
    QFile log(folder.filePath(QStringLiteral("errorlog.txt")));
    if (!log.open(QIODevice::ReadOnly))
        return {};
    const QString text = QString::fromUtf8(log.readAll());
    QStringList lines = text.split(QStringLiteral("\r\n"));
    if (!lines.isEmpty() && lines.last().isEmpty())
        lines.removeLast();
    return lines;
}

TEST_F(BridgeTest, ServerSessionCarriesOneMiBBothWaysAtOnce)
{
    activateServer();
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status: Open"));
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Listening..."));
    EXPECT_EQ(engine->caption(), QStringLiteral("COM7 - RS232 to TCP/IP"));
    EXPECT_TRUE(engine->settingsLocked());
    auto client = connectClient();
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Connected (1)"));

    const QByteArray toNetwork = randomBytes(1 << 20);
    const QByteArray toSerial = randomBytes((1 << 20) + 1);
    client->write(toSerial);
    ASSERT_TRUE(pty.write(toNetwork));
    EXPECT_TRUE(readSocket(*client, toNetwork.size()) == toNetwork);
    EXPECT_TRUE(pty.read(toSerial.size(), 30000) == toSerial);

    engine->Command1_Click();
    EXPECT_FALSE(engine->isActive());
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status: Closed"));
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Closed"));
    EXPECT_EQ(engine->activateCaption(), QStringLiteral("Activate"));
    EXPECT_FALSE(engine->settingsLocked());
    EXPECT_EQ(engine->record().ClientCount, 0);
    EXPECT_TRUE(waitUntil([&] { return client->state() == QAbstractSocket::UnconnectedState; }));
}

TEST_F(BridgeTest, ClientSessionCarriesOneMiBBothWays)
{
    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, 0));
    engine->settings().PortNumber = QString::number(server.serverPort());
    engine->Command1_Click();
    ASSERT_TRUE(engine->isActive());
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }));
    std::unique_ptr<QTcpSocket> peer(server.nextPendingConnection());
    ASSERT_TRUE(waitUntil([&] {
        return engine->statusLine(SessionEngine::NetworkLine) == QStringLiteral("TCP/IP Status: Connected");
    }));

    const QByteArray toNetwork = randomBytes(1 << 20);
    const QByteArray toSerial = randomBytes(1 << 20);
    peer->write(toSerial);
    ASSERT_TRUE(pty.write(toNetwork));
    EXPECT_TRUE(readSocket(*peer, toNetwork.size()) == toNetwork);
    EXPECT_TRUE(pty.read(toSerial.size(), 30000) == toSerial);
}

TEST_F(BridgeTest, SerialDataIsHeldWhileNoClientIsConnectedOnlyWhenAsked)
{
    // Without "buffer data" serial bytes that find no client are discarded.
    activateServer();
    ASSERT_TRUE(pty.write("lost"));
    ASSERT_TRUE(waitUntil([&] { return engine->lampLit(0); }));
    engine->Command1_Click();

    engine->settings().BufferSerialData = 1;
    activateServer();
    ASSERT_TRUE(pty.write("kept for later"));
    ASSERT_TRUE(waitUntil([&] { return engine->myBuffer().count() == 14; }));
    auto client = connectClient();
    EXPECT_EQ(readSocket(*client, 14), QByteArray("kept for later"));
}

TEST_F(BridgeTest, FirstClientOnlyFollowsTheLowestIndexAfterReuse)
{
    engine->record().ServerSerialOptions = 2;
    engine->record().ServerTCPOptions = 2;
    activateServer();
    auto first = connectClient();  // index 1
    auto second = connectClient(); // index 2
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Connected (2)"));

    ASSERT_TRUE(pty.write("to first"));
    EXPECT_EQ(readSocket(*first, 8), QByteArray("to first"));
    second->write("dropped");
    first->write("written");
    EXPECT_EQ(pty.read(7), QByteArray("written"));

    // Gone at once with a reset (a FIN alone may be only a half-close).
    const linger abortive { 1, 0 };
    setsockopt(int(first->socketDescriptor()), SOL_SOCKET, SO_LINGER, &abortive, sizeof abortive);
    first->abort();
    ASSERT_TRUE(waitUntil([&] { return engine->record().ClientCount == 1; }));
    auto third = connectClient(); // reuses index 1
    EXPECT_EQ(engine->record().MaxSocketIndex, 2);
    ASSERT_TRUE(pty.write("to newest"));
    EXPECT_EQ(readSocket(*third, 9), QByteArray("to newest"));
    EXPECT_TRUE(second->readAll().isEmpty());
}

TEST_F(BridgeTest, IgnoreOptionsDropDataInTheirDirection)
{
    engine->record().ServerSerialOptions = 1;
    engine->record().ServerTCPOptions = 1;
    activateServer();
    auto client = connectClient();
    client->write("never reaches the serial side");
    ASSERT_TRUE(waitUntil([&] { return engine->lampLit(1); }));
    ASSERT_TRUE(pty.write("never reaches the network"));
    ASSERT_TRUE(waitUntil([&] { return engine->lampLit(0); }));
    // A marker through a second session would need more set-up; instead the
    // buffers show that nothing was kept for either side.
    EXPECT_EQ(engine->serialOutBuffer().count(), 0);
    EXPECT_EQ(engine->myBuffer().count(), 0);
    EXPECT_TRUE(pty.read(1, 300).isEmpty());
    EXPECT_TRUE(client->readAll().isEmpty());
}

TEST_F(BridgeTest, SingleClientServerKeepsTheSecondClientOutUntilTheFirstStopsSending)
{
    engine->record().AllowMultiConnect = 0;
    activateServer();
    auto first = connectClient();
    QTcpSocket second;
    second.connectToHost(QStringLiteral("127.0.0.1"), quint16(serverPort()));
    // The request is closed at once by the socket layer, not left waiting.
    EXPECT_TRUE(waitUntil([&] { return second.state() == QAbstractSocket::UnconnectedState; }));
    EXPECT_EQ(engine->record().ClientCount, 1);
    ASSERT_TRUE(pty.write("only one"));
    EXPECT_EQ(readSocket(*first, 8), QByteArray("only one"));

    // A client that has stopped sending makes way for the next one.
    ::shutdown(int(first->socketDescriptor()), SHUT_WR);
    ASSERT_TRUE(waitUntil([&] { return engine->socket(1)->isHalfClosed(); }));
    QTcpSocket third;
    third.connectToHost(QStringLiteral("127.0.0.1"), quint16(serverPort()));
    EXPECT_TRUE(waitUntil([&] { return first->state() == QAbstractSocket::UnconnectedState; }));
    ASSERT_TRUE(pty.write("next one"));
    EXPECT_EQ(readSocket(third, 8), QByteArray("next one"));
    EXPECT_EQ(engine->record().ClientCount, 1);
}

TEST_F(BridgeTest, SlowSerialSideLosesNothingOfFourMiB)
{
    activateServer();
    auto client = connectClient();
    const QByteArray payload = randomBytes(4 << 20);
    client->write(payload);
    // Nobody reads the serial side for a while: the data must wait in the
    // socket, not be dropped when the session's buffers are full.
    ASSERT_TRUE(waitUntil([&] { return engine->serialOutBuffer().count() == engine->serialOutBuffer().capacity(); }));
    QTest::qWait(500);
    EXPECT_TRUE(pty.read(payload.size(), 60000) == payload);
}

TEST_F(BridgeTest, ClientReconnectsAfterTheServerComesBack)
{
    const int port = freePort();
    engine->settings().PortNumber = QString::number(port);
    engine->Command1_Click();
    ASSERT_TRUE(engine->isActive());
    // Nothing listens: the refusal closes the socket and starts the retry timer.
    ASSERT_TRUE(waitUntil([&] { return engine->isReconnecting(); }));
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Closed"));

    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, quint16(port)));
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }, 15000)) << "one retry every 5 s";
    ASSERT_TRUE(waitUntil([&] { return !engine->isReconnecting(); }));
    std::unique_ptr<QTcpSocket> peer(server.nextPendingConnection());

    // The server goes away again: the session retries until it is back.
    peer->abort();
    ASSERT_TRUE(waitUntil([&] { return engine->isReconnecting(); }));
    engine->ConnectAttempt();
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }));
    ASSERT_TRUE(waitUntil([&] {
        return engine->statusLine(SessionEngine::NetworkLine) == QStringLiteral("TCP/IP Status: Connected");
    }));
}

TEST_F(BridgeTest, ClientFacingAResettingServerTriesOnceEveryFiveSecondsAndLogsEachAttempt)
{
    GlobalOptions::global().LogErrors = 1;
    const int server = ::socket(AF_INET, SOCK_STREAM | SOCK_NONBLOCK, 0);
    sockaddr_in address {};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    ASSERT_EQ(::bind(server, reinterpret_cast<sockaddr *>(&address), length), 0);
    ASSERT_EQ(::listen(server, 16), 0);
    ASSERT_EQ(::getsockname(server, reinterpret_cast<sockaddr *>(&address), &length), 0);
    int accepts = 0;
    auto resetWaiting = [&] {
        for (int client; (client = ::accept(server, nullptr, nullptr)) >= 0; ++accepts) {
            const linger abortive { 1, 0 };
            setsockopt(client, SOL_SOCKET, SO_LINGER, &abortive, sizeof abortive);
            ::close(client);
        }
        return accepts >= 2;
    };
    engine->settings().PortNumber = QString::number(ntohs(address.sin_port));
    engine->Command1_Click();
    // Reset before the session has seen its connection complete.
    pollfd waiting { server, POLLIN, 0 };
    ASSERT_EQ(::poll(&waiting, 1, 5000), 1);
    resetWaiting();
    QElapsedTimer sinceFirst;
    sinceFirst.start();
    EXPECT_TRUE(waitUntil(resetWaiting, 8000));
    EXPECT_GE(sinceFirst.elapsed(), 4500) << "attempt " << accepts << " came early";
    EXPECT_EQ(logLines(folder).filter(QStringLiteral("TCP/IP Status: Connecting...")).size(), accepts);
    ::close(server);
}

TEST_F(BridgeTest, ActivationRefusalsTouchNothing)
{
    engine->settings().IPAddress.clear();
    engine->Command1_Click();
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Error - Invalid IP Address"));
    EXPECT_FALSE(engine->isActive());
    // A server has no remote host: its hidden field does not matter.
    activateServer();
    engine->Command1_Click();
    engine->settings().TCPOption = 0;

    engine->settings().IPAddress = QStringLiteral("127.0.0.1");
    for (const char *bad : { "65536", "-1" }) {
        engine->settings().PortNumber = QString::fromLatin1(bad);
        engine->Command1_Click();
        EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine),
                  QStringLiteral("TCP/IP Status: Error - Invalid Port Number")) << bad;
        EXPECT_FALSE(engine->isActive());
    }

    engine->settings().PortNumber = QStringLiteral("1000");
    engine->settings().Connector = 0;
    engine->Command1_Click();
    EXPECT_EQ(engine->caption(), QStringLiteral("New - RS232 to TCP/IP"));
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status:"));
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status:"));
    EXPECT_FALSE(engine->isActive());

    // Typed text that names no connector creates nothing.
    engine->settings().Connector = -1;
    engine->settings().ConnectorText = QStringLiteral("my port");
    engine->settings().CreateVirtualPort = 1;
    engine->Command1_Click();
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine),
              QStringLiteral("COM Status: Error - Port not available (\"my port\" names no connector)"));
    EXPECT_FALSE(engine->isActive());
    engine->settings().CreateVirtualPort = 0;

    // A device that does not exist: the reason is on the COM line.
    engine->settings().Connector = 9;
    const QString device = folder.filePath(QStringLiteral("ttyUSB9"));
    PortMap::global().setDevice(9, device);
    engine->Command1_Click();
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine),
              QStringLiteral("COM Status: Error - Port not available (%1 does not exist)").arg(device));
    EXPECT_FALSE(engine->isActive());

    // A port already in use by another server closes the serial side again.
    QTcpServer occupier;
    ASSERT_TRUE(occupier.listen(QHostAddress::LocalHost, 0));
    engine->settings().Connector = kCom;
    engine->settings().TCPOption = 1;
    engine->settings().PortNumber = QString::number(occupier.serverPort());
    engine->Command1_Click();
    EXPECT_FALSE(engine->isActive());
    EXPECT_TRUE(engine->statusLine(SessionEngine::NetworkLine).startsWith(QStringLiteral("TCP/IP Status: Error - ")));
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status: Closed"));
}

TEST_F(BridgeTest, SerialSettingsAndFlowControlReachTheDevice)
{
    SessionSettings &s = engine->settings();
    s.BaudRate = 8;    // 19200
    s.Parity = 1;      // Even
    s.Databits = 2;    // 7
    s.Stopbits = 2;    // 2
    s.FlowControl = 3; // Opto-RS: hardware handshaking
    activateServer();
    EXPECT_EQ(engine->serialPort()->settings(), QStringLiteral("19200,E,7,2"));
    EXPECT_EQ(engine->serialPort()->handshaking(), int(SerialPortControl::RtsCts));
    const termios t = pty.slaveTermios();
    EXPECT_EQ(cfgetospeed(&t), speed_t(B19200));
    EXPECT_TRUE(t.c_cflag & CSTOPB);
    EXPECT_TRUE(t.c_cflag & CRTSCTS);
}

TEST_F(BridgeTest, VirtualPortBranchCreatesAndRemovesThePort)
{
    engine->settings().CreateVirtualPort = 1;
    engine->settings().Connector = 5;
    engine->settings().ConnectorText = QStringLiteral("COM5");
    engine->settings().PortNumber = QString::number(freePort());
    engine->Command1_Click();
    ASSERT_TRUE(engine->isActive());
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("Virtual Port COM5 created"));
    // A client that waits for the application to open the port does not
    // connect yet and leaves the network line as it was.
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status:"));
    const QString link = folder.filePath(QStringLiteral("ports/COM5"));
    EXPECT_TRUE(QFileInfo(link).isSymLink());

    engine->Command1_Click();
    EXPECT_FALSE(engine->isActive());
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("Virtual port closed"));
    EXPECT_FALSE(QFileInfo::exists(link));

    // Something else in the way of the link: creation is refused, nothing opens.
    QFile blocker(link);
    ASSERT_TRUE(blocker.open(QIODevice::WriteOnly));
    blocker.close();
    engine->Command1_Click();
    EXPECT_FALSE(engine->isActive());
    EXPECT_TRUE(engine->statusLine(SessionEngine::ComLine).startsWith(QStringLiteral("Cannot create virtual COM5")));
}

TEST_F(BridgeTest, UnpluggedDeviceIsReportedAndTheSessionRecovers)
{
    activateServer();
    pty.closeMaster();
    ASSERT_TRUE(waitUntil([&] { return engine->statusLine(SessionEngine::ComLine).startsWith(QStringLiteral("COM Status: Error - ")); }));
    EXPECT_TRUE(engine->isActive());
    engine->Command1_Click();
    EXPECT_EQ(engine->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status: Closed"));

    PtyPair replacement;
    PortMap::global().setDevice(kCom, replacement.slavePath());
    activateServer();
    auto client = connectClient();
    ASSERT_TRUE(replacement.write("back again"));
    EXPECT_EQ(readSocket(*client, 10), QByteArray("back again"));
}

TEST_F(BridgeTest, ErrorLogRecordsEveryStatusChangeWithTheRole)
{
    GlobalOptions::global().LogErrors = 1;
    activateServer();
    // Each change is one line; the role and port are those in force when
    // the line is written, so the last one shows the listening server.
    const QRegularExpression line(QStringLiteral(
        "^Velloca Error: (.*), \\d\\d-\\d\\d-\\d{4}, \\d\\d:\\d\\d:\\d\\d, Velloca IP Address: 127\\.0\\.0\\.1, (.*)$"));
    QStringList messages;
    for (const QString &text : logLines(folder)) {
        const auto match = line.match(text);
        EXPECT_TRUE(match.hasMatch()) << text.toStdString();
        messages << match.captured(1);
    }
    EXPECT_EQ(messages, (QStringList { "COM Status: Open", "TCP/IP Status: Listening..." }));
    EXPECT_TRUE(logLines(folder).last().endsWith(QStringLiteral("Server Mode, Local Port: %1").arg(serverPort())));
    engine->Command1_Click();

    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, 0));
    engine->settings().TCPOption = 0;
    engine->settings().PortNumber = QString::number(server.serverPort());
    engine->Command1_Click();
    ASSERT_TRUE(waitUntil([&] { return logLines(folder).last().contains(QStringLiteral("Status: Connected,")); }));
    EXPECT_TRUE(logLines(folder).last().endsWith(
        QStringLiteral(", Velloca IP Address: 127.0.0.1, Client Mode, Remote Host: 127.0.0.1, RemotePort: %1")
            .arg(server.serverPort())));
}

} // namespace

namespace {

// Writes to the pty master until the kernel refuses more for a while, i.e.
// the session has stopped reading the serial side.
qsizetype writeUntilHeldBack(PtyPair &pty, const QByteArray &data, qsizetype from)
{
    int refusals = 0;
    while (from < data.size() && refusals < 100) {
        const ssize_t n = ::write(pty.masterFd(), data.constData() + from, size_t(qMin<qsizetype>(4096, data.size() - from)));
        if (n > 0) {
            from += n;
            refusals = 0;
        } else {
            ++refusals;
            QTest::qWait(5);
        }
    }
    return from;
}

TEST_F(BridgeTest, PeerThatDoesNotReadHoldsTheSerialSideBackWithoutLoss)
{
    activateServer();
    // A plain socket with a small fixed receive window, so that neither the
    // kernel nor a client library soaks up the stream while it is not read.
    const int client = ::socket(AF_INET, SOCK_STREAM, 0);
    const int window = 4096;
    setsockopt(client, SOL_SOCKET, SO_RCVBUF, &window, sizeof window);
    sockaddr_in address {};
    address.sin_family = AF_INET;
    address.sin_port = htons(quint16(serverPort()));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    ASSERT_EQ(::connect(client, reinterpret_cast<sockaddr *>(&address), sizeof address), 0);
    fcntl(client, F_SETFL, O_NONBLOCK);
    ASSERT_TRUE(waitUntil([&] { return engine->record().ClientCount == 1; }));

    // More than the kernel's send buffer can take (tcp_wmem tops out at 4 MiB).
    const QByteArray payload = randomBytes(8 << 20);
    const qsizetype written = writeUntilHeldBack(pty, payload, 0);
    ASSERT_LT(written, payload.size()) << "the serial side was never held back";
    // What waits inside the program stays within the session's buffers.
    const qint64 capacity = engine->myBuffer().capacity();
    EXPECT_LE(engine->socket(1)->bytesToWrite(), 2 * capacity);
    EXPECT_LE(engine->myBuffer().count(), capacity);

    QByteArray received;
    qsizetype sent = written;
    char chunk[65536];
    // The test's peer is a raw socket the event loop does not watch, so it
    // is pumped by hand: read what came, feed the pty, let the program run.
    QDeadlineTimer deadline(60000);
    while (received.size() < payload.size() && !deadline.hasExpired()) {
        for (ssize_t n; (n = ::read(client, chunk, sizeof chunk)) > 0;)
            received.append(chunk, n);
        if (sent < payload.size()) {
            const ssize_t n = ::write(pty.masterFd(), payload.constData() + sent, size_t(qMin<qsizetype>(65536, payload.size() - sent)));
            if (n > 0)
                sent += n;
        }
        QCoreApplication::processEvents();
        pollfd readable { client, POLLIN, 0 };
        ::poll(&readable, 1, 1);
    }
    ASSERT_EQ(received.size(), payload.size());
    EXPECT_TRUE(received == payload);
    ::close(client);
}

} // namespace

namespace {

TEST_F(BridgeTest, VirtualPortClientConnectsOnlyWhileAnApplicationHoldsThePort)
{
    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, 0));
    engine->settings().CreateVirtualPort = 1;
    engine->settings().Connector = 5;
    engine->settings().PortNumber = QString::number(server.serverPort());
    engine->Command1_Click();
    ASSERT_TRUE(engine->isActive());
    EXPECT_FALSE(waitUntil([&] { return server.hasPendingConnections(); }, 300));

    const QByteArray link = folder.filePath(QStringLiteral("ports/COM5")).toLocal8Bit();
    const int application = ::open(link.constData(), O_RDWR | O_NOCTTY | O_NONBLOCK);
    ASSERT_GE(application, 0);
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }));
    std::unique_ptr<QTcpSocket> peer(server.nextPendingConnection());
    ASSERT_TRUE(waitUntil([&] {
        return engine->statusLine(SessionEngine::NetworkLine) == QStringLiteral("TCP/IP Status: Connected");
    }));

    ASSERT_EQ(::write(application, "from the app", 12), 12);
    EXPECT_EQ(readSocket(*peer, 12), QByteArray("from the app"));
    peer->write("to the app");
    QByteArray atApplication;
    ASSERT_TRUE(waitUntil([&] {
        char buffer[64];
        const ssize_t n = ::read(application, buffer, sizeof buffer);
        if (n > 0)
            atApplication.append(buffer, n);
        return atApplication == "to the app";
    }));

    ::close(application);
    ASSERT_TRUE(waitUntil([&] { return peer->state() == QAbstractSocket::UnconnectedState; }));
    EXPECT_EQ(engine->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status: Closed"));
    EXPECT_FALSE(engine->isReconnecting()) << "a closed port is no reason to reconnect";
}

} // namespace

namespace {

TEST_F(BridgeTest, IdleSessionRestsItsTimerAndWakesForTraffic)
{
    activateServer();
    auto client = connectClient();
    ASSERT_TRUE(waitUntil([&] { return !engine->isTicking(); })) << "an idle session keeps ticking";

    // Traffic either way wakes it, and the data still goes through.
    ASSERT_TRUE(pty.write("ping"));
    EXPECT_EQ(readSocket(*client, 4), QByteArray("ping"));
    client->write("pong");
    EXPECT_EQ(pty.read(4), QByteArray("pong"));
    EXPECT_TRUE(waitUntil([&] { return !engine->lampLit(0) && !engine->lampLit(1); })) << "lamps go out by the ticks";
    EXPECT_TRUE(waitUntil([&] { return !engine->isTicking(); }));

    // Held data waits for its time-out flush, which needs the ticks.
    engine->settings().WaitForCr = 1;
    ASSERT_TRUE(pty.write("held"));
    EXPECT_EQ(readSocket(*client, 4), QByteArray("held"));

    // The watchdog needs them too while it is on.
    GlobalOptions::global().PingEnabled = 1;
    engine->wakeTicks();
    QTest::qWait(200); // a few ticks: it must not go to rest
    EXPECT_TRUE(engine->isTicking());
}

} // namespace
