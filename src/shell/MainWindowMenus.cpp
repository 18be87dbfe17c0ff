// The main window's menus and tray icon: what each command does.
#include "MainWindow.h"
#include "ui_MainWindow.h"

#include "AppIcon.h"
#include "ManualLocation.h"
#include "MdiArrangement.h"
#include "config/GlobalOptions.h"
#include "dialogs/AboutDialog.h"
#include "dialogs/GlobalOptionsDialog.h"
#include "dialogs/PasswordDialogs.h"
#include "localisation/ResourceStrings.h"
#include "nettools/PingDialog.h"
#include "nettools/ResolveDialog.h"
#include "session/SessionEngine.h"
#include "session/SessionManager.h"
#include "shell/SessionWindow.h"
#include "viewsupport/UserDialogs.h"

#include <QApplication>
#include <QCursor>
#include <QDesktopServices>
#include <QMdiSubWindow>
#include <QSystemTrayIcon>
#include <QUrl>

namespace {

const QString kFileFilter = QStringLiteral("Velloca Files (*.vlk);;All Files (*)");

} // namespace

void MainWindow::wireMenus()
{
    connect(m_ui->mnuFileNew, &QAction::triggered, this, &MainWindow::mnuFileNew_Click);
    connect(m_ui->mnuFileOpen, &QAction::triggered, this, &MainWindow::mnuFileOpen_Click);
    connect(m_ui->mnuFileClose, &QAction::triggered, this, &MainWindow::mnuFileClose_Click);
    connect(m_ui->mnuFileSave, &QAction::triggered, this, &MainWindow::mnuFileSave_Click);
    connect(m_ui->mnuFileSaveAs, &QAction::triggered, this, &MainWindow::mnuFileSaveAs_Click);
    connect(m_ui->mnuFileExit, &QAction::triggered, this, &MainWindow::mnuFileExit_Click);
    connect(m_ui->mnuFile, &QMenu::aboutToShow, this,
            [this] { m_ui->mnuFileClose->setEnabled(!sessionWindows().isEmpty()); });
    m_ui->mnuFileClose->setEnabled(false);

    connect(m_ui->mnuWindowCascade, &QAction::triggered, m_ui->mdiArea, &QMdiArea::cascadeSubWindows);
    connect(m_ui->mnuWindowTileHorizontal, &QAction::triggered, this,
            [this] { MdiArrangement::tileHorizontally(m_ui->mdiArea); });
    connect(m_ui->mnuWindowTileVertical, &QAction::triggered, this,
            [this] { MdiArrangement::tileVertically(m_ui->mdiArea); });
    connect(m_ui->mnuWindowArrangeIcons, &QAction::triggered, this,
            [this] { MdiArrangement::arrangeIcons(m_ui->mdiArea); });

    connect(m_ui->mnuWindow, &QMenu::aboutToShow, this, &MainWindow::rebuildWindowMenu);

    connect(m_ui->mnuOpen, &QAction::triggered, this, &MainWindow::mnuOpen_Click);
    connect(m_ui->mnuHide, &QAction::triggered, this, &QWidget::hide);
    connect(m_ui->mnuExit, &QAction::triggered, this, &MainWindow::mnuExit_Click);
}

void MainWindow::wireDialogs()
{
    connect(m_ui->mnuOptions_0, &QAction::triggered, this, [this] {
        const auto edited = showGlobalOptionsDialog(this, GlobalOptions::global());
        if (!edited)
            return;
        GlobalOptions::global() = *edited;
        // A watchdog switched on must start counting in resting sessions.
        for (SessionWindow *window : sessionWindows())
            window->engine()->wakeTicks();
    });
    connect(m_ui->mPassword, &QAction::triggered, this, [this] { showSetPasswordDialog(this); });
    connect(m_ui->mPingTool, &QAction::triggered, this, [this] { showPingDialog(this); });
    connect(m_ui->mResolve, &QAction::triggered, this, [this] { showResolveDialog(this); });
    connect(m_ui->mnuHelpAbout, &QAction::triggered, this, [this] { showAboutDialog(this); });
    connect(m_ui->mnuAbout, &QAction::triggered, this, [this] { showAboutDialog(this); });
    connect(m_ui->mnuHelpContents, &QAction::triggered, this, &MainWindow::showHelpContents);
    connect(m_ui->mnuOrvane, &QAction::triggered, this, &MainWindow::showHelpContents);
}

void MainWindow::showHelpContents()
{
    const QString manual = manualPath();
    if (manual.isEmpty() || !QDesktopServices::openUrl(QUrl::fromLocalFile(manual)))
        QApplication::beep();
}

void MainWindow::rebuildWindowMenu()
{
    QMenu *menu = m_ui->mnuWindow;
    for (QAction *action : menu->actions()) {
        if (action->property("sessionListEntry").toBool())
            menu->removeAction(action);
    }
    const QList<QMdiSubWindow *> windows = m_ui->mdiArea->subWindowList();
    if (windows.isEmpty())
        return;
    menu->addSeparator()->setProperty("sessionListEntry", true);
    int number = 1;
    for (QMdiSubWindow *window : windows) {
        QAction *entry = menu->addAction(QStringLiteral("&%1 %2").arg(number++).arg(window->windowTitle()));
        entry->setProperty("sessionListEntry", true);
        entry->setCheckable(true);
        entry->setChecked(window == m_ui->mdiArea->activeSubWindow());
        connect(entry, &QAction::triggered, this, [this, window] { m_ui->mdiArea->setActiveSubWindow(window); });
        // The entries are rebuilt each time the menu opens.
        connect(menu, &QMenu::aboutToHide, entry, &QObject::deleteLater, Qt::QueuedConnection);
    }
}

void MainWindow::mnuFileNew_Click()
{
    if (!NewSessionWindow())
        UserDialogs::showMessage({ this, LoadResString(5205), QStringLiteral("Velloca"), UserDialogs::Icon::Warning });
}

void MainWindow::mnuFileOpen_Click()
{
    const auto file = UserDialogs::askFileName({ this, QString(), kFileFilter, QString(), false });
    if (!file)
        return;
    QString error;
    if (!getprofilesettings(*file, &error)) {
        UserDialogs::showMessage({ this, LoadResString(5201) + u'\n' + error, QStringLiteral("Velloca"),
                                   UserDialogs::Icon::Critical });
        return;
    }
    m_currentConfigFile = *file;
}

void MainWindow::mnuFileClose_Click()
{
    if (QMdiSubWindow *active = m_ui->mdiArea->activeSubWindow())
        active->close();
    else if (!m_ui->mdiArea->subWindowList().isEmpty())
        m_ui->mdiArea->subWindowList().constLast()->close();
}

void MainWindow::mnuFileSave_Click()
{
    if (m_currentConfigFile.isEmpty())
        mnuFileSaveAs_Click();
    else
        writeprofilesettings(m_currentConfigFile);
}

void MainWindow::mnuFileSaveAs_Click()
{
    const auto file = UserDialogs::askFileName({ this, QString(), kFileFilter, QStringLiteral("vlk"), true });
    if (!file)
        return;
    m_currentConfigFile = *file;
    writeprofilesettings(m_currentConfigFile);
}

void MainWindow::mnuFileExit_Click()
{
    close();
}

void MainWindow::mnuOpen_Click()
{
    if (!isMinimized()) {
        raise();
        activateWindow();
        return;
    }
    setWindowState(windowState() & ~Qt::WindowMinimized);
    show();
}

void MainWindow::mnuExit_Click()
{
    const QString password = GlobalOptions::global().Password;
    if (password.isEmpty()) {
        mnuFileExit_Click();
        return;
    }
    const QString entry = askPassword ? askPassword().value_or(QString()) : QString();
    if (entry == password)
        mnuFileExit_Click();
    else if (!entry.isEmpty())
        UserDialogs::showMessage({ this, LoadResString(5065), QStringLiteral("Velloca"), UserDialogs::Icon::None });
}

void MainWindow::addTrayIcon()
{
    if (!QSystemTrayIcon::isSystemTrayAvailable())
        return;
    m_trayIcon = new QSystemTrayIcon(appIcon(), this);
    m_trayIcon->setToolTip(QStringLiteral("Velloca"));
    connect(m_trayIcon, &QSystemTrayIcon::activated, this, [this](QSystemTrayIcon::ActivationReason reason) {
        // The icon answers only while the window is in the tray.
        if (!isMinimized())
            return;
        if (reason == QSystemTrayIcon::DoubleClick)
            mnuOpen_Click();
        else if (reason == QSystemTrayIcon::Context)
            showTrayPopup();
    });
    m_trayIcon->show();
}

void MainWindow::showTrayPopup()
{
    m_trayMenu->popup(QCursor::pos());
}
