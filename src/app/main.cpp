#include "DisplayPlatform.h"
#include "StandardDescriptors.h"

#include "platform/UnixSignalWatcher.h"
#include "session/SessionManager.h"
#include "shell/MainWindow.h"

#include <QApplication>
#include <QCoreApplication>
#include <QTimer>

namespace {

constexpr int kStartUpDelayMs = 1000;
constexpr int kExitDelayMs = 500;

QStringList programArguments(int argc, char **argv)
{
    QStringList arguments;
    for (int i = 1; i < argc; ++i)
        arguments << QString::fromLocal8Bit(argv[i]);
    return arguments;
}

void nameApplication()
{
    QCoreApplication::setApplicationName(QStringLiteral("Velloca"));
    QCoreApplication::setApplicationVersion(QStringLiteral(VELLOCA_VERSION));
}

// The daemon: the session manager on a core application, nothing else.
int runHeadless(int argc, char **argv, const QString &commandLine)
{
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

// The desktop: the same manager with the windows as its views.
int runDesktop(int argc, char **argv, const QString &commandLine)
{
    QApplication app(argc, argv);
    nameApplication();
    // Hidden in the tray is not the end: only an exit ends the program.
    QApplication::setQuitOnLastWindowClosed(false);
    SessionManager manager;
    MainWindow window(commandLine, &manager);

    int earlyExitStatus = -1;
    QObject::connect(&window, &MainWindow::finishedEarly, &app, [&](int status) {
        earlyExitStatus = status;
        QApplication::exit(status);
    });
    UnixSignalWatcher signalWatcher;
    QObject::connect(&signalWatcher, &UnixSignalWatcher::terminationRequested, &window, &QWidget::close);

    const int status = app.exec();
    return earlyExitStatus >= 0 ? earlyExitStatus : status;
}

} // namespace

int main(int argc, char **argv)
{
    openMissingStandardDescriptors();
    QStringList arguments = programArguments(argc, argv);
    const bool headless = takeHeadlessChoice(arguments);
    // The whole command line is one text: a file name with blanks may come
    // as several arguments.
    const QString commandLine = arguments.join(u' ');
    return headless ? runHeadless(argc, argv, commandLine) : runDesktop(argc, argv, commandLine);
}
