// velloca-desktop: the session manager with the windows as its views.
// velloca starts it when there is a display.
#include "ProgramStart.h"

#include "platform/UnixSignalWatcher.h"
#include "session/SessionManager.h"
#include "shell/MainWindow.h"

#include <QApplication>

int main(int argc, char **argv)
{
    openMissingStandardDescriptors();
    const QString commandLine = commandLineOf(argc, argv);
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
