#include "ProcessProbe.h"

#include <QDir>
#include <QFile>

#include <unistd.h>

namespace e2e {

namespace {

QByteArray procFile(qint64 pid, const char *name)
{
    QFile file(QStringLiteral("/proc/%1/%2").arg(pid).arg(QLatin1String(name)));
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
}

qint64 statusKiB(qint64 pid, const QByteArray &field)
{
    const QList<QByteArray> lines = procFile(pid, "status").split('\n');
    for (const QByteArray &line : lines) {
        if (line.startsWith(field))
            return line.mid(field.size()).trimmed().split(' ').first().toLongLong();
    }
    return -1;
}

} // namespace

int openDescriptorCount(qint64 pid)
{
    const QDir folder(QStringLiteral("/proc/%1/fd").arg(pid));
    if (!folder.exists())
        return -1;
    return int(folder.entryList(QDir::AllEntries | QDir::System | QDir::NoDotAndDotDot).size());
}

qint64 cpuTimeMs(qint64 pid)
{
    const QByteArray stat = procFile(pid, "stat");
    // The command name may hold spaces and parentheses: fields are counted
    // from the last ')'.
    const qsizetype end = stat.lastIndexOf(')');
    if (end < 0)
        return -1;
    const QList<QByteArray> fields = stat.mid(end + 2).split(' ');
    // After the name: state is field 3, utime 14 and stime 15.
    if (fields.size() < 13)
        return -1;
    const qint64 ticks = fields[11].toLongLong() + fields[12].toLongLong();
    return ticks * 1000 / ::sysconf(_SC_CLK_TCK);
}

qint64 residentKiB(qint64 pid)
{
    return statusKiB(pid, "VmRSS:");
}

qint64 peakResidentKiB(qint64 pid)
{
    return statusKiB(pid, "VmHWM:");
}

} // namespace e2e
