// The main window's life: start-up, minimize and restore with the password
// check, and shutdown.
#include "MainWindow.h"
#include "ui_MainWindow.h"

#include "AppIcon.h"
#include "SessionWindow.h"
#include "config/GlobalOptions.h"
#include "dialogs/PasswordDialogs.h"
#include "localisation/ResourceStrings.h"
#include "session/SessionEngine.h"
#include "session/SessionManager.h"
#include "viewsupport/ApplyResourceStrings.h"
#include "viewsupport/UserDialogs.h"

#include <QApplication>
#include <QCloseEvent>
#include <QGuiApplication>
#include <QSystemTrayIcon>

#include <utility>

namespace {

constexpr int kStartUpDelayMs = 1000;
constexpr int kExitDelayMs = 500;

} // namespace

MainWindow::MainWindow(QString commandLine, SessionManager *manager, QWidget *parent)
    : QMainWindow(parent)
    , m_ui(std::make_unique<Ui::MainWindow>())
    , m_commandLine(std::move(commandLine))
    , m_manager(manager ? manager : new SessionManager(this))
{
    m_ui->setupUi(this);
    setCentralWidget(m_ui->mdiArea);
    setWindowIcon(appIcon());
    m_trayMenu = new QMenu(this);
    m_trayMenu->setObjectName(QStringLiteral("mnuPopUp"));
    m_trayMenu->addAction(m_ui->mnuOpen);
    m_trayMenu->addAction(m_ui->mnuHide);
    m_trayMenu->addAction(m_ui->mnuExit);
    m_trayMenu->addSeparator()->setObjectName(QStringLiteral("sep10"));
    m_trayMenu->addAction(m_ui->mnuAbout);
    m_trayMenu->setDefaultAction(m_ui->mnuAbout);
    wireMenus();

    askPassword = [this]() { return askForPassword(this); };
    wireDialogs();

    m_manager->headless = isHeadless();
    m_manager->tellUser = [this](const QString &text, bool critical) { tellUser(text, critical); };
    connect(m_manager, &SessionManager::sessionAdded, this, &MainWindow::showSession);
    connect(m_manager, &SessionManager::sessionRemoved, this, [this](SessionEngine *session) {
        // Deleted at once, so the engine outlives no window of its own.
        if (QPointer<SessionWindow> window = m_windows.take(session))
            delete window->parentWidget();
        m_ui->mnuFileClose->setEnabled(!m_windows.isEmpty());
    });
    connect(m_manager, &SessionManager::loaded, this, &MainWindow::takePlacement);
    connect(m_manager, &SessionManager::exitRequested, this, &MainWindow::requestExit);
    connect(m_manager, &SessionManager::finished, this, &MainWindow::finishedEarly);

    m_timer1.setInterval(kStartUpDelayMs);
    connect(&m_timer1, &QTimer::timeout, this, &MainWindow::Timer1_Tick);
    m_timer1.start();
}

MainWindow::~MainWindow()
{
    // The windows go first: they show engines the manager owns. Taken out
    // of the list first, so their going does not end their sessions.
    m_manager->disconnect(this);
    const auto windows = std::exchange(m_windows, {});
    for (const QPointer<SessionWindow> &window : windows)
        delete window;
}

bool MainWindow::startUpDone() const
{
    return m_manager->startUpDone();
}

void MainWindow::Timer1_Tick()
{
    if (m_exitRequested) {
        close();
        return;
    }
    if (!startUpDone()) {
        StartUpSequence();
        if (startUpDone())
            show();
    }
}

void MainWindow::runStartUpNow()
{
    Timer1_Tick();
}

void MainWindow::requestExit()
{
    m_exitRequested = true;
    m_timer1.stop();
    m_timer1.setInterval(kExitDelayMs);
    m_timer1.start();
}

bool MainWindow::executeCommand(const QString &topic, const QString &command)
{
    return m_manager->executeCommand(topic, command);
}

void MainWindow::StartUpSequence()
{
    ApplyResourceStrings(this);
    m_timer1.stop();
    if (m_manager->handleServiceSwitch(m_commandLine))
        return;
    addTrayIcon();
    m_manager->startUp(m_commandLine);
}

void MainWindow::tellUser(const QString &text, bool critical)
{
    UserDialogs::showMessage({ this, text, QStringLiteral("Velloca"),
                               critical ? UserDialogs::Icon::Critical : UserDialogs::Icon::Warning });
}

bool MainWindow::isHeadless() const
{
    return QGuiApplication::platformName() == QStringLiteral("offscreen");
}

void MainWindow::changeEvent(QEvent *event)
{
    QMainWindow::changeEvent(event);
    if (event->type() == QEvent::WindowStateChange)
        handleWindowStateChange();
}

void MainWindow::handleWindowStateChange()
{
    if (isMinimized()) {
        m_mainWindowLocked = true;
        if (m_trayIcon)
            QMetaObject::invokeMethod(this, &QWidget::hide, Qt::QueuedConnection);
        return;
    }
    if (m_resizeBusy)
        return;
    m_resizeBusy = true;
    restoreCheck();
    if (m_trayIcon && isMinimized())
        hide();
    m_resizeBusy = false;
}

void MainWindow::restoreCheck()
{
    const QString password = GlobalOptions::global().Password;
    if (!m_mainWindowLocked || password.isEmpty())
        return;
    hide();
    const QString entry = askPassword ? askPassword().value_or(QString()) : QString();
    if (entry != password) {
        if (!entry.isEmpty())
            UserDialogs::showMessage({ this, LoadResString(5065), QStringLiteral("Velloca"), UserDialogs::Icon::None });
        setWindowState(windowState() | Qt::WindowMinimized);
    } else {
        setWindowState(windowState() & ~Qt::WindowMinimized);
        m_mainWindowLocked = false;
    }
    show();
}

void MainWindow::closeEvent(QCloseEvent *event)
{
    shutdown();
    event->accept();
}

void MainWindow::shutdown()
{
    if (m_shutDown)
        return;
    m_shutDown = true;
    m_timer1.stop();
    putPlacement();
    m_manager->shutDown();
    if (m_trayIcon)
        m_trayIcon->hide();
    // Quitting ends every event loop, also that of a dialog still open; the
    // session windows go with this window once the program unwinds, never
    // from under a dialog that is still running.
    QCoreApplication::quit();
}
