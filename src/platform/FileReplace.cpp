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
    struct stat existing {};
    const bool exists = ::stat(QFile::encodeName(resolved).constData(), &existing) == 0;
    // Renaming over a device or a FIFO would take its place in the folder.
    if (exists && !S_ISREG(existing.st_mode)) {
        setError(error, QStringLiteral("Cannot write %1: not a regular file").arg(resolved));
        return false;
    }
    // Someone made the file read-only on purpose; root could replace it
    // anyway, so the mode is checked rather than left to the kernel.
    if (exists && (existing.st_mode & 0222) == 0) {
        setError(error, QStringLiteral("Cannot write %1: the file is read-only").arg(resolved));
        return false;
    }
    // Hidden, so a folder listing during the write does not show it.
    QByteArray temporary = QFile::encodeName(
        target.absolutePath() + QStringLiteral("/.") + target.fileName() + QStringLiteral(".XXXXXX"));
    const int fd = ::mkstemp(temporary.data());
    if (fd < 0) {
        setError(error, QStringLiteral("Cannot write %1: cannot create a temporary file in %2: %3")
                            .arg(resolved, target.absolutePath(), systemError(errno)));
        return false;
    }
    // An existing file keeps its owner, group and mode, so that a run as
    // root does not take a user's file away from them. Only root may give a
    // file away; anyone may try their own groups.
    if (exists && ::fchown(fd, existing.st_uid, existing.st_gid) != 0
        && ::fchown(fd, uid_t(-1), existing.st_gid) != 0) {
        // Not ours to give away: the file becomes this user's, like a new one.
    }
    const mode_t newMode = exists ? mode_t(existing.st_mode & 07777) : mode;
    // The mode is set explicitly in case the umask or an ACL widened it.
    const bool written = ::fchmod(fd, newMode) == 0 && writeAll(fd, data) && ::fsync(fd) == 0;
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
