#include "RawStreams.h"

#include <QCryptographicHash>
#include <QDeadlineTimer>

#include <arpa/inet.h>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

namespace e2e {

int connectTcp(quint16 port, int receiveBufferSize)
{
    // Writing on after the program closed its end must fail, not kill the test.
    ::signal(SIGPIPE, SIG_IGN);
    const int fd = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0)
        return -1;
    if (receiveBufferSize > 0)
        ::setsockopt(fd, SOL_SOCKET, SO_RCVBUF, &receiveBufferSize, sizeof receiveBufferSize);
    sockaddr_in address {};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    // A loopback connect completes or is refused at once.
    if (::connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0) {
        ::close(fd);
        return -1;
    }
    ::fcntl(fd, F_SETFL, ::fcntl(fd, F_GETFL) | O_NONBLOCK);
    return fd;
}

void resetConnection(int fd)
{
    const linger abortive { 1, 0 };
    ::setsockopt(fd, SOL_SOCKET, SO_LINGER, &abortive, sizeof abortive);
    ::close(fd);
}

namespace {

// One step of writing: true unless the descriptor failed for good.
bool writeSome(int fd, const QByteArray &bytes, qsizetype &done)
{
    if (done >= bytes.size())
        return true;
    const ssize_t n = ::write(fd, bytes.constData() + done, size_t(bytes.size() - done));
    if (n > 0)
        done += n;
    return n >= 0 || errno == EAGAIN || errno == EINTR;
}

void readSome(int fd, QByteArray &into)
{
    char chunk[65536];
    for (;;) {
        const ssize_t n = ::read(fd, chunk, sizeof chunk);
        if (n <= 0)
            return;
        into.append(chunk, n);
    }
}

} // namespace

Exchange exchange(int first, const QByteArray &toFirst, qsizetype expectAtFirst,
                  int second, const QByteArray &toSecond, qsizetype expectAtSecond, int timeoutMs)
{
    Exchange result;
    qsizetype firstDone = 0;
    qsizetype secondDone = 0;
    QDeadlineTimer deadline(timeoutMs);
    while (!deadline.hasExpired()
           && (result.atFirst.size() < expectAtFirst || result.atSecond.size() < expectAtSecond
               || firstDone < toFirst.size() || secondDone < toSecond.size())) {
        if (!writeSome(first, toFirst, firstDone) || !writeSome(second, toSecond, secondDone))
            break;
        readSome(first, result.atFirst);
        readSome(second, result.atSecond);
        pollfd waits[2] = { { first, POLLIN, 0 }, { second, POLLIN, 0 } };
        if (firstDone < toFirst.size())
            waits[0].events |= POLLOUT;
        if (secondDone < toSecond.size())
            waits[1].events |= POLLOUT;
        ::poll(waits, 2, 10);
    }
    return result;
}

void discardInput(int fd)
{
    QByteArray ignored;
    readSome(fd, ignored);
}

QByteArray sha256(const QByteArray &bytes)
{
    return QCryptographicHash::hash(bytes, QCryptographicHash::Sha256).toHex();
}

} // namespace e2e
