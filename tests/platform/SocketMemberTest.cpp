// Socket members against real peers on 127.0.0.1 (QTcpServer, QTcpSocket,
// QUdpSocket), every wait bounded.
#include "platform/QtSocketMember.h"
#include "support/Wait.h"

#include <QCoreApplication>
#include <QNetworkDatagram>
#include <QSignalSpy>
#include <QTcpServer>
#include <QTcpSocket>
#include <QUdpSocket>
#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include <sys/socket.h>

namespace {

const QString kLoopback = QStringLiteral("127.0.0.1");

// A port nobody listens on: bound once, then released.
int unusedTcpPort()
{
    QTcpServer server;
    server.listen(QHostAddress::LocalHost, 0);
    return server.serverPort();
}

// Reads what arrives on a member until `size` bytes are there.
QByteArray takeFromMember(SocketMember &member, int size)
{
    QByteArray received;
    waitUntil([&] {
        received += member.getData();
        return received.size() >= size;
    });
    return received;
}

QByteArray takeFromPeer(QIODevice &peer, int size)
{
    QByteArray received;
    waitUntil([&] {
        received += peer.readAll();
        return received.size() >= size;
    });
    return received;
}

QNetworkDatagram nextDatagram(QUdpSocket &peer)
{
    waitUntil([&] { return peer.hasPendingDatagrams(); });
    return peer.receiveDatagram();
}

QByteArray pattern(int size)
{
    QByteArray bytes(size, Qt::Uninitialized);
    for (int i = 0; i < size; ++i)
        bytes[i] = char((i * 7 + i / 251) & 0xff);
    return bytes;
}

} // namespace

TEST(SocketMemberTest, TcpClientConnectsExchangesDataAndSeesPeerClose)
{
    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, 0));
    QtSocketMember member(0);
    QSignalSpy connectedSpy(&member, &SocketMember::connected);
    QSignalSpy closedSpy(&member, &SocketMember::closed);
    QSignalSpy errorSpy(&member, &SocketMember::errorOccurred);

    member.setRemoteHost(kLoopback);
    member.setRemotePort(server.serverPort());
    ASSERT_TRUE(member.connectToRemote());
    EXPECT_EQ(connectedSpy.count(), 0) << "the outcome must come after the call";
    ASSERT_TRUE(waitUntil([&] { return connectedSpy.count() == 1; }));
    EXPECT_EQ(connectedSpy.at(0).at(0).toInt(), 0);
    EXPECT_EQ(member.state(), SocketMember::StateConnected);
    EXPECT_EQ(member.remoteHostIP(), kLoopback);
    EXPECT_NE(member.localPort(), 0);
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }));
    std::unique_ptr<QTcpSocket> peer(server.nextPendingConnection());

    EXPECT_TRUE(member.sendData("hello"));
    EXPECT_EQ(takeFromPeer(*peer, 5), "hello");
    QSignalSpy arrivedSpy(&member, &SocketMember::dataArrived);
    peer->write("world");
    ASSERT_TRUE(waitUntil([&] { return arrivedSpy.count() > 0; }));
    EXPECT_EQ(takeFromMember(member, 5), "world");

    // Bytes sent just before the peer closes can still be taken afterwards.
    peer->write("tail");
    peer->disconnectFromHost();
    ASSERT_TRUE(waitUntil([&] { return closedSpy.count() == 1; }));
    EXPECT_EQ(member.state(), SocketMember::StateClosing);
    EXPECT_EQ(member.getData(), "tail");
    member.close();
    EXPECT_EQ(member.state(), SocketMember::StateClosed);
    EXPECT_FALSE(member.sendData("x"));

    // The member is reused; a local close tells the peer but raises nothing.
    ASSERT_TRUE(member.connectToRemote());
    ASSERT_TRUE(waitUntil([&] { return connectedSpy.count() == 2; }));
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }));
    peer.reset(server.nextPendingConnection());
    member.close();
    ASSERT_TRUE(waitUntil([&] { return peer->state() == QAbstractSocket::UnconnectedState; }));
    EXPECT_EQ(closedSpy.count(), 1);
    EXPECT_EQ(errorSpy.count(), 0);
}

TEST(SocketMemberTest, TcpClientReportsRefusalUnknownHostAndBadTargets)
{
    QtSocketMember member(3);
    QSignalSpy errorSpy(&member, &SocketMember::errorOccurred);
    const int port = unusedTcpPort();
    member.setRemoteHost(kLoopback);
    member.setRemotePort(port);
    ASSERT_TRUE(member.connectToRemote());
    EXPECT_EQ(errorSpy.count(), 0) << "the refusal must come after the call";
    ASSERT_TRUE(waitUntil([&] { return errorSpy.count() == 1; }));
    EXPECT_EQ(errorSpy.at(0).at(0).toInt(), 3);
    EXPECT_EQ(errorSpy.at(0).at(1).toInt(), SocketMember::ErrConnectionRefused);
    EXPECT_EQ(errorSpy.at(0).at(2).toString(),
              QStringLiteral("Connection refused by 127.0.0.1:%1").arg(port));
    EXPECT_EQ(member.state(), SocketMember::StateError);
    EXPECT_EQ(member.lastError(), SocketMember::ErrConnectionRefused);

    // An error of an attempt closed locally is never reported: once a later
    // attempt on another member has failed, the first would have too.
    ASSERT_TRUE(member.connectToRemote());
    member.close();
    QtSocketMember witness(4);
    QSignalSpy witnessSpy(&witness, &SocketMember::errorOccurred);
    witness.setRemoteHost(kLoopback);
    witness.setRemotePort(port);
    ASSERT_TRUE(witness.connectToRemote());
    ASSERT_TRUE(waitUntil([&] { return witnessSpy.count() == 1; }));
    EXPECT_EQ(errorSpy.count(), 1);

    member.setRemoteHost(QStringLiteral("nonexistent.invalid"));
    ASSERT_TRUE(member.connectToRemote());
    EXPECT_EQ(member.state(), SocketMember::StateResolvingHost);
    EXPECT_FALSE(member.connectToRemote()) << "a second connect while one is under way";
    EXPECT_EQ(member.lastError(), 10037);
    ASSERT_TRUE(waitUntil([&] { return errorSpy.count() == 2; }, 60000));
    EXPECT_EQ(errorSpy.at(1).at(1).toInt(), SocketMember::ErrHostNotFound);
    EXPECT_TRUE(errorSpy.at(1).at(2).toString().contains(QStringLiteral("nonexistent.invalid")));
    member.close();

    // Targets that cannot be right fail at once, without a signal.
    struct Case { QString host; int port; int number; };
    const std::vector<Case> cases = {
        {QStringLiteral("1.2.3.999"), 5000, SocketMember::ErrHostNotFound},
        {QStringLiteral("my host"), 5000, SocketMember::ErrHostNotFound},
        {QString(), 5000, SocketMember::ErrHostNotFound},
        {kLoopback, 0, SocketMember::ErrAddressNotAvailable},
        {kLoopback, 70000, SocketMember::ErrAddressNotAvailable},
    };
    for (const Case &c : cases) {
        member.setRemoteHost(c.host);
        member.setRemotePort(c.port);
        EXPECT_FALSE(member.connectToRemote()) << c.host.toStdString() << ":" << c.port;
        EXPECT_EQ(member.lastError(), c.number) << c.host.toStdString() << ":" << c.port;
        EXPECT_FALSE(member.errorString().isEmpty());
        EXPECT_EQ(member.state(), SocketMember::StateClosed);
    }
    EXPECT_EQ(errorSpy.count(), 2);
}

TEST(SocketMemberTest, TcpServerHandsRequestsToOtherMembersAndClosesUnacceptedOnes)
{
    QtSocketMember listener(0);
    ASSERT_TRUE(listener.bind(0, kLoopback)) << listener.errorString().toStdString();
    EXPECT_EQ(listener.state(), SocketMember::StateOpen);
    const int port = listener.localPort();
    ASSERT_GT(port, 0);
    ASSERT_TRUE(listener.listen());
    EXPECT_EQ(listener.state(), SocketMember::StateListening);

    std::vector<std::unique_ptr<QtSocketMember>> members;
    members.push_back(std::make_unique<QtSocketMember>(1));
    members.push_back(std::make_unique<QtSocketMember>(2));
    bool acceptRequests = true;
    int requests = 0;
    QObject::connect(&listener, &SocketMember::connectionRequested, [&](int index, qintptr id) {
        EXPECT_EQ(index, 0);
        ++requests;
        if (!acceptRequests)
            return;
        for (auto &member : members) {
            if (member->state() == SocketMember::StateClosed) {
                member->setLocalPort(listener.localPort());
                EXPECT_TRUE(member->accept(id)) << member->errorString().toStdString();
                return;
            }
        }
    });

    QTcpSocket clientA;
    clientA.connectToHost(QHostAddress::LocalHost, quint16(port));
    ASSERT_TRUE(waitUntil([&] { return members[0]->state() == SocketMember::StateConnected; }));
    QTcpSocket clientB;
    clientB.connectToHost(QHostAddress::LocalHost, quint16(port));
    ASSERT_TRUE(waitUntil([&] { return members[1]->state() == SocketMember::StateConnected; }));
    EXPECT_EQ(members[0]->remoteHostIP(), kLoopback);
    EXPECT_EQ(members[1]->localPort(), port);

    clientA.write("from A");
    clientB.write("from B");
    EXPECT_EQ(takeFromMember(*members[0], 6), "from A");
    EXPECT_EQ(takeFromMember(*members[1], 6), "from B");
    EXPECT_TRUE(members[1]->sendData("to B"));
    EXPECT_EQ(takeFromPeer(clientB, 4), "to B");

    // B stops sending but still receives; once B has closed completely, a
    // send finds it gone.
    QSignalSpy closedB(members[1].get(), &SocketMember::closed);
    ASSERT_EQ(::shutdown(int(clientB.socketDescriptor()), SHUT_WR), 0);
    ASSERT_TRUE(waitUntil([&] { return members[1]->isHalfClosed(); }));
    EXPECT_TRUE(members[1]->sendData("answer"));
    EXPECT_EQ(takeFromPeer(clientB, 6), "answer");
    clientB.abort();
    EXPECT_TRUE(waitUntil([&] { return !members[1]->sendData("more") || closedB.count() > 0; }));
    ASSERT_TRUE(waitUntil([&] { return closedB.count() == 1; }));
    EXPECT_EQ(members[1]->state(), SocketMember::StateClosing);

    // Nobody accepts: the client is disconnected at once, not left hanging.
    acceptRequests = false;
    QTcpSocket clientC;
    QSignalSpy clientCGone(&clientC, &QTcpSocket::disconnected);
    clientC.connectToHost(QHostAddress::LocalHost, quint16(port));
    ASSERT_TRUE(waitUntil([&] { return clientCGone.count() == 1; }));
    EXPECT_EQ(requests, 3);
    EXPECT_EQ(listener.state(), SocketMember::StateListening);

    EXPECT_FALSE(members[0]->accept(12345)) << "the member is busy";
    EXPECT_EQ(members[0]->lastError(), 10056);

    // A closed member is reused for the next client.
    members[0]->close();
    EXPECT_FALSE(members[0]->accept(12345)) << "an id that was never announced";
    EXPECT_EQ(members[0]->lastError(), 10022);
    ASSERT_TRUE(waitUntil([&] { return clientA.state() == QAbstractSocket::UnconnectedState; }));
    acceptRequests = true;
    QTcpSocket clientD;
    clientD.connectToHost(QHostAddress::LocalHost, quint16(port));
    ASSERT_TRUE(waitUntil([&] { return members[0]->state() == SocketMember::StateConnected; }));
    clientD.write("from D");
    EXPECT_EQ(takeFromMember(*members[0], 6), "from D");
}

TEST(SocketMemberTest, BindFailuresNameTheCause)
{
    QTcpServer tcpBlocker;
    ASSERT_TRUE(tcpBlocker.listen(QHostAddress::AnyIPv4, 0));
    QtSocketMember member(0);
    EXPECT_FALSE(member.bind(tcpBlocker.serverPort()));
    EXPECT_EQ(member.lastError(), SocketMember::ErrAddressInUse);
    EXPECT_TRUE(member.errorString().contains(QString::number(tcpBlocker.serverPort())))
        << member.errorString().toStdString();
    EXPECT_EQ(member.state(), SocketMember::StateClosed);

    QUdpSocket udpBlocker;
    ASSERT_TRUE(udpBlocker.bind(QHostAddress::AnyIPv4, 0));
    member.setProtocol(SocketMember::Udp);
    EXPECT_FALSE(member.bind(udpBlocker.localPort()));
    EXPECT_EQ(member.lastError(), SocketMember::ErrAddressInUse);
    member.setProtocol(SocketMember::Tcp);

    // Not an address, not an IPv4 address, not an address of this machine.
    for (const QString &address : {QStringLiteral("300.1.1.1"), QStringLiteral("not-an-ip"),
                                   QStringLiteral("192.0.2.1")}) {
        EXPECT_FALSE(member.bind(0, address)) << address.toStdString();
        EXPECT_EQ(member.lastError(), SocketMember::ErrAddressNotAvailable) << address.toStdString();
        EXPECT_TRUE(member.errorString().contains(address)) << member.errorString().toStdString();
    }
    EXPECT_FALSE(member.bind(70000));
    EXPECT_GT(member.lastError(), 10000);
    EXPECT_EQ(member.state(), SocketMember::StateClosed);

    ASSERT_TRUE(member.bind(0)) << "a failed bind leaves the member usable";
    EXPECT_FALSE(member.bind(0)) << "already bound";
    member.close();
    EXPECT_EQ(member.state(), SocketMember::StateClosed);
}

TEST(SocketMemberTest, UdpExchangesDatagramsOfEverySizeBothWays)
{
    QUdpSocket peer;
    ASSERT_TRUE(peer.bind(QHostAddress::LocalHost, 0));
    QtSocketMember member(0);
    member.setProtocol(SocketMember::Udp);
    ASSERT_TRUE(member.bind(0, kLoopback));
    EXPECT_EQ(member.state(), SocketMember::StateOpen);
    const quint16 memberPort = quint16(member.localPort());
    ASSERT_NE(memberPort, 0);
    member.setRemoteHost(kLoopback);
    member.setRemotePort(peer.localPort());
    QSignalSpy arrivedSpy(&member, &SocketMember::dataArrived);

    ASSERT_TRUE(member.sendData("ping"));
    QNetworkDatagram datagram = nextDatagram(peer);
    EXPECT_EQ(datagram.data(), "ping");
    EXPECT_EQ(datagram.senderPort(), memberPort);

    // Each datagram is announced and taken whole; an empty one does not
    // block the next, and maxBytes does not cut a datagram.
    const QByteArray big = pattern(65000);
    peer.writeDatagram("pong", QHostAddress::LocalHost, memberPort);
    peer.writeDatagram(QByteArray(), QHostAddress::LocalHost, memberPort);
    peer.writeDatagram(big, QHostAddress::LocalHost, memberPort);
    const std::vector<QByteArray> expected = {"pong", QByteArray(), big};
    for (size_t i = 0; i < expected.size(); ++i) {
        ASSERT_TRUE(waitUntil([&] { return arrivedSpy.count() > int(i); })) << i;
        EXPECT_EQ(arrivedSpy.at(int(i)).at(1).toLongLong(), expected[i].size());
        EXPECT_EQ(member.bytesAvailable(), expected[i].size());
        EXPECT_EQ(member.getData(10), expected[i]) << i;
    }
    EXPECT_EQ(member.remoteHostIP(), kLoopback);
    EXPECT_TRUE(member.getData().isEmpty());

    ASSERT_TRUE(member.sendData(QByteArray()));
    datagram = nextDatagram(peer);
    EXPECT_TRUE(datagram.isValid());
    EXPECT_TRUE(datagram.data().isEmpty());
    ASSERT_TRUE(member.sendData(big));
    EXPECT_EQ(nextDatagram(peer).data(), big);

    EXPECT_FALSE(member.sendData(QByteArray(70000, 'x')));
    EXPECT_GT(member.lastError(), 10000);

    // A host name is looked up without blocking; the datagram follows.
    member.setRemoteHost(QStringLiteral("localhost"));
    ASSERT_TRUE(member.sendData("by name"));
    EXPECT_EQ(nextDatagram(peer).data(), "by name");
}

TEST(SocketMemberTest, UdpWithoutRemoteHostAnswersTheLastSender)
{
    QtSocketMember member(0);
    member.setProtocol(SocketMember::Udp);
    ASSERT_TRUE(member.bind(0));
    EXPECT_FALSE(member.sendData("nobody yet"));
    EXPECT_EQ(member.lastError(), SocketMember::ErrAddressNotAvailable);
    EXPECT_EQ(member.errorString(), QStringLiteral("No remote host to send the datagram to"));

    QUdpSocket peer;
    ASSERT_TRUE(peer.bind(QHostAddress::LocalHost, 0));
    peer.writeDatagram("hi", QHostAddress::LocalHost, quint16(member.localPort()));
    ASSERT_TRUE(waitUntil([&] { return member.bytesAvailable() > 0; }));
    EXPECT_EQ(member.getData(), "hi");
    ASSERT_TRUE(member.sendData("back"));
    EXPECT_EQ(nextDatagram(peer).data(), "back");
}

// A slow reader must not lose or reorder anything: unread data stays in the
// kernel and is announced again once the reader has taken what it holds.
TEST(SocketMemberTest, TcpReadBufferHoldsTheSenderBackWithoutLosingData)
{
    constexpr qint64 kBufferSize = 64 * 1024;
    const QByteArray stream = pattern(4 * 1024 * 1024);
    QTcpServer server;
    ASSERT_TRUE(server.listen(QHostAddress::LocalHost, 0));
    QtSocketMember member(0);
    member.setReadBufferSize(kBufferSize);
    member.setRemoteHost(kLoopback);
    member.setRemotePort(server.serverPort());
    ASSERT_TRUE(member.connectToRemote());
    ASSERT_TRUE(waitUntil([&] { return server.hasPendingConnections(); }));
    std::unique_ptr<QTcpSocket> peer(server.nextPendingConnection());
    ASSERT_TRUE(waitUntil([&] { return member.state() == SocketMember::StateConnected; }));

    int announcements = 0;
    QObject::connect(&member, &SocketMember::dataArrived, [&] { ++announcements; });
    peer->write(stream);

    // Read only when announced, and only once the buffer is full, taking
    // alternately all of it (Qt re-arms itself) and part of it (the member
    // re-arms it).
    QByteArray received;
    bool takeAll = true;
    qint64 mostBuffered = 0;
    while (received.size() < stream.size()) {
        const bool full = waitUntil([&] {
            return member.bytesAvailable() >= kBufferSize
                   || received.size() + member.bytesAvailable() == stream.size();
        });
        ASSERT_TRUE(full) << "stalled after " << received.size() << " bytes";
        ASSERT_GT(announcements, 0);
        // Let Qt notice the full buffer and stop reading from the kernel.
        for (int i = 0; i < 3; ++i)
            QCoreApplication::processEvents();
        mostBuffered = qMax(mostBuffered, member.bytesAvailable());
        const qint64 take = takeAll ? member.bytesAvailable() : member.bytesAvailable() / 3;
        received += member.getData(take);
        takeAll = !takeAll;
        const int seen = announcements;
        if (received.size() + member.bytesAvailable() < stream.size()) {
            ASSERT_TRUE(waitUntil([&] { return announcements > seen; }))
                << "no new announcement after " << received.size() << " bytes";
        }
    }
    EXPECT_EQ(mostBuffered, kBufferSize);
    EXPECT_TRUE(received == stream) << "stream corrupted";

    // The other way: queued bytes are reported until the kernel has them.
    qint64 written = 0;
    QObject::connect(&member, &SocketMember::bytesWritten, [&](int, qint64 n) { written += n; });
    const QByteArray reply = pattern(1024 * 1024);
    ASSERT_TRUE(member.sendData(reply));
    EXPECT_EQ(member.bytesToWrite(), reply.size());
    EXPECT_TRUE(takeFromPeer(*peer, reply.size()) == reply);
    ASSERT_TRUE(waitUntil([&] { return written == reply.size(); }));
    EXPECT_EQ(member.bytesToWrite(), 0);

    // A local close still delivers what was queued before it.
    ASSERT_TRUE(member.sendData(reply));
    member.close();
    EXPECT_TRUE(takeFromPeer(*peer, reply.size()) == reply);
    EXPECT_TRUE(waitUntil([&] { return peer->state() == QAbstractSocket::UnconnectedState; }));
}
