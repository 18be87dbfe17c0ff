#include "DisplayPlatform.h"

#include <QByteArray>
#include <QtGlobal>

void chooseOffscreenPlatformWhenHeadless()
{
    if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM") && qEnvironmentVariableIsEmpty("DISPLAY")
        && qEnvironmentVariableIsEmpty("WAYLAND_DISPLAY"))
        qputenv("QT_QPA_PLATFORM", "offscreen");
    // Headless there is no desktop whose GLib main loop must be shared. Qt's
    // own poll loop moves a block with three system calls (poll, read,
    // write); the GLib loop adds an eventfd wake-up each time a socket
    // notifier is switched on or off, which is once per block.
    if (qgetenv("QT_QPA_PLATFORM") == "offscreen")
        qputenv("QT_NO_GLIB", "1");
}
