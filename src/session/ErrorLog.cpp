#include "ErrorLog.h"

#include "ErrorProgram.h"
#include "config/GlobalOptions.h"
#include "config/ProgramFolder.h"

#include <QFile>
#include <QLocale>

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
    const bool runsProgram = !options.OnErrorRunApp.isEmpty();
    if (options.LogErrors != 0) {
        QString text = message;
        // The first line once a copy may start again tells how many did not.
        if (runsProgram && errorProgramHasRoom()) {
            if (const qint64 skipped = takeSkippedErrorProgramStarts())
                text += QStringLiteral("; %1 error-program starts skipped").arg(skipped);
        }
        appendLine(programFolderFile(QStringLiteral("errorlog.txt")),
                   (errorLogLine(context, text, now) + QStringLiteral("\r\n")).toUtf8());
    }
    // After the line: the program may read it.
    if (runsProgram)
        startErrorProgram(options.OnErrorRunApp);
}
