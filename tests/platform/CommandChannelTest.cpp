#include "platform/CommandChannel.h"
#include "platform/CommandConnection.h"
#include "support/FdIo.h"
#include "support/Wait.h"

#include <QDir>
#include <QFile>
#include <QLocalSocket>
#include <QPointer>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <memory>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace {

struct Call
{
    QString topic;
    QString command;
    bool operator==(const Call &other) const = default;
};

// Records every call; accepts commands that start with "[ok".
struct Recorder
{
    QList<Call> calls;
    std::function<bool(const QString &, const QString &)> decide = [](const QString &, const QString &command) {
        return command.startsWith(QLatin1String("[ok"));
    };
    CommandChannel::Handler handler()
    {
        return [this](const QString &topic, const QString &command) {
            calls.append({ topic, command });
            return decide(topic, command);
        };
    }
};

class Client
{
public:
    explicit Client(const QString &path)
    {
        QObject::connect(&socket, &QLocalSocket::readyRead, &socket, [this] {
            while (socket.canReadLine())
                replies.append(socket.readLine().chopped(1));
        });
        socket.connectToServer(path);
    }
    bool connected()
    {
        return waitUntil([this] { return socket.state() == QLocalSocket::ConnectedState; });
    }
    void send(const QByteArray &bytes) { socket.write(bytes); }
    bool waitReplies(qsizetype count)
    {
        return waitUntil([this, count] { return replies.size() >= count; });
    }
    bool waitClosedByServer()
    {
        return waitUntil([this] { return socket.state() == QLocalSocket::UnconnectedState; });
    }

    QLocalSocket socket;
    QList<QByteArray> replies;
};

mode_t modeOf(const QString &path)
{
    struct stat info {};
    if (::lstat(QFile::encodeName(path).constData(), &info) != 0)
        return 0;
    return info.st_mode;
}

sockaddr_un localAddress(const QString &path)
{
    sockaddr_un address {};
    address.sun_family = AF_UNIX;
    const QByteArray encoded = QFile::encodeName(path);
    std::memcpy(address.sun_path, encoded.constData(), size_t(encoded.size()));
    return address;
}

// A socket file whose program is gone: bound, never listened on, closed.
void leaveStaleSocket(const QString &path)
{
    const int fd = ::socket(AF_UNIX, SOCK_STREAM, 0);
    const sockaddr_un address = localAddress(path);
    ASSERT_EQ(::bind(fd, reinterpret_cast<const sockaddr *>(&address), sizeof address), 0);
    ::close(fd);
}

int openSockets(const CommandChannel &channel)
{
    return int(channel.findChildren<CommandConnection *>().size());
}

} // namespace

TEST(CommandChannelTest, ListensPrivatelyAndRemovesItsSocket)
{
    QTemporaryDir temporary;
    const QString folder = temporary.path() + QStringLiteral("/velloca");
    QString path;
    {
        Recorder recorder;
        CommandChannel channel(recorder.handler());
        QString error;
        ASSERT_TRUE(channel.listen(folder, &error)) << error.toStdString();
        path = channel.socketPath();
        EXPECT_EQ(path, folder + QStringLiteral("/control"));
        EXPECT_TRUE(S_ISSOCK(modeOf(path)));
        EXPECT_EQ(modeOf(path) & 0777, 0600u);
        EXPECT_EQ(modeOf(folder) & 0777, 0700u);
        EXPECT_FALSE(channel.listen(folder, &error));
        EXPECT_TRUE(error.contains(path)) << error.toStdString();
    }
    EXPECT_FALSE(QFileInfo::exists(path));
}

TEST(CommandChannelTest, SharesTheFolderWithOtherProgramsAndReplacesLeftovers)
{
    QTemporaryDir temporary;
    const QString pidName = QStringLiteral("control.%1").arg(::getpid());

    // A live channel keeps its name; the second one takes control.<pid>.
    Recorder first, second;
    CommandChannel firstChannel(first.handler());
    CommandChannel secondChannel(second.handler());
    ASSERT_TRUE(firstChannel.listen(temporary.path()));
    ASSERT_TRUE(secondChannel.listen(temporary.path()));
    EXPECT_EQ(firstChannel.socketPath(), temporary.filePath(QStringLiteral("control")));
    EXPECT_EQ(secondChannel.socketPath(), temporary.filePath(pidName));
    Client toFirst(firstChannel.socketPath()), toSecond(secondChannel.socketPath());
    toFirst.send("System\t[ok1]\n");
    toSecond.send("System\t[ok2]\n");
    ASSERT_TRUE(toFirst.waitReplies(1) && toSecond.waitReplies(1));
    EXPECT_EQ(first.calls, QList<Call>({ { "System", "[ok1]" } }));
    EXPECT_EQ(second.calls, QList<Call>({ { "System", "[ok2]" } }));

    // A socket left by a program that ended is taken over.
    QTemporaryDir staleFolder;
    leaveStaleSocket(staleFolder.filePath(QStringLiteral("control")));
    CommandChannel afterCrash(first.handler());
    ASSERT_TRUE(afterCrash.listen(staleFolder.path()));
    EXPECT_EQ(afterCrash.socketPath(), staleFolder.filePath(QStringLiteral("control")));
    Client toRestarted(afterCrash.socketPath());
    toRestarted.send("System\t[ok3]\n");
    ASSERT_TRUE(toRestarted.waitReplies(1));
    EXPECT_EQ(toRestarted.replies.first(), "accepted");

    // Something that is no socket is never removed.
    QTemporaryDir fileFolder;
    QFile userFile(fileFolder.filePath(QStringLiteral("control")));
    ASSERT_TRUE(userFile.open(QIODevice::WriteOnly));
    userFile.write("keep me");
    userFile.close();
    CommandChannel besideFile(first.handler());
    ASSERT_TRUE(besideFile.listen(fileFolder.path()));
    EXPECT_EQ(besideFile.socketPath(), fileFolder.filePath(pidName));
    ASSERT_TRUE(userFile.open(QIODevice::ReadOnly));
    EXPECT_EQ(userFile.readAll(), "keep me");
}

TEST(CommandChannelTest, RefusesFoldersOthersCouldTamperWith)
{
    QTemporaryDir temporary;
    Recorder recorder;
    QString error;

    const QString shared = temporary.filePath(QStringLiteral("shared"));
    ASSERT_TRUE(QDir().mkdir(shared));
    ::chmod(QFile::encodeName(shared).constData(), 0755);
    CommandChannel inShared(recorder.handler());
    EXPECT_FALSE(inShared.listen(shared, &error));
    EXPECT_TRUE(error.contains(shared) && error.contains(QLatin1String("755"))) << error.toStdString();
    EXPECT_TRUE(inShared.socketPath().isEmpty());

    const QString plainFile = temporary.filePath(QStringLiteral("file"));
    QFile(plainFile).open(QIODevice::WriteOnly);
    CommandChannel onFile(recorder.handler());
    EXPECT_FALSE(onFile.listen(plainFile, &error));
    EXPECT_TRUE(error.contains(plainFile)) << error.toStdString();

    const QString deep = temporary.filePath(QString(120, QLatin1Char('d')));
    CommandChannel tooLong(recorder.handler());
    EXPECT_FALSE(tooLong.listen(deep, &error));
    EXPECT_TRUE(error.contains(deep)) << error.toStdString();
}

TEST(CommandChannelTest, RefusesMalformedLinesWithoutCallingTheHandler)
{
    QTemporaryDir temporary;
    Recorder recorder;
    CommandChannel channel(recorder.handler());
    ASSERT_TRUE(channel.listen(temporary.path()));

    Client client(channel.socketPath());
    static const char lines[] = "no tab here\n"
                                "\n"
                                "\r\n"
                                "COM1\t[ok\0]\n"
                                "COM1\t[ok \xff\xfe]\n"
                                "\xc3\t[ok]\n"
                                "COM1\t[ok]\n";
    client.send(QByteArray(lines, sizeof lines - 1));
    ASSERT_TRUE(client.waitReplies(7));
    EXPECT_EQ(client.replies,
              QList<QByteArray>({ "refused", "refused", "refused", "refused", "refused", "refused", "accepted" }));
    EXPECT_EQ(recorder.calls, QList<Call>({ { "COM1", "[ok]" } }));
}

// While a request waits for the handler, its connection is read no further:
// what the client pipelines stays with the kernel and the client.
TEST(CommandChannelTest, KeepsMemoryBoundedWhileTheHandlerIsBusy)
{
    QTemporaryDir temporary;
    Recorder recorder;
    CommandChannel channel(recorder.handler());
    ASSERT_TRUE(channel.listen(temporary.path()));

    Client client(channel.socketPath());
    ASSERT_TRUE(client.connected());
    ASSERT_TRUE(waitUntil([&] { return openSockets(channel) == 1; }));
    CommandConnection *serverSide = channel.findChildren<CommandConnection *>().first();
    qint64 handedToKernel = 0;
    QObject::connect(&client.socket, &QLocalSocket::bytesWritten, [&](qint64 bytes) { handedToKernel += bytes; });

    const QByteArray line = "T\t[ok" + QByteArray(994, 'x') + "]\n";
    const int lines = 1000;
    qint64 mostBuffered = 0;
    qint64 heldByClient = -1;
    recorder.decide = [&](const QString &, const QString &command) {
        if (command == QLatin1String("[block]")) {
            client.send(line.repeated(lines));
            EXPECT_TRUE(waitUntil([&] {
                mostBuffered = std::max(mostBuffered, serverSide->bytesAvailable());
                return handedToKernel >= 64 * 1024 && serverSide->bytesAvailable() >= kCommandLineMaxLength;
            }));
            heldByClient = client.socket.bytesToWrite();
            return true;
        }
        return command.startsWith(QLatin1String("[ok"));
    };
    client.send("T\t[block]\n");
    ASSERT_TRUE(client.waitReplies(1 + lines));
    EXPECT_GT(heldByClient, 0);
    EXPECT_LE(mostBuffered, kCommandLineMaxLength + 2);
    EXPECT_EQ(recorder.calls.size(), 1 + lines);
    EXPECT_EQ(client.replies.count("accepted"), 1 + lines);
}

TEST(CommandChannelTest, QueuesRequestsWhileTheHandlerRunsANestedEventLoop)
{
    QTemporaryDir temporary;
    Recorder recorder;
    CommandChannel channel(recorder.handler());
    ASSERT_TRUE(channel.listen(temporary.path()));

    Client first(channel.socketPath()), second(channel.socketPath());
    int depth = 0, deepest = 0;
    recorder.decide = [&](const QString &, const QString &command) {
        deepest = std::max(deepest, ++depth);
        if (command == QLatin1String("[modal]")) {
            // Stands in for a modal dialog: the event loop runs meanwhile.
            second.send("S\t[ok]\n");
            first.send("F\t[ok]\n");
            EXPECT_TRUE(waitUntil([&] { return channel.queuedRequestCount() == 1; }));
            EXPECT_TRUE(second.replies.isEmpty());
        }
        --depth;
        return true;
    };
    first.send("F\t[modal]\n");
    ASSERT_TRUE(first.waitReplies(2));
    ASSERT_TRUE(second.waitReplies(1));
    EXPECT_EQ(deepest, 1);
    EXPECT_EQ(recorder.calls, QList<Call>({ { "F", "[modal]" }, { "S", "[ok]" }, { "F", "[ok]" } }));
}

TEST(CommandChannelTest, ReleasesConnectionsThatGoAway)
{
    QTemporaryDir temporary;
    Recorder recorder;
    CommandChannel channel(recorder.handler());
    ASSERT_TRUE(channel.listen(temporary.path()));
    const int before = openSockets(channel);

    // Gone in the middle of a line: nothing to carry out.
    std::vector<std::unique_ptr<Client>> clients;
    for (int i = 0; i < 10; ++i) {
        clients.push_back(std::make_unique<Client>(channel.socketPath()));
        clients.back()->send("T\t[ok unfinished");
    }
    ASSERT_TRUE(waitUntil([&] { return channel.connectionCount() == 10; }));
    for (auto &client : clients)
        ASSERT_TRUE(waitUntil([&] { return client->socket.bytesToWrite() == 0; }));
    clients.clear();
    EXPECT_TRUE(waitUntil([&] { return openSockets(channel) == before && channel.connectionCount() == 0; }));
    EXPECT_TRUE(recorder.calls.isEmpty());

    // Sent and gone without waiting for the reply: the complete lines count.
    for (int i = 0; i < 10; ++i) {
        Client client(channel.socketPath());
        client.send("Q" + QByteArray::number(i) + "\t[ok]\nQ\t[ok second]\nQ\t[ok cut");
        ASSERT_TRUE(client.connected());
        ASSERT_TRUE(waitUntil([&] { return client.socket.bytesToWrite() == 0; }));
    }
    EXPECT_TRUE(waitUntil([&] { return recorder.calls.size() == 20; }));
    EXPECT_TRUE(waitUntil([&] { return openSockets(channel) == before && channel.connectionCount() == 0; }));

    // Gone while its request is in the handler.
    auto leaving = std::make_unique<Client>(channel.socketPath());
    recorder.decide = [&](const QString &, const QString &command) {
        if (command == QLatin1String("[leave]")) {
            const QPointer<CommandConnection> serverSide = channel.findChildren<CommandConnection *>().first();
            leaving.reset();
            EXPECT_TRUE(waitUntil([&] { return !serverSide || serverSide->inputEnded(); }));
        }
        return true;
    };
    leaving->send("T\t[leave]\nT\t[after]\n");
    EXPECT_TRUE(waitUntil([&] { return recorder.calls.size() == 22; }));
    EXPECT_TRUE(waitUntil([&] { return openSockets(channel) == before && channel.connectionCount() == 0; }));
}

// As `printf 'T\t[ok1]\n' | socat - UNIX-CONNECT:…` does: send, shut down the
// sending side, read the replies.
TEST(CommandChannelTest, AnswersEveryLineOfAClientThatShutsDownItsSendingSide)
{
    QTemporaryDir temporary;
    Recorder recorder;
    CommandChannel channel(recorder.handler());
    ASSERT_TRUE(channel.listen(temporary.path()));

    const int client = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_un address = localAddress(channel.socketPath());
    ASSERT_EQ(::connect(client, reinterpret_cast<const sockaddr *>(&address), sizeof address), 0);
    const QByteArray requests = "T\t[ok1]\nT\t[no]\nT\t[ok cut";
    ASSERT_EQ(::write(client, requests.constData(), size_t(requests.size())), requests.size());
    ASSERT_EQ(::shutdown(client, SHUT_WR), 0);
    ::fcntl(client, F_SETFL, O_NONBLOCK);
    EXPECT_EQ(readFromFd(client, 17), "accepted\nrefused\n");
    char byte = 0;
    EXPECT_TRUE(waitUntil([&] { return ::read(client, &byte, 1) == 0; })) << "not closed after the replies";
    ::close(client);
    EXPECT_EQ(recorder.calls, QList<Call>({ { "T", "[ok1]" }, { "T", "[no]" } }));
    EXPECT_TRUE(waitUntil([&] { return channel.connectionCount() == 0; }));
}
