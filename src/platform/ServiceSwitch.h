#pragma once

#include <QString>

// The command-line switches that install or remove the service instead of
// starting the program normally.
enum class ServiceSwitch {
    None,          // not a switch: the command line names a configuration file
    Install,       // "-I" or "/I": service that waits for the network
    InstallHidden, // "-IH" or "/IH": service without a display or dependency
    Uninstall      // "-U" or "/U"
};

// The whole command line, trimmed and upper-cased, must equal one switch:
// " /ih " is InstallHidden, "-I extra" and "" are None.
ServiceSwitch parseServiceSwitch(const QString &commandLine);
