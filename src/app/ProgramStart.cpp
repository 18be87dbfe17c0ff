#include "ProgramStart.h"

#include <QCoreApplication>
#include <QStringList>

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <unistd.h>

namespace {

const char *const kHeadlessSwitch = "--headless";

} // namespace

void openMissingStandardDescriptors()
{
    for (int fd = 0; fd <= 2; ++fd) {
        if (::fcntl(fd, F_GETFD) != -1 || errno != EBADF)
            continue;
        // open() returns the lowest free number, which is fd itself.
        const int opened = ::open("/dev/null", fd == 0 ? O_RDONLY : O_WRONLY);
        if (opened >= 0 && opened != fd)
            ::close(opened);
    }
}

QString commandLineOf(int argc, char **argv)
{
    QStringList arguments;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], kHeadlessSwitch) != 0)
            arguments << QString::fromLocal8Bit(argv[i]);
    }
    return arguments.join(u' ');
}

bool chooseHeadless(int argc, char **argv)
{
    bool asked = false;
    for (int i = 1; i < argc; ++i)
        asked = asked || std::strcmp(argv[i], kHeadlessSwitch) == 0;
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

void nameApplication()
{
    QCoreApplication::setApplicationName(QStringLiteral("Velloca"));
    QCoreApplication::setApplicationVersion(QStringLiteral(VELLOCA_VERSION));
}
