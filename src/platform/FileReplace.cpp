#include "FileReplace.h"

#include <QFile>
#include <QFileInfo>

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

QString systemError(int error)
{
    return QString::fromLocal8Bit(std::strerror(error));
}

void setError(QString *error, const QString &text)
{
    if (error)
        *error = text;
}

// mkdir -p that keeps the errno of the component that failed.
int makeFolders(const QByteArray &path)
{
    if (::mkdir(path.constData(), 0755) == 0)
        return 0;
    if (errno == EEXIST) {
        struct stat info {};
        if (::stat(path.constData(), &info) != 0)
            return errno;
        return S_ISDIR(info.st_mode) ? 0 : ENOTDIR;
    }
    if (errno != ENOENT)
        return errno;
    const qsizetype slash = path.lastIndexOf('/');
    if (slash <= 0)
        return ENOENT;
    if (const int parentError = makeFolders(path.left(slash)))
        return parentError;
    if (::mkdir(path.constData(), 0755) == 0 || errno == EEXIST)
        return 0;
    return errno;
}

bool writeAll(int fd, const QByteArray &data)
{
    const char *next = data.constData();
    qsizetype left = data.size();
    while (left > 0) {
        const ssize_t written = ::write(fd, next, size_t(left));
        if (written < 0) {
            if (errno == EINTR)
                continue;
            return false;
        }
        next += written;
        left -= written;
    }
    return true;
}

// Makes the rename itself durable; a folder that cannot be synced (some
// file systems refuse) does not make the write fail.
void syncFolder(const QString &folder)
{
    const int fd = ::open(QFile::encodeName(folder).constData(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0)
        return;
    ::fsync(fd);
    ::close(fd);
}

QString resolvedTarget(const QString &path)
{
    const QFileInfo info(path);
    if (!info.isSymLink())
        return path;
    // A dangling link still names the file to create.
    const QString target = info.canonicalFilePath();
    return target.isEmpty() ? info.symLinkTarget() : target;
}

} // namespace

bool makeFolderPath(const QString &folder, QString *error)
{
    if (folder.isEmpty()) {
        setError(error, QStringLiteral("No folder is given"));
        return false;
    }
    QByteArray path = QFile::encodeName(folder);
    while (path.size() > 1 && path.endsWith('/'))
        path.chop(1);
    if (const int failure = makeFolders(path)) {
        setError(error, QStringLiteral("Cannot create the folder %1: %2").arg(folder, systemError(failure)));
        return false;
    }
    return true;
}

bool replaceFileAtomically(const QString &path, const QByteArray &data, QString *error, mode_t mode)
{
    if (path.isEmpty()) {
        setError(error, QStringLiteral("Cannot write: no file name given"));
        return false;
    }
    // A link stays a link: the file it names is the one replaced.
    const QString resolved = resolvedTarget(path);
    const QFileInfo target(resolved);
    // Hidden, so a folder listing during the write does not show it.
    QByteArray temporary = QFile::encodeName(
        target.absolutePath() + QStringLiteral("/.") + target.fileName() + QStringLiteral(".XXXXXX"));
    const int fd = ::mkstemp(temporary.data());
    if (fd < 0) {
        setError(error, QStringLiteral("Cannot write %1: cannot create a temporary file in %2: %3")
                            .arg(resolved, target.absolutePath(), systemError(errno)));
        return false;
    }
    // The mode is set explicitly in case the umask or an ACL widened it.
    const bool written = ::fchmod(fd, mode) == 0 && writeAll(fd, data) && ::fsync(fd) == 0;
    const int writeError = errno;
    const bool closed = ::close(fd) == 0;
    const int closeError = errno;
    if (!written || !closed) {
        ::unlink(temporary.constData());
        setError(error, QStringLiteral("Cannot write %1: %2")
                            .arg(resolved, systemError(written ? closeError : writeError)));
        return false;
    }
    if (::rename(temporary.constData(), QFile::encodeName(resolved).constData()) != 0) {
        const int renameError = errno;
        ::unlink(temporary.constData());
        setError(error, QStringLiteral("Cannot write %1: %2").arg(resolved, systemError(renameError)));
        return false;
    }
    syncFolder(target.absolutePath());
    return true;
}

bool removeFileIfPresent(const QString &path, QString *error)
{
    // ENOTDIR: a part of the path is a file, so there is nothing to remove.
    if (::unlink(QFile::encodeName(path).constData()) == 0 || errno == ENOENT || errno == ENOTDIR)
        return true;
    setError(error, QStringLiteral("Cannot remove %1: %2").arg(path, systemError(errno)));
    return false;
}
