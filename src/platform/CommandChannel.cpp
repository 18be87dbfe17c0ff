#include "CommandChannel.h"

#include "CommandConnection.h"
#include "ConnectionAcceptor.h"

#include <QFile>
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
// Clients of a burst (a script starting several at once) must not be turned
// away before the event loop gets to accept them.
constexpr int kListenBacklog = 128;

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
    : QObject(parent), m_handler(std::move(handler))
{
}

CommandChannel::~CommandChannel()
{
    for (CommandConnection *socket : m_clients.keys())
        socket->disconnect(this);
    stopListening();
}

bool CommandChannel::isListening() const
{
    return m_listener >= 0;
}

void CommandChannel::stopListening()
{
    if (m_listener < 0)
        return;
    delete m_acceptor;
    m_acceptor = nullptr;
    ::close(m_listener);
    m_listener = -1;
    ::unlink(QFile::encodeName(m_socketPath).constData());
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
    const int listener = ::socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    sockaddr_un address {};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, encoded.constData(), size_t(encoded.size()));
    if (listener < 0 || ::bind(listener, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0
        || ::listen(listener, kListenBacklog) != 0) {
        const int reason = errno;
        if (listener >= 0)
            ::close(listener);
        return fail(error, QStringLiteral("Cannot listen on %1: %2").arg(path, systemError(reason)));
    }
    m_listener = listener;
    m_socketPath = path;
    // Connecting needs only write permission. The folder is private, so
    // nobody else could connect before this.
    struct stat info {};
    const bool private_ = ::chmod(encoded.constData(), 0600) == 0
        && ::lstat(encoded.constData(), &info) == 0 && S_ISSOCK(info.st_mode)
        && (info.st_mode & 0777) == 0600 && info.st_uid == ::geteuid();
    if (!private_) {
        const int reason = errno;
        stopListening();
        m_socketPath.clear();
        return fail(error, QStringLiteral("Cannot make the command channel %1 private: %2")
                               .arg(path, systemError(reason)));
    }
    m_acceptor = new ConnectionAcceptor(m_listener, this);
    connect(m_acceptor, &ConnectionAcceptor::accepted, this, &CommandChannel::acceptConnection);
    connect(m_acceptor, &ConnectionAcceptor::acceptFailed, this, [this](int reason) {
        qWarning("velloca: command channel %s: cannot accept connections: %s; waiting clients are turned away for now",
                 qPrintable(m_socketPath), qPrintable(systemError(reason)));
    });
    m_acceptor->setEnabled(true);
    return true;
}

void CommandChannel::acceptConnection(qintptr descriptor)
{
    auto *socket = new CommandConnection(int(descriptor), kLineBufferSize, this);
    m_clients.insert(socket, Client {});
    connect(socket, &CommandConnection::readyRead, this, [this, socket] { serviceClient(socket); });
    connect(socket, &CommandConnection::bytesWritten, this, [this, socket] { serviceClient(socket); });
    connect(socket, &CommandConnection::finished, this, [this, socket] { release(socket); });
}

// Takes the client's next line, if complete, and queues it. A socket may be
// released in here: callers touch it no more afterwards.
void CommandChannel::serviceClient(CommandConnection *socket)
{
    for (;;) {
        auto client = m_clients.find(socket);
        if (client == m_clients.end() || client->awaitingReply || client->closing)
            return;
        if (socket->bytesToWrite() > kMaxUnsentReplyBytes)
            return;
        qsizetype end = client->unparsed.indexOf('\n');
        if (end < 0 && client->unparsed.size() < kLineBufferSize) {
            client->unparsed += socket->read(kLineBufferSize - client->unparsed.size());
            end = client->unparsed.indexOf('\n');
        }
        if (end < 0) {
            if (client->unparsed.size() >= kLineBufferSize)
                refuseAndClose(socket);
            else if (socket->inputEnded())
                closeClient(socket); // an unfinished line is dropped
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

// Complete lines sent before the client hung up are still carried out (a
// client may send and close without waiting for the reply); the reply is
// then dropped.
void CommandChannel::reply(CommandConnection *socket, bool accepted)
{
    if (m_clients.contains(socket))
        socket->write(QByteArray(accepted ? kCommandAccepted : kCommandRefused) + '\n');
}

void CommandChannel::refuseAndClose(CommandConnection *socket)
{
    reply(socket, false);
    closeClient(socket);
}

// The replies are sent first; finished() then releases the socket (possibly
// from inside this call).
void CommandChannel::closeClient(CommandConnection *socket)
{
    auto client = m_clients.find(socket);
    client->closing = true;
    client->unparsed.clear();
    socket->closeAfterWriting();
}

void CommandChannel::release(CommandConnection *socket)
{
    m_clients.remove(socket);
    socket->disconnect(this);
    socket->deleteLater();
}
