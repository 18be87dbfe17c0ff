#include "VellocaProcess.h"

#include "support/Wait.h"

#include <QCoreApplication>
#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QProcessEnvironment>

#include <algorithm>
#include <csignal>

VellocaProcess::VellocaProcess(const VellocaProcess *sameHomeAs)
{
    if (sameHomeAs) {
        m_home = sameHomeAs->rootPath();
        return;
    }
    if (!m_root.isValid())
        return;
    m_home = m_root.path();
    QDir().mkpath(configFolder());
    QDir().mkpath(rootPath() + QStringLiteral("/home"));
    QDir().mkpath(runtimeFolder());
    // Qt and the program both insist on a private runtime folder.
    QFile::setPermissions(runtimeFolder(), QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner);
}

VellocaProcess::~VellocaProcess()
{
    if (m_process.state() == QProcess::NotRunning)
        return;
    m_process.kill();
    m_process.waitForFinished(5000);
}

QString VellocaProcess::programPath()
{
    QString buildDir = qEnvironmentVariable("VELLOCA_BUILD_DIR");
    // The tests and the program are built into the same folder.
    if (buildDir.isEmpty())
        buildDir = QCoreApplication::applicationDirPath();
    return buildDir + QStringLiteral("/velloca");
}

QString VellocaProcess::configHome() const
{
    return rootPath() + QStringLiteral("/config");
}

QString VellocaProcess::configFolder() const
{
    return configHome() + QStringLiteral("/velloca");
}

QString VellocaProcess::runtimeFolder() const
{
    return rootPath() + QStringLiteral("/runtime");
}

QString VellocaProcess::virtualPortFolder() const
{
    return runtimeFolder() + QStringLiteral("/velloca");
}

QString VellocaProcess::defaultConfigPath() const
{
    return configFolder() + QStringLiteral("/default.vlk");
}

QString VellocaProcess::errorLogPath() const
{
    return configFolder() + QStringLiteral("/errorlog.txt");
}

bool VellocaProcess::start(const QByteArray &defaultConfiguration, const QStringList &arguments)
{
    if (!isValid())
        return false;
    if (!defaultConfiguration.isNull()) {
        QFile file(defaultConfigPath());
        if (!file.open(QIODevice::WriteOnly | QIODevice::Truncate)
            || file.write(defaultConfiguration) != defaultConfiguration.size())
            return false;
    }

    QProcessEnvironment environment = QProcessEnvironment::systemEnvironment();
    environment.remove(QStringLiteral("DISPLAY"));
    environment.remove(QStringLiteral("WAYLAND_DISPLAY"));
    environment.remove(QStringLiteral("QT_QPA_PLATFORM"));
    environment.insert(QStringLiteral("HOME"), rootPath() + QStringLiteral("/home"));
    environment.insert(QStringLiteral("XDG_CONFIG_HOME"), configHome());
    environment.insert(QStringLiteral("XDG_RUNTIME_DIR"), runtimeFolder());
    environment.insert(m_extraEnvironment);
    m_process.setProcessEnvironment(environment);
    m_process.setWorkingDirectory(m_workingDirectory.isEmpty() ? rootPath() : m_workingDirectory);
    if (m_closeStandardDescriptors) {
        m_process.setProgram(QStringLiteral("/bin/sh"));
        m_process.setArguments(QStringList { QStringLiteral("-c"), QStringLiteral("exec \"$0\" \"$@\" <&- >&- 2>&-"),
                                             programPath() }
                               + arguments);
    } else {
        m_process.setProgram(programPath());
        m_process.setArguments(arguments);
    }
    m_process.start();
    return waitUntil([this] { return m_process.state() != QProcess::Starting; }, 10000)
        && m_process.state() == QProcess::Running;
}

bool VellocaProcess::isRunning() const
{
    return m_process.state() == QProcess::Running;
}

qint64 VellocaProcess::processId() const
{
    return m_process.processId();
}

bool VellocaProcess::waitForStartUp(int timeoutMs)
{
    const QString lock = virtualPortFolder() + QStringLiteral("/instance.lock");
    return waitUntil([&] { return QFileInfo::exists(lock) || !isRunning(); }, timeoutMs) && isRunning();
}

QString VellocaProcess::errorLog() const
{
    QFile file(errorLogPath());
    if (!file.open(QIODevice::ReadOnly))
        return {};
    return QString::fromUtf8(file.readAll());
}

QStringList VellocaProcess::logLines() const
{
    QStringList lines = errorLog().split(QStringLiteral("\r\n"));
    // A line still being written has no line end yet.
    lines.removeLast();
    return lines;
}

bool VellocaProcess::waitForLogLine(const QString &substring, int timeoutMs)
{
    return waitForLogLine([&](const QString &line) { return line.contains(substring); }, timeoutMs);
}

bool VellocaProcess::waitForLogLine(const std::function<bool(const QString &)> &matches, int timeoutMs)
{
    return waitUntil([&] {
        const QStringList lines = logLines();
        return std::any_of(lines.cbegin(), lines.cend(), matches);
    }, timeoutMs);
}

bool VellocaProcess::terminate(int timeoutMs)
{
    if (!isRunning())
        return false;
    ::kill(pid_t(m_process.processId()), SIGTERM);
    return waitForExit(timeoutMs);
}

bool VellocaProcess::waitForExit(int timeoutMs)
{
    return waitUntil([this] { return m_process.state() == QProcess::NotRunning; }, timeoutMs);
}

QByteArray VellocaProcess::standardError()
{
    m_stderr += m_process.readAllStandardError();
    return m_stderr;
}

QList<qint64> VellocaProcess::processesOfThisRun() const
{
    const QByteArray marker = "XDG_CONFIG_HOME=" + QFile::encodeName(configHome());
    QList<qint64> found;
    const QStringList entries = QDir(QStringLiteral("/proc")).entryList(QDir::Dirs | QDir::NoDotAndDotDot);
    for (const QString &entry : entries) {
        bool isNumber = false;
        const qint64 pid = entry.toLongLong(&isNumber);
        if (!isNumber)
            continue;
        QFile environ(QStringLiteral("/proc/%1/environ").arg(entry));
        if (!environ.open(QIODevice::ReadOnly))
            continue;
        const QList<QByteArray> variables = environ.readAll().split('\0');
        if (variables.contains(marker))
            found << pid;
    }
    return found;
}
