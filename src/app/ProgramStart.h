#pragma once

#include <QString>

// What both programs, velloca and velloca-desktop, do first.

// A program started with stdin, stdout or stderr closed would hand those
// numbers to the first files it opens, and the next warning written to
// "stderr" would land in one of them. Opens /dev/null on each of 0, 1 and 2
// that is closed; call first thing in main().
void openMissingStandardDescriptors();

// The arguments after the program name as one text, without --headless: a
// file name with blanks may come as several arguments.
QString commandLineOf(int argc, char **argv);

// Whether velloca runs headless: asked with --headless, or no display at all
// (no DISPLAY, no WAYLAND_DISPLAY, no platform chosen by the user, or Qt's
// offscreen platform). Headless it also gets Qt's own event loop instead of
// GLib's.
bool chooseHeadless(int argc, char **argv);

void nameApplication();
