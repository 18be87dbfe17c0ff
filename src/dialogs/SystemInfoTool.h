#pragma once

#include <QString>
#include <QStringList>

// Desktop programs that show what hardware and software this machine has,
// best suited first. Which one a desktop ships varies, so several are tried.
QStringList knownSystemInfoTools();

// Full path of the first known tool found on PATH (as it is at the time of
// the call); an empty text when none is installed.
QString findSystemInfoTool();

// Starts the first known tool without a shell and without waiting for it.
// False when no tool is installed or it could not be started.
bool startSystemInfoTool();
