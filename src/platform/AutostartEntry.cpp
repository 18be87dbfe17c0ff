#include "AutostartEntry.h"

#include "FileReplace.h"

#include <QFileInfo>
#include <QStandardPaths>

namespace {

void setError(QString *error, const QString &text)
{
    if (error)
        *error = text;
}

// One Exec argument by the desktop entry rules: quoted, with '"', '`', '$'
// and '\' escaped inside the quotes and '%' doubled (it starts a field
// code). The string escaping of the file comes on top, so a backslash of
// the quoting is written as two.
QString execArgument(const QString &argument)
{
    QString quoted = QStringLiteral("\"");
    for (const QChar c : argument) {
        if (c == QLatin1Char('"') || c == QLatin1Char('`') || c == QLatin1Char('$')
            || c == QLatin1Char('\\'))
            quoted += QLatin1Char('\\') + c;
        else if (c == QLatin1Char('%'))
            quoted += QLatin1String("%%");
        else
            quoted += c;
    }
    quoted += QLatin1Char('"');
    return quoted.replace(QLatin1Char('\\'), QLatin1String("\\\\"));
}

QString entryText(const QString &programPath)
{
    return QStringLiteral("[Desktop Entry]\n"
                          "Type=Application\n"
                          "Name=Velloca\n"
                          "Comment=RS232 to TCP/IP Converter\n"
                          "Exec=%1\n"
                          "Terminal=false\n")
        .arg(execArgument(programPath));
}

QString programPathProblem(const QString &programPath)
{
    if (programPath.isEmpty())
        return QStringLiteral("No program path is given for the autostart entry");
    if (!QFileInfo(programPath).isAbsolute())
        return QStringLiteral("The autostart entry needs an absolute program path, not %1").arg(programPath);
    for (const QChar c : programPath) {
        if (c.unicode() < 0x20 || c.unicode() == 0x7f)
            return QStringLiteral("An autostart entry cannot hold the control characters in %1").arg(programPath);
    }
    return {};
}

} // namespace

QString autostartEntryPath()
{
    return QStandardPaths::writableLocation(QStandardPaths::GenericConfigLocation)
        + QStringLiteral("/autostart/velloca.desktop");
}

bool SetAutoStart(bool enable, const QString &programPath, QString *error)
{
    const QString path = autostartEntryPath();
    if (!enable)
        return removeFileIfPresent(path, error);
    if (const QString problem = programPathProblem(programPath); !problem.isEmpty()) {
        setError(error, problem);
        return false;
    }
    return makeFolderPath(QFileInfo(path).path(), error)
        && replaceFileAtomically(path, entryText(programPath).toUtf8(), error);
}
