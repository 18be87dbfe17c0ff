#pragma once

#include "ServiceSwitch.h"

#include <QString>

// The program as a systemd service: installing writes velloca.service and
// enables it, removing disables (and stops) it and deletes the unit. The
// functions block while systemctl runs (each call bounded by
// ServicePaths::commandTimeoutMs): they are meant for the start-up switches,
// which run before any window exists and end the program right after.

inline constexpr auto kServiceUnitName = "velloca.service";
// Put, with a blank, in front of the message text the caller shows.
inline constexpr auto kServiceDisplayName = "Velloca";

// Resource ids of the messages (texts in the localisation string table).
inline constexpr int kServiceInstalledMessage = 5061;
inline constexpr int kServiceInstallFailedMessage = 5062;
inline constexpr int kServiceUninstalledMessage = 5063;
inline constexpr int kServiceUninstallFailedMessage = 5064;

struct ServiceResult
{
    bool ok = false;
    // The message to show: kServiceDisplayName, a blank and the resource
    // text. 0 when nothing is shown (a hidden install that succeeded).
    int messageId = 0;
    // Only kServiceInstallFailedMessage is shown with the critical icon.
    bool critical = false;
    // Why it failed, for the user: the path and the system's reason, or the
    // systemctl command and its output. Empty on success.
    QString detail;
};

struct ServicePaths
{
    QString unitFolder; // where velloca.service is written
    QString systemctl;  // the systemctl program
    bool systemScope = false; // false: the user's service manager (--user)
    // The configuration home the service is to use (its program folder is
    // <configHome>/velloca). A system service gets no home of its own, so
    // the unit names the installing user's; ignored for user units.
    QString configHome;
    int commandTimeoutMs = 30000; // per systemctl call
};

// As root: /etc/systemd/system, system scope. Otherwise the user's units in
// $XDG_CONFIG_HOME/systemd/user (normally ~/.config/systemd/user).
ServicePaths defaultServicePaths();

// Empty when systemd can start programPath; else why not. systemd wants an
// absolute path and refuses quotes, apostrophes, backslashes and control
// characters in the executable's name, however they are escaped.
QString serviceProgramPathProblem(const QString &programPath);

// The unit file text. The path is quoted so blanks are kept. A plain
// service waits for the network (network-online.target); a hidden one has
// no dependency and runs on Qt's offscreen platform, with no display.
// programPath must pass serviceProgramPathProblem().
QString serviceUnitText(const ServicePaths &paths, const QString &programPath, bool hidden);

// Writes the unit (replacing an older one), reloads systemd and enables the
// service; it is not started. messageId 5061 (plain) or 0 (hidden) on
// success, 5062 on any failure.
ServiceResult installService(const ServicePaths &paths, const QString &programPath, bool hidden);

// Disables and stops the service, deletes the unit and reloads systemd.
// 5063 on success; 5064 on failure, also when no unit is installed in
// paths.unitFolder.
ServiceResult uninstallService(const ServicePaths &paths);

// Runs the switch found by parseServiceSwitch(); for ServiceSwitch::None
// returns ok with no message and does nothing.
ServiceResult runServiceSwitch(ServiceSwitch serviceSwitch, const QString &programPath,
                               const ServicePaths &paths = defaultServicePaths());
