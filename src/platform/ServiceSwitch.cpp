#include "ServiceSwitch.h"

ServiceSwitch parseServiceSwitch(const QString &commandLine)
{
    const QString word = commandLine.trimmed().toUpper();
    if (word == QLatin1String("-IH") || word == QLatin1String("/IH"))
        return ServiceSwitch::InstallHidden;
    if (word == QLatin1String("-I") || word == QLatin1String("/I"))
        return ServiceSwitch::Install;
    if (word == QLatin1String("-U") || word == QLatin1String("/U"))
        return ServiceSwitch::Uninstall;
    return ServiceSwitch::None;
}
