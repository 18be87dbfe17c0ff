#include "SystemInfoTool.h"

#include <QProcess>
#include <QStandardPaths>

QStringList knownSystemInfoTools()
{
    return {
        QStringLiteral("hardinfo2"),
        QStringLiteral("hardinfo"),
        QStringLiteral("kinfocenter"),
        QStringLiteral("gnome-system-monitor"),
        QStringLiteral("plasma-systemmonitor"),
        QStringLiteral("ksysguard"),
        QStringLiteral("mate-system-monitor"),
        QStringLiteral("xfce4-taskmanager"),
        QStringLiteral("lxtask"),
    };
}

QString findSystemInfoTool()
{
    for (const QString &tool : knownSystemInfoTools()) {
        const QString path = QStandardPaths::findExecutable(tool);
        if (!path.isEmpty())
            return path;
    }
    return {};
}

bool startSystemInfoTool()
{
    const QString tool = findSystemInfoTool();
    return !tool.isEmpty() && QProcess::startDetached(tool, {});
}
