#include "VirtualPortFolder.h"

#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QRegularExpression>

#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

QString systemError(int error)
{
    return QString::fromLocal8Bit(std::strerror(error));
}

QString linkTarget(const QByteArray &path)
{
    char buffer[4096];
    const ssize_t length = ::readlink(path.constData(), buffer, sizeof buffer);
    if (length < 0 || size_t(length) >= sizeof buffer)
        return {};
    return QFile::decodeName(QByteArray(buffer, length));
}

bool isLink(const QByteArray &path)
{
    struct stat info {};
    return ::lstat(path.constData(), &info) == 0 && S_ISLNK(info.st_mode);
}

// A link whose target is gone. A link that cannot be resolved for another
// reason (a loop, no permission) is not called stale: it may still matter
// to someone.
bool isStaleLink(const QByteArray &path)
{
    if (!isLink(path))
        return false;
    struct stat target {};
    if (::stat(path.constData(), &target) == 0)
        return false;
    return errno == ENOENT || errno == ENOTDIR;
}

bool isUsablePortName(const QString &name)
{
    return !name.isEmpty() && name != QLatin1String(".") && name != QLatin1String("..")
        && !name.contains(QLatin1Char('/')) && !name.contains(QChar(0));
}

// Puts a new link in place of a stale one in one step: applications never
// find the name missing, and rename() replaces the link itself, never what
// it points to.
bool replaceLink(const QString &folder, const QString &name, const QByteArray &linkPath,
                 const QByteArray &target, QString *error)
{
    for (int attempt = 0; attempt < 100; ++attempt) {
        const QByteArray temporary = QFile::encodeName(
            QStringLiteral("%1/.%2.%3-%4.tmp").arg(folder, name).arg(::getpid()).arg(attempt));
        if (::symlink(target.constData(), temporary.constData()) != 0) {
            if (errno == EEXIST)
                continue;
            *error = QStringLiteral("Cannot create a link in %1: %2").arg(folder, systemError(errno));
            return false;
        }
        if (::rename(temporary.constData(), linkPath.constData()) != 0) {
            const int renameError = errno;
            ::unlink(temporary.constData());
            *error = QStringLiteral("Cannot replace %1: %2")
                         .arg(QFile::decodeName(linkPath), systemError(renameError));
            return false;
        }
        return true;
    }
    *error = QStringLiteral("Cannot create a link in %1: too many leftover temporary links").arg(folder);
    return false;
}

} // namespace

QString defaultVirtualPortFolder()
{
    const QString runtime = qEnvironmentVariable("XDG_RUNTIME_DIR");
    if (!runtime.isEmpty())
        return runtime + QStringLiteral("/velloca");
    return QStringLiteral("/tmp/velloca-%1").arg(::getuid());
}

int ResetBus(const QString &folder)
{
    const QByteArray folderPath = QFile::encodeName(folder);
    // Only in our own private folder: elsewhere the links are not ours.
    struct stat info {};
    if (::lstat(folderPath.constData(), &info) != 0 || !S_ISDIR(info.st_mode) || info.st_uid != ::geteuid()
        || (info.st_mode & 07777) != 0700)
        return 0;
    static const QRegularExpression portName(QStringLiteral("^COM[1-9][0-9]{0,2}$"));
    DIR *directory = ::opendir(folderPath.constData());
    if (!directory)
        return 0;
    int removed = 0;
    while (const dirent *entry = ::readdir(directory)) {
        const QByteArray entryName(entry->d_name);
        if (entryName == "." || entryName == "..")
            continue;
        const QByteArray path = folderPath + '/' + entryName;
        // A link of ours is named for its port and names a pseudo-terminal.
        const bool ours = portName.match(QFile::decodeName(entryName)).hasMatch()
            && linkTarget(path).startsWith(QLatin1String("/dev/pts/"));
        if (ours && isStaleLink(path) && ::unlink(path.constData()) == 0)
            ++removed;
    }
    ::closedir(directory);
    return removed;
}

bool makeVirtualPortFolder(const QString &folder, QString *error)
{
    if (folder.isEmpty()) {
        *error = QStringLiteral("No virtual port folder is set");
        return false;
    }
    const QByteArray path = QFile::encodeName(folder);
    if (::mkdir(path.constData(), 0700) != 0 && errno != EEXIST) {
        // Parents get the usual permissions; only the folder itself is private.
        if (errno == ENOENT)
            QDir().mkpath(QFileInfo(folder).absolutePath());
        if (::mkdir(path.constData(), 0700) != 0 && errno != EEXIST) {
            *error = QStringLiteral("Cannot create the virtual port folder %1: %2")
                         .arg(folder, systemError(errno));
            return false;
        }
    }
    struct stat info {};
    if (::stat(path.constData(), &info) != 0) {
        *error = QStringLiteral("Cannot use the virtual port folder %1: %2").arg(folder, systemError(errno));
        return false;
    }
    if (!S_ISDIR(info.st_mode)) {
        *error = QStringLiteral("The virtual port folder %1 is not a folder").arg(folder);
        return false;
    }
    // Someone else's folder (a planted /tmp/velloca-<uid>) could redirect
    // the links applications open.
    if (info.st_uid != ::geteuid()) {
        *error = QStringLiteral("The virtual port folder %1 belongs to another user").arg(folder);
        return false;
    }
    return true;
}

bool placeVirtualPortLink(const QString &folder, const QString &name, const QString &target,
                          QString *error)
{
    if (!isUsablePortName(name)) {
        *error = QStringLiteral("\"%1\" cannot name a virtual port").arg(name);
        return false;
    }
    const QString linkName = folder + QLatin1Char('/') + name;
    const QByteArray linkPath = QFile::encodeName(linkName);
    const QByteArray targetPath = QFile::encodeName(target);

    struct stat existing {};
    if (::lstat(linkPath.constData(), &existing) != 0) {
        if (errno != ENOENT) {
            *error = QStringLiteral("Cannot use %1: %2").arg(linkName, systemError(errno));
            return false;
        }
        // symlink() itself refuses if the name appeared meanwhile.
        if (::symlink(targetPath.constData(), linkPath.constData()) != 0) {
            *error = QStringLiteral("Cannot create %1: %2").arg(linkName, systemError(errno));
            return false;
        }
        return true;
    }
    const bool replaceable = S_ISLNK(existing.st_mode)
        && (isStaleLink(linkPath) || linkTarget(linkPath) == target);
    if (!replaceable) {
        *error = QStringLiteral("%1 already exists and is not a stale virtual port link").arg(linkName);
        return false;
    }
    return replaceLink(folder, name, linkPath, targetPath, error);
}

bool removeVirtualPortLink(const QString &linkPath, const QString &target)
{
    const QByteArray path = QFile::encodeName(linkPath);
    if (!isLink(path) || linkTarget(path) != target)
        return false;
    return ::unlink(path.constData()) == 0;
}
