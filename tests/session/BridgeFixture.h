#pragma once

#include "config/GlobalOptions.h"
#include "config/ProgramFolder.h"
#include "platform/PortMap.h"
#include "platform/SocketMember.h"
#include "session/SessionEngine.h"
#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QRandomGenerator>
#include <QTcpServer>
#include <QTcpSocket>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <memory>

// A session engine bridging a real pty (mapped as COM7) and loopback sockets,
// with its error log in a temporary program folder.
class BridgeTest : public ::testing::Test
{
protected:
    static constexpr int kCom = 7;

    BridgeTest()
    {
        setProgramFolderForTesting(folder.path());
        GlobalOptions::global() = GlobalOptions {};
        GlobalOptions::global().PacketSize = 2000;
        PortMap::global().setDevice(kCom, pty.slavePath());
        engine = std::make_unique<SessionEngine>(SessionPlatform::real(folder.filePath(QStringLiteral("ports"))));
        SessionSettings &s = engine->settings();
        s.Connector = kCom;
        s.ConnectorText = QStringLiteral("COM%1").arg(kCom);
        s.IPAddress = QStringLiteral("127.0.0.1");
        s.LocalIP = QStringLiteral("127.0.0.1");
        engine->record().LocalIPAddress = QStringLiteral("127.0.0.1");
    }
    ~BridgeTest() override
    {
        engine.reset();
        PortMap::global().clear();
        setProgramFolderForTesting(QString());
        GlobalOptions::global() = GlobalOptions {};
    }

    // Activates a server session listening on a free loopback port.
    void activateServer()
    {
        engine->settings().TCPOption = 1;
        engine->settings().PortNumber = QString::number(freePort());
        engine->Command1_Click();
        ASSERT_TRUE(engine->isActive()) << engine->statusLine(SessionEngine::ComLine).toStdString() << " / "
                                        << engine->statusLine(SessionEngine::NetworkLine).toStdString();
    }
    int serverPort() const { return engine->socket(0)->localPort(); }

    // Connects a test client to the server session and waits until the
    // session has accepted it.
    std::unique_ptr<QTcpSocket> connectClient()
    {
        auto client = std::make_unique<QTcpSocket>();
        const int before = engine->record().ClientCount;
        client->connectToHost(QStringLiteral("127.0.0.1"), quint16(serverPort()));
        EXPECT_TRUE(waitUntil([&] { return engine->record().ClientCount > before; }));
        EXPECT_TRUE(waitUntil([&] { return client->state() == QAbstractSocket::ConnectedState; }));
        return client;
    }

    static int freePort()
    {
        QTcpServer probe;
        probe.listen(QHostAddress::LocalHost, 0);
        return probe.serverPort();
    }

    static QByteArray randomBytes(int size)
    {
        QByteArray bytes(size, Qt::Uninitialized);
        QRandomGenerator generator(size);
        for (char &byte : bytes)
            byte = char(generator.generate() & 0xFF);
        return bytes;
    }

    // Reads from a socket until `count` bytes have arrived or time runs out.
    static QByteArray readSocket(QTcpSocket &socket, qsizetype count, int timeoutMs = 20000)
    {
        QByteArray received;
        waitUntil([&] {
            received += socket.readAll();
            return received.size() >= count;
        }, timeoutMs);
        return received;
    }

    QTemporaryDir folder;
    PtyPair pty;
    std::unique_ptr<SessionEngine> engine;
};
