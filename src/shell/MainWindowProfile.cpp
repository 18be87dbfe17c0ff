// The session windows of the manager's sessions, and the main window's
// placement in the configuration.
#include "MainWindow.h"
#include "ui_MainWindow.h"

#include "SessionWindow.h"
#include "dialogs/ClientOptionsDialog.h"
#include "dialogs/LoginOptionsDialog.h"
#include "dialogs/ServerOptionsDialog.h"
#include "localisation/ResourceStrings.h"
#include "session/SessionEngine.h"
#include "session/SessionManager.h"

#include <QMdiSubWindow>

#include <cmath>

namespace {

constexpr double kTwipsPerInch = 1440.0;

enum WindowStateValue { StateNormal = 0, StateMinimized = 1, StateMaximized = 2 };

} // namespace

void MainWindow::showSession(SessionEngine *session)
{
    auto *window = new SessionWindow(session);
    window->showIOOptionsDialog = [window](bool server, const SessionOptions &options) {
        return server ? showServerOptionsDialog(window, options) : showClientOptionsDialog(window, options);
    };
    window->showLoginOptionsDialog = [window](const SessionOptions &options) {
        return showLoginOptionsDialog(window, options);
    };
    QMdiSubWindow *frame = m_ui->mdiArea->addSubWindow(window, Qt::SubWindow | Qt::WindowTitleHint
                                                          | Qt::WindowSystemMenuHint | Qt::WindowMinimizeButtonHint
                                                          | Qt::WindowCloseButtonHint);
    frame->setAttribute(Qt::WA_DeleteOnClose);
    // Closing the window (File -> Close, its close button) ends the session.
    connect(window, &QObject::destroyed, m_manager, [this, session] {
        if (m_windows.remove(session))
            m_manager->removeSession(session);
    });
    m_windows.insert(session, window);
    window->show();
    m_ui->mnuFileClose->setEnabled(true);
}

SessionWindow *MainWindow::NewSessionWindow()
{
    SessionEngine *session = m_manager->addSession();
    return session ? m_windows.value(session) : nullptr;
}

bool MainWindow::getprofilesettings(const QString &fileName, QString *error)
{
    return m_manager->load(fileName, error);
}

void MainWindow::takePlacement()
{
    const MainWindowPlacement &placement = m_manager->placement;
    const double dpi = logicalDpiX() > 0 ? logicalDpiX() : 96.0;
    auto pixels = [dpi](int twips) { return int(std::lround(twips * dpi / kTwipsPerInch)); };
    move(pixels(placement.left), pixels(placement.top));
    resize(qMax(1, pixels(placement.width)), qMax(1, pixels(placement.height)));
    if (placement.windowState == StateMinimized)
        setWindowState(Qt::WindowMinimized);
    else if (placement.windowState == StateMaximized)
        setWindowState(Qt::WindowMaximized);
    else
        setWindowState(Qt::WindowNoState);
}

void MainWindow::putPlacement()
{
    MainWindowPlacement &placement = m_manager->placement;
    const double dpi = logicalDpiX() > 0 ? logicalDpiX() : 96.0;
    auto twips = [dpi](int pixels) { return int(std::lround(pixels * kTwipsPerInch / dpi)); };
    const QRect normal = normalGeometry().isValid() ? normalGeometry() : geometry();
    placement.left = twips(x());
    placement.top = twips(y());
    placement.width = twips(normal.width());
    placement.height = twips(normal.height());
    placement.windowState = isMinimized() ? StateMinimized : isMaximized() ? StateMaximized : StateNormal;
    m_manager->writePlacement = !isMinimized();
}

bool MainWindow::writeprofilesettings(const QString &fileName)
{
    putPlacement();
    return m_manager->save(fileName);
}

QList<SessionWindow *> MainWindow::sessionWindows() const
{
    QList<SessionWindow *> windows;
    for (SessionEngine *session : m_manager->sessions()) {
        if (SessionWindow *window = m_windows.value(session))
            windows << window;
    }
    return windows;
}
