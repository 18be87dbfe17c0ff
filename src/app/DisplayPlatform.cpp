#include "DisplayPlatform.h"

#include <QByteArray>
#include <QtGlobal>

bool takeHeadlessChoice(QStringList &arguments)
{
    const bool asked = arguments.removeAll(QStringLiteral("--headless")) > 0;
    const QByteArray platform = qgetenv("QT_QPA_PLATFORM");
    const bool noDisplay = platform.isEmpty() && qEnvironmentVariableIsEmpty("DISPLAY")
        && qEnvironmentVariableIsEmpty("WAYLAND_DISPLAY");
    const bool headless = asked || noDisplay || platform == "offscreen";
    // Headless there is no desktop whose GLib main loop must be shared. Qt's
    // own poll loop moves a block with three system calls (poll, read,
    // write); the GLib loop adds an eventfd wake-up each time a socket
    // notifier is switched on or off, which is once per block.
    if (headless)
        qputenv("QT_NO_GLIB", "1");
    return headless;
}
