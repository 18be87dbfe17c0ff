#include "ErrorLog.h"

#include "config/GlobalOptions.h"
#include "config/ProgramFolder.h"

#include <QFile>
#include <QLocale>
#include <QProcess>

#include <cerrno>
#include <fcntl.h>
#include <sys/statvfs.h>
#include <unistd.h>

namespace {

QString withoutLineBreaks(QString text)
{
    text.replace(QLatin1String("\r\n"), QLatin1String(" "));
    text.replace(QLatin1Char('\r'), QLatin1Char(' '));
    text.replace(QLatin1Char('\n'), QLatin1Char(' '));
    return text;
}

// A nearly full disk takes only part of a line, and every later line would
// then run on from the torn one: a line that may not fit is not started.
// Whole free blocks are counted, so this errs on the side of dropping.
bool hasRoomFor(int fd, qsizetype bytes)
{
    struct statvfs disk {};
    // Some file systems report no sizes at all; those are simply tried.
    if (::fstatvfs(fd, &disk) != 0 || disk.f_blocks == 0)
        return true;
    return qulonglong(disk.f_bavail) * disk.f_frsize >= qulonglong(bytes);
}

// Several sessions, and several copies of the program, append to the same
// file: one write() on an O_APPEND descriptor keeps their lines whole.
// O_NONBLOCK keeps a FIFO planted in place of the log from stalling the
// event loop; it changes nothing for a regular file.
void appendLine(const QString &path, const QByteArray &line)
{
    const QByteArray encodedPath = QFile::encodeName(path);
    const int fd = ::open(encodedPath.constData(),
                          O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC | O_NONBLOCK, 0666);
    if (fd < 0)
        return;
    if (hasRoomFor(fd, line.size())) {
        ssize_t written;
        do {
            written = ::write(fd, line.constData(), size_t(line.size()));
        } while (written < 0 && errno == EINTR);
    }
    ::close(fd);
}

void startErrorProgram(const QString &commandLine)
{
    const QStringList words = QProcess::splitCommand(commandLine);
    if (words.isEmpty())
        return;
    // No shell and no waiting; a program that is missing just does not run.
    QProcess::startDetached(words.first(), words.mid(1));
}

} // namespace

QString errorLogLine(const ErrorLogContext &context, const QString &message,
                     const QDateTime &now)
{
    // The C locale keeps the digits and separators the same on every system.
    const QLocale c = QLocale::c();
    const QDateTime local = now.toLocalTime();
    QString line = QStringLiteral("Velloca Error: ") + withoutLineBreaks(message)
        + QStringLiteral(", ") + c.toString(local.date(), QStringLiteral("MM-dd-yyyy"))
        + QStringLiteral(", ") + c.toString(local.time(), QStringLiteral("HH:mm:ss"))
        + QStringLiteral(", Velloca IP Address: ") + context.LocalIPAddress
        + QStringLiteral(", ");
    if (context.TCPOption == 0) {
        line += QStringLiteral("Client Mode, Remote Host: ") + context.RemoteHost
            + QStringLiteral(", RemotePort: ") + QString::number(context.RemotePort);
    } else {
        line += QStringLiteral("Server Mode, Local Port: ") + QString::number(context.LocalPort);
    }
    return line;
}

void writeErrorLogLine(const ErrorLogContext &context, const QString &message,
                       const GlobalOptions &options, const QDateTime &now)
{
    if (options.LogErrors != 0) {
        appendLine(programFolderFile(QStringLiteral("errorlog.txt")),
                   (errorLogLine(context, message, now) + QStringLiteral("\r\n")).toUtf8());
    }
    if (!options.OnErrorRunApp.isEmpty())
        startErrorProgram(options.OnErrorRunApp);
}
