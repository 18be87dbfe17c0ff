#pragma once

#include <QString>

// The desktop program, velloca-desktop, lives beside velloca. velloca is
// the daemon alone (it links no Qt Gui, so a headless run stays small);
// with a display it hands itself over to the desktop program, which runs
// the same session manager with the windows as its views.

// Replaces this process with velloca-desktop, passing argv on. Returns only
// when that failed, with the reason in *error.
void execDesktopProgram(char **argv, QString *error);
