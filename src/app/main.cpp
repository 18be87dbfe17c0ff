#include "DisplayPlatform.h"
#include "StandardDescriptors.h"

#include "shell/MainWindow.h"
#include "shell/UnixSignalWatcher.h"

#include <QApplication>

int main(int argc, char **argv)
{
    openMissingStandardDescriptors();
    chooseOffscreenPlatformWhenHeadless();
    QApplication app(argc, argv);
    QApplication::setApplicationName(QStringLiteral("Velloca"));
    QApplication::setApplicationVersion(QStringLiteral(VELLOCA_VERSION));
    // Hidden in the tray is not the end: only an exit ends the program.
    QApplication::setQuitOnLastWindowClosed(false);

    // The whole command line is one text: a file name with blanks may come
    // as several arguments.
    const QString commandLine = QApplication::arguments().mid(1).join(u' ');
    MainWindow window(commandLine);

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
