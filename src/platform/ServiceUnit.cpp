#include "ServiceUnit.h"

#include "FileReplace.h"

#include <QFile>
#include <QProcess>
#include <QStandardPaths>
#include <QStringList>

#include <sys/stat.h>
#include <unistd.h>

namespace {

QString unitFilePath(const ServicePaths &paths)
{
    return paths.unitFolder + QLatin1Char('/') + QLatin1String(kServiceUnitName);
}

bool isControlCharacter(QChar c)
{
    return c.unicode() < 0x20 || c.unicode() == 0x7f;
}

// A value in double quotes as systemd reads it: C escapes inside the quotes,
// and '%' starts a specifier everywhere.
QString quotedUnitValue(const QString &value)
{
    QString quoted = QStringLiteral("\"");
    for (const QChar c : value) {
        if (c == QLatin1Char('\\') || c == QLatin1Char('"'))
            quoted += QLatin1Char('\\') + c;
        else if (c == QLatin1Char('%'))
            quoted += QLatin1String("%%");
        else if (isControlCharacter(c))
            quoted += QStringLiteral("\\x%1").arg(c.unicode(), 2, 16, QLatin1Char('0'));
        else
            quoted += c;
    }
    return quoted + QLatin1Char('"');
}

QString commandText(const QString &program, const QStringList &arguments)
{
    return (QStringList { program } + arguments).join(QLatin1Char(' '));
}

bool runSystemctl(const ServicePaths &paths, const QStringList &verb, QString *detail)
{
    QStringList arguments;
    if (!paths.systemScope)
        arguments << QStringLiteral("--user");
    arguments += verb;
    const QString command = commandText(paths.systemctl, arguments);

    QProcess process;
    process.setProcessChannelMode(QProcess::MergedChannels);
    // Nothing may sit waiting for an answer on our terminal.
    process.setStandardInputFile(QProcess::nullDevice());
    process.start(paths.systemctl, arguments);
    if (!process.waitForStarted(paths.commandTimeoutMs)) {
        *detail = QStringLiteral("Cannot run %1: %2").arg(paths.systemctl, process.errorString());
        return false;
    }
    if (!process.waitForFinished(paths.commandTimeoutMs)) {
        process.kill();
        process.waitForFinished();
        *detail = QStringLiteral("%1 did not finish within %2 s")
                      .arg(command, QString::number(paths.commandTimeoutMs / 1000.0));
        return false;
    }
    const QString output = QString::fromLocal8Bit(process.readAll()).trimmed();
    if (process.exitStatus() != QProcess::NormalExit) {
        *detail = QStringLiteral("%1 crashed: %2").arg(command, output);
        return false;
    }
    if (process.exitCode() != 0) {
        *detail = QStringLiteral("%1 failed with exit status %2: %3")
                      .arg(command, QString::number(process.exitCode()), output);
        return false;
    }
    return true;
}

bool unitFileExists(const QString &path)
{
    struct stat info {};
    return ::lstat(QFile::encodeName(path).constData(), &info) == 0;
}

ServiceResult failure(int messageId, const QString &detail)
{
    return { false, messageId, messageId == kServiceInstallFailedMessage, detail };
}

} // namespace

ServicePaths defaultServicePaths()
{
    ServicePaths paths;
    paths.configHome = QStandardPaths::writableLocation(QStandardPaths::GenericConfigLocation);
    paths.systemScope = ::geteuid() == 0;
    paths.unitFolder = paths.systemScope ? QStringLiteral("/etc/systemd/system")
                                         : paths.configHome + QStringLiteral("/systemd/user");
    paths.systemctl = QStandardPaths::findExecutable(QStringLiteral("systemctl"));
    if (paths.systemctl.isEmpty())
        paths.systemctl = QStringLiteral("systemctl"); // fails later with a message that names it
    return paths;
}

QString serviceProgramPathProblem(const QString &programPath)
{
    if (programPath.isEmpty())
        return QStringLiteral("No program path is given");
    if (!programPath.startsWith(QLatin1Char('/')) || programPath.endsWith(QLatin1Char('/')))
        return QStringLiteral("The program path %1 is not the absolute path of a file").arg(programPath);
    for (const QChar c : programPath) {
        if (c == QLatin1Char('"') || c == QLatin1Char('\'') || c == QLatin1Char('\\')
            || isControlCharacter(c)) {
            return QStringLiteral("systemd cannot start a program whose path holds a quote, an "
                                  "apostrophe, a backslash or a control character: %1")
                .arg(programPath);
        }
    }
    return {};
}

QString serviceUnitText(const ServicePaths &paths, const QString &programPath, bool hidden)
{
    QStringList lines {
        QStringLiteral("[Unit]"),
        QStringLiteral("Description=RS232 to TCP/IP Converter"),
    };
    if (!hidden) {
        lines << QStringLiteral("Wants=network-online.target")
              << QStringLiteral("After=network-online.target");
    }
    lines << QString()
          << QStringLiteral("[Service]")
          << QStringLiteral("Type=notify")
          << QStringLiteral("ExecStart=") + quotedUnitValue(programPath)
          << QStringLiteral("Restart=on-failure");
    if (paths.systemScope && !paths.configHome.isEmpty()) {
        lines << QStringLiteral("Environment=")
                + quotedUnitValue(QStringLiteral("XDG_CONFIG_HOME=") + paths.configHome);
    }
    if (hidden)
        lines << QStringLiteral("Environment=QT_QPA_PLATFORM=offscreen");
    lines << QString()
          << QStringLiteral("[Install]")
          << (paths.systemScope ? QStringLiteral("WantedBy=multi-user.target")
                                : QStringLiteral("WantedBy=default.target"));
    return lines.join(QLatin1Char('\n')) + QLatin1Char('\n');
}

ServiceResult installService(const ServicePaths &paths, const QString &programPath, bool hidden)
{
    if (const QString problem = serviceProgramPathProblem(programPath); !problem.isEmpty())
        return failure(kServiceInstallFailedMessage, problem);
    QString detail;
    if (!makeFolderPath(paths.unitFolder, &detail)
        || !replaceFileAtomically(unitFilePath(paths),
                                  serviceUnitText(paths, programPath, hidden).toUtf8(), &detail)) {
        return failure(kServiceInstallFailedMessage, detail);
    }
    const QString unitName = QLatin1String(kServiceUnitName);
    if (!runSystemctl(paths, { QStringLiteral("daemon-reload") }, &detail)
        || !runSystemctl(paths, { QStringLiteral("enable"), unitName }, &detail)) {
        return failure(kServiceInstallFailedMessage, detail);
    }
    return { true, hidden ? 0 : kServiceInstalledMessage, false, {} };
}

ServiceResult uninstallService(const ServicePaths &paths)
{
    const QString unitPath = unitFilePath(paths);
    if (!unitFileExists(unitPath)) {
        return failure(kServiceUninstallFailedMessage,
                       QStringLiteral("The service is not installed: %1 does not exist").arg(unitPath));
    }
    // Stopped as well: a service left running without its unit could be
    // neither stopped nor restarted by name.
    QString detail;
    if (!runSystemctl(paths, { QStringLiteral("disable"), QStringLiteral("--now"),
                               QLatin1String(kServiceUnitName) }, &detail)
        || !removeFileIfPresent(unitPath, &detail)
        || !runSystemctl(paths, { QStringLiteral("daemon-reload") }, &detail)) {
        return failure(kServiceUninstallFailedMessage, detail);
    }
    return { true, kServiceUninstalledMessage, false, {} };
}

ServiceResult runServiceSwitch(ServiceSwitch serviceSwitch, const QString &programPath,
                               const ServicePaths &paths)
{
    switch (serviceSwitch) {
    case ServiceSwitch::Install:
        return installService(paths, programPath, false);
    case ServiceSwitch::InstallHidden:
        return installService(paths, programPath, true);
    case ServiceSwitch::Uninstall:
        return uninstallService(paths);
    case ServiceSwitch::None:
        break;
    }
    return { true, 0, false, {} };
}
