#include "FdIo.h"

#include <QCoreApplication>
#include <QDeadlineTimer>

#include <cerrno>
#include <poll.h>
#include <unistd.h>

bool writeToFd(int fd, const QByteArray &bytes, int timeoutMs)
{
    qsizetype done = 0;
    QDeadlineTimer deadline(timeoutMs);
    while (done < bytes.size() && !deadline.hasExpired()) {
        const ssize_t n = ::write(fd, bytes.constData() + done, size_t(bytes.size() - done));
        if (n > 0) {
            done += n;
            continue;
        }
        if (n < 0 && errno != EAGAIN && errno != EINTR)
            return false;
        QCoreApplication::processEvents(QEventLoop::AllEvents, 10);
        pollfd p { fd, POLLOUT, 0 };
        ::poll(&p, 1, 5);
    }
    return done == bytes.size();
}

QByteArray readFromFd(int fd, int count, int timeoutMs)
{
    QByteArray result;
    QDeadlineTimer deadline(timeoutMs);
    char chunk[65536];
    while (result.size() < count && !deadline.hasExpired()) {
        const ssize_t n = ::read(fd, chunk, sizeof chunk);
        if (n > 0) {
            result.append(chunk, n);
            continue;
        }
        QCoreApplication::processEvents(QEventLoop::AllEvents, 10);
        pollfd p { fd, POLLIN, 0 };
        ::poll(&p, 1, 5);
    }
    return result;
}

