#pragma once

#include <QStringList>

// Whether the program runs headless: asked with --headless, or no display
// at all (no DISPLAY, no WAYLAND_DISPLAY, no platform chosen by the user,
// or Qt's offscreen platform). Headless it is a daemon on a Qt core
// application: no widget, no platform plugin, and Qt's own event loop
// instead of GLib's. Removes --headless from arguments.
bool takeHeadlessChoice(QStringList &arguments);
