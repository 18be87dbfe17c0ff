#include "FileLock.h"

#include <QFile>

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

FileLock::~FileLock()
{
    ::close(m_fd);
}

std::unique_ptr<FileLock> FileLock::tryLock(const QString &path, bool *busy, QString *error)
{
    *busy = false;
    const int fd = ::open(QFile::encodeName(path).constData(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
    if (fd < 0) {
        *error = QStringLiteral("Cannot open %1: %2").arg(path, QString::fromLocal8Bit(std::strerror(errno)));
        return nullptr;
    }
    if (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
        const int lockError = errno;
        ::close(fd);
        *busy = lockError == EWOULDBLOCK;
        if (!*busy)
            *error = QStringLiteral("Cannot lock %1: %2").arg(path, QString::fromLocal8Bit(std::strerror(lockError)));
        return nullptr;
    }
    return std::unique_ptr<FileLock>(new FileLock(fd));
}
