// velloca: the daemon, the session manager on a core application. With a
// display it hands over to velloca-desktop.
#include "DesktopLaunch.h"
#include "ProgramStart.h"

#include "platform/UnixSignalWatcher.h"
#include "session/SessionManager.h"

#include <QCoreApplication>
#include <QTextStream>
#include <QTimer>

namespace {

constexpr int kStartUpDelayMs = 1000;
constexpr int kExitDelayMs = 500;

} // namespace

int main(int argc, char **argv)
{
    openMissingStandardDescriptors();
    if (!chooseHeadless(argc, argv)) {
        QString error;
        execDesktopProgram(argv, &error);
        QTextStream(stderr) << "velloca: " << error << "; running without windows\n";
    }
    const QString commandLine = commandLineOf(argc, argv);
    QCoreApplication app(argc, argv);
    nameApplication();
    SessionManager manager;
    manager.headless = true;

    int earlyExitStatus = -1;
    QObject::connect(&manager, &SessionManager::finished, &app, [&](int status) {
        earlyExitStatus = status;
        QCoreApplication::exit(status);
    });
    auto shutDown = [&manager] {
        manager.shutDown();
        QCoreApplication::quit();
    };
    // The command that asked for the exit is answered first.
    QObject::connect(&manager, &SessionManager::exitRequested, &app,
                     [&] { QTimer::singleShot(kExitDelayMs, &app, shutDown); });
    UnixSignalWatcher signalWatcher;
    QObject::connect(&signalWatcher, &UnixSignalWatcher::terminationRequested, &app, shutDown);
    QTimer::singleShot(kStartUpDelayMs, &manager, [&] {
        if (!manager.handleServiceSwitch(commandLine))
            manager.startUp(commandLine);
    });

    const int status = app.exec();
    return earlyExitStatus >= 0 ? earlyExitStatus : status;
}
