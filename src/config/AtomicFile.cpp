#include "AtomicFile.h"

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

bool fail(QString *error, const QString &text)
{
    if (error)
        *error = text;
    return false;
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
// file systems refuse) does not make the save fail, the data is already
// safe in the renamed file.
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

bool writeFileAtomically(const QString &path, const QByteArray &data, QString *error)
{
    if (path.isEmpty())
        return fail(error, QStringLiteral("Cannot save: no file name given"));

    const QString target = resolvedTarget(path);
    const QFileInfo targetInfo(target);
    const QString folder = targetInfo.absolutePath();
    // Hidden, so a folder listing during the save does not show it as a
    // configuration file.
    QByteArray pattern = QFile::encodeName(folder + QStringLiteral("/.") + targetInfo.fileName()
        + QStringLiteral(".XXXXXX"));

    // mkstemp creates the file with mode 0600.
    const int fd = ::mkstemp(pattern.data());
    if (fd < 0) {
        return fail(error,
            QStringLiteral("Cannot save %1: cannot create a temporary file in %2: %3")
                .arg(target, folder, systemError(errno)));
    }
    const QString temporary = QFile::decodeName(pattern);

    auto abandon = [&](const QString &what, int cause) {
        ::close(fd);
        ::unlink(pattern.constData());
        return fail(error, QStringLiteral("Cannot save %1: %2 %3: %4")
                               .arg(target, what, temporary, systemError(cause)));
    };

    if (!writeAll(fd, data))
        return abandon(QStringLiteral("cannot write"), errno);
    // The mode is set explicitly in case the umask or an ACL widened it.
    if (::fchmod(fd, S_IRUSR | S_IWUSR) != 0)
        return abandon(QStringLiteral("cannot set the mode of"), errno);
    if (::fsync(fd) != 0)
        return abandon(QStringLiteral("cannot flush"), errno);
    if (::close(fd) != 0) {
        const int cause = errno;
        ::unlink(pattern.constData());
        return fail(error, QStringLiteral("Cannot save %1: cannot close %2: %3")
                               .arg(target, temporary, systemError(cause)));
    }

    if (::rename(pattern.constData(), QFile::encodeName(target).constData()) != 0) {
        const int cause = errno;
        ::unlink(pattern.constData());
        return fail(error, QStringLiteral("Cannot replace %1: %2").arg(target, systemError(cause)));
    }
    syncFolder(folder);
    return true;
}
