#include "ErrorProgram.h"

#include <QCoreApplication>
#include <QFileInfo>
#include <QProcess>
#include <QSocketNotifier>

#include <sys/syscall.h>
#include <unistd.h>

#include <utility>

namespace {

int g_running = 0;
qint64 g_skipped = 0;

QStringList programAndArguments(const QString &commandLine)
{
    const QFileInfo whole(commandLine);
    if (whole.isFile() && whole.isExecutable())
        return { commandLine };
    return QProcess::splitCommand(commandLine);
}

// Counts the copy as running until it ends. It is no child of ours (it is
// started detached), so its end is seen through a process descriptor, which
// becomes readable then. A copy that has already ended is not counted.
void countWhileRunning(qint64 pid)
{
    const int fd = int(::syscall(SYS_pidfd_open, pid_t(pid), 0));
    if (fd < 0)
        return;
    auto *notifier = new QSocketNotifier(fd, QSocketNotifier::Read, QCoreApplication::instance());
    ++g_running;
    QObject::connect(notifier, &QSocketNotifier::activated, notifier, [notifier, fd] {
        --g_running;
        notifier->setEnabled(false);
        notifier->deleteLater();
        ::close(fd);
    });
}

} // namespace

bool errorProgramHasRoom()
{
    return g_running < kMaxRunningErrorPrograms;
}

void startErrorProgram(const QString &commandLine)
{
    const QStringList words = programAndArguments(commandLine);
    if (words.isEmpty())
        return;
    if (!errorProgramHasRoom()) {
        ++g_skipped;
        return;
    }
    // A program that is missing just does not run.
    qint64 pid = 0;
    if (QProcess::startDetached(words.first(), words.mid(1), QString(), &pid)
        && QCoreApplication::instance())
        countWhileRunning(pid);
}

qint64 takeSkippedErrorProgramStarts()
{
    return std::exchange(g_skipped, 0);
}
