#include "CommandChannel.h"

#include <QFile>
#include <QLocalServer>
#include <QLocalSocket>
#include <QPointer>
#include <QStringDecoder>

#include <cerrno>
#include <cstring>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace {

// Room for the longest line, its CR and its LF.
constexpr qsizetype kLineBufferSize = kCommandLineMaxLength + 2;
// A client that sends requests but never reads the replies is read no
// further once this much is waiting to go out to it.
constexpr qint64 kMaxUnsentReplyBytes = 64 * 1024;

QString systemError(int error)
{
    return QString::fromLocal8Bit(std::strerror(error));
}

enum class PathUse { Free, LiveSocket, StaleSocket, Other };

// Whether a program listens on the socket at path. The connect is
// non-blocking: a local connect either succeeds at once, is refused at once
// (nobody listens) or finds the backlog full, which means somebody does.
PathUse probeSocketPath(const QByteArray &path)
{
    struct stat info {};
    if (::lstat(path.constData(), &info) != 0)
        return errno == ENOENT ? PathUse::Free : PathUse::Other;
    if (!S_ISSOCK(info.st_mode))
        return PathUse::Other;
    const int probe = ::socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (probe < 0)
        return PathUse::Other;
    sockaddr_un address {};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.constData(), size_t(path.size()));
    PathUse use = PathUse::LiveSocket;
    if (::connect(probe, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0) {
        if (errno == ECONNREFUSED)
            use = PathUse::StaleSocket;
        else if (errno == ENOENT)
            use = PathUse::Free;
        else if (errno != EAGAIN && errno != EINPROGRESS)
            use = PathUse::Other;
    }
    ::close(probe);
    return use;
}

bool decodeRequest(const QByteArray &line, QString *topic, QString *command)
{
    if (line.contains('\0'))
        return false;
    QStringDecoder decoder(QStringDecoder::Utf8);
    const QString text = decoder.decode(line);
    if (decoder.hasError())
        return false;
    const qsizetype tab = text.indexOf(QLatin1Char('\t'));
    if (tab < 0)
        return false;
    *topic = text.left(tab);
    *command = text.mid(tab + 1);
    return true;
}

} // namespace

QString commandChannelPath(const QString &folder)
{
    return folder + QStringLiteral("/control");
}

CommandChannel::CommandChannel(Handler handler, QObject *parent)
    : QObject(parent)
    , m_handler(std::move(handler))
    , m_server(new QLocalServer(this))
{
    // Clients of a burst (a script starting several at once) must not be
    // turned away before the event loop gets to accept them.
    m_server->setMaxPendingConnections(128);
    connect(m_server, &QLocalServer::newConnection, this, &CommandChannel::acceptConnections);
}

CommandChannel::~CommandChannel()
{
    for (QLocalSocket *socket : m_clients.keys())
        socket->disconnect(this);
    m_server->close();
    delete m_server;
}

bool CommandChannel::isListening() const
{
    return m_server->isListening();
}

bool CommandChannel::fail(QString *error, const QString &reason)
{
    if (error)
        *error = reason;
    return false;
}

bool CommandChannel::listen(const QString &folder, QString *error)
{
    if (isListening())
        return fail(error, QStringLiteral("The command channel already listens on %1").arg(m_socketPath));
    QString folderError;
    if (!makeVirtualPortFolder(folder, &folderError))
        return fail(error, folderError);
    struct stat info {};
    if (::stat(QFile::encodeName(folder).constData(), &info) != 0)
        return fail(error, QStringLiteral("Cannot use the folder %1: %2").arg(folder, systemError(errno)));
    // Whoever can write to the folder could put their own socket in place
    // of ours and collect the commands.
    if ((info.st_mode & 077) != 0)
        return fail(error, QStringLiteral("The folder %1 is open to other users (mode %2); "
                                          "the command channel needs it private (700)")
                               .arg(folder)
                               .arg(info.st_mode & 0777, 3, 8, QLatin1Char('0')));

    const QString first = commandChannelPath(folder);
    const QStringList candidates { first, QStringLiteral("%1.%2").arg(first).arg(::getpid()) };
    for (const QString &path : candidates) {
        const QByteArray encoded = QFile::encodeName(path);
        switch (probeSocketPath(encoded)) {
        case PathUse::Free:
            return listenAt(path, error);
        case PathUse::StaleSocket:
            if (::unlink(encoded.constData()) != 0 && errno != ENOENT)
                return fail(error, QStringLiteral("Cannot remove the left-over socket %1: %2")
                                       .arg(path, systemError(errno)));
            return listenAt(path, error);
        case PathUse::LiveSocket:
        case PathUse::Other:
            break;
        }
    }
    return fail(error, QStringLiteral("Cannot open the command channel: %1 and %2 are taken")
                           .arg(candidates.first(), candidates.last()));
}

bool CommandChannel::listenAt(const QString &path, QString *error)
{
    const QByteArray encoded = QFile::encodeName(path);
    if (size_t(encoded.size()) >= sizeof(sockaddr_un::sun_path))
        return fail(error, QStringLiteral("The command channel path %1 is too long for a local socket").arg(path));
    m_server->setSocketOptions(QLocalServer::UserAccessOption);
    if (!m_server->listen(path))
        return fail(error, QStringLiteral("Cannot listen on %1: %2").arg(path, m_server->errorString()));
    // Connecting needs only write permission; the option above leaves the
    // socket executable as well.
    struct stat info {};
    const bool private_ = ::chmod(encoded.constData(), 0600) == 0
        && ::lstat(encoded.constData(), &info) == 0 && S_ISSOCK(info.st_mode)
        && (info.st_mode & 0777) == 0600 && info.st_uid == ::geteuid();
    if (!private_) {
        const int reason = errno;
        m_server->close();
        return fail(error, QStringLiteral("Cannot make the command channel %1 private: %2")
                               .arg(path, systemError(reason)));
    }
    m_socketPath = path;
    return true;
}

void CommandChannel::acceptConnections()
{
    while (QLocalSocket *socket = m_server->nextPendingConnection()) {
        // Bounds what Qt buffers for this client; the kernel holds the rest
        // and the client's writes wait.
        socket->setReadBufferSize(kLineBufferSize);
        m_clients.insert(socket, Client {});
        connect(socket, &QLocalSocket::readyRead, this, [this, socket] { serviceClient(socket); });
        connect(socket, &QLocalSocket::bytesWritten, this, [this, socket] { serviceClient(socket); });
        connect(socket, &QLocalSocket::disconnected, this, [this, socket] { handleDisconnected(socket); });
        serviceClient(socket);
    }
}

// Takes the client's next line, if complete, and queues it. A socket may be
// released in here: callers touch it no more afterwards.
void CommandChannel::serviceClient(QLocalSocket *socket)
{
    for (;;) {
        auto client = m_clients.find(socket);
        if (client == m_clients.end() || client->awaitingReply || client->closing)
            return;
        if (!client->peerGone && socket->bytesToWrite() > kMaxUnsentReplyBytes)
            return;
        qsizetype end = client->unparsed.indexOf('\n');
        if (end < 0 && client->unparsed.size() < kLineBufferSize) {
            client->unparsed += socket->read(kLineBufferSize - client->unparsed.size());
            end = client->unparsed.indexOf('\n');
        }
        if (end < 0) {
            if (client->unparsed.size() >= kLineBufferSize)
                refuseAndClose(socket);
            else if (client->peerGone)
                release(socket); // an unfinished line nobody is left to answer
            return;
        }
        QByteArray line = client->unparsed.left(end);
        client->unparsed.remove(0, end + 1);
        if (line.endsWith('\r'))
            line.chop(1);
        if (line.size() > kCommandLineMaxLength) {
            refuseAndClose(socket);
            return;
        }
        Request request { socket, {}, {} };
        if (!decodeRequest(line, &request.topic, &request.command)) {
            reply(socket, false);
            continue;
        }
        client->awaitingReply = true;
        m_queue.append(request);
        processQueue();
        return;
    }
}

void CommandChannel::handleDisconnected(QLocalSocket *socket)
{
    auto client = m_clients.find(socket);
    if (client == m_clients.end())
        return;
    client->peerGone = true;
    if (client->closing) {
        release(socket);
        return;
    }
    // Complete lines sent before the client hung up are still carried out
    // (a client may send and close without waiting for the reply).
    serviceClient(socket);
}

void CommandChannel::processQueue()
{
    if (m_handling)
        return;
    m_handling = true;
    const QPointer<CommandChannel> alive(this);
    while (!m_queue.isEmpty()) {
        const Request request = m_queue.takeFirst();
        const bool accepted = m_handler && m_handler(request.topic, request.command);
        if (!alive)
            return;
        auto client = m_clients.find(request.socket);
        if (client == m_clients.end())
            continue;
        client->awaitingReply = false;
        reply(request.socket, accepted);
        serviceClient(request.socket);
    }
    m_handling = false;
}

void CommandChannel::reply(QLocalSocket *socket, bool accepted)
{
    const auto client = m_clients.constFind(socket);
    if (client == m_clients.cend() || client->peerGone)
        return;
    socket->write(QByteArray(accepted ? kCommandAccepted : kCommandRefused) + '\n');
}

void CommandChannel::refuseAndClose(QLocalSocket *socket)
{
    reply(socket, false);
    auto client = m_clients.find(socket);
    client->closing = true;
    client->unparsed.clear();
    if (client->peerGone) {
        release(socket);
        return;
    }
    // The refusal is sent first; disconnected() then releases the socket
    // (possibly from inside this call).
    socket->disconnectFromServer();
}

void CommandChannel::release(QLocalSocket *socket)
{
    m_clients.remove(socket);
    socket->disconnect(this);
    socket->deleteLater();
}
