// The main window's life: start-up sequence, commands from other programs,
// minimize and restore with the password check, and shutdown.
#include "MainWindow.h"
#include "ui_MainWindow.h"

#include "AppIcon.h"
#include "config/GlobalOptions.h"
#include "config/ProgramFolder.h"
#include "dialogs/PasswordDialogs.h"
#include "localisation/ApplyResourceStrings.h"
#include "localisation/ResourceStrings.h"
#include "config/ConfigurationFile.h"
#include "platform/CommandChannel.h"
#include "platform/FileLock.h"
#include "platform/ServiceNotifier.h"
#include "platform/ServiceSwitch.h"
#include "platform/VirtualPortFolder.h"
#include "session/SessionEngine.h"
#include "session/SessionWindow.h"
#include "session/UserDialogs.h"

#include <QApplication>
#include <QCloseEvent>
#include <QDir>
#include <QFileInfo>
#include <QGuiApplication>
#include <QLockFile>
#include <QRegularExpression>
#include <QSystemTrayIcon>
#include <QTextStream>

namespace {

constexpr int kStartUpDelayMs = 1000;
constexpr int kExitDelayMs = 500;

} // namespace

MainWindow::MainWindow(QString commandLine, QWidget *parent)
    : QMainWindow(parent), m_ui(std::make_unique<Ui::MainWindow>()), m_commandLine(std::move(commandLine))
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

    m_timer1.setInterval(kStartUpDelayMs);
    connect(&m_timer1, &QTimer::timeout, this, &MainWindow::Timer1_Tick);
    m_timer1.start();
}

MainWindow::~MainWindow() = default;

void MainWindow::Timer1_Tick()
{
    if (m_exitRequested) {
        close();
        return;
    }
    if (!m_startUpDone) {
        StartUpSequence();
        if (m_startUpDone)
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
    if (topic.compare(QStringLiteral("System"), Qt::CaseInsensitive) == 0) {
        if (command.toUpper().trimmed() != QStringLiteral("[APPEXIT]"))
            return false;
        requestExit();
        return true;
    }
    SessionWindow *session = sessionForTopic(topic);
    return session && session->engine()->executeCommand(command);
}

SessionWindow *MainWindow::sessionForTopic(const QString &topic) const
{
    const QList<SessionWindow *> windows = sessionWindows();
    static const QRegularExpression numbered(QStringLiteral("^Session([0-9]{1,9})$"),
                                             QRegularExpression::CaseInsensitiveOption);
    if (const auto match = numbered.match(topic); match.hasMatch()) {
        const int n = match.captured(1).toInt();
        return n >= 1 && n <= windows.size() ? windows[n - 1] : nullptr;
    }
    // Several sessions may share a connector name; the first one answers.
    for (SessionWindow *window : windows) {
        if (window->engine()->commandTopic().compare(topic, Qt::CaseInsensitive) == 0)
            return window;
    }
    return nullptr;
}

void MainWindow::StartUpSequence()
{
    // The working folder is never changed: a relative file name on the
    // command line means the folder the program was started in.
    ApplyResourceStrings(this);
    m_timer1.stop();
    m_autoActivateList = { 0, 0 };

    QString configFile;
    if (!m_commandLine.isEmpty()) {
        if (handleServiceSwitch(m_commandLine))
            return;
        configFile = QFileInfo(m_commandLine).absoluteFilePath();
    }
    addTrayIcon();
    if (!loadStartUpConfiguration(configFile))
        return;
    takeConfigurationLock();
    openCommandChannel();
    resetBusInFirstCopy();
    autoActivate();
    m_startUpDone = true;
    notifyServiceReady();
}

bool MainWindow::loadStartUpConfiguration(const QString &namedFile)
{
    QString error;
    if (!namedFile.isEmpty()) {
        if (getprofilesettings(namedFile, &error)) {
            m_exitSaveAllowed = true;
            return true;
        }
        if (!reportLoadFailure(error))
            return false;
    }
    if (getprofilesettings(QString(), &error)) {
        m_exitSaveAllowed = true;
        return true;
    }
    if (!reportLoadFailure(error))
        return false;
    // Nothing could be loaded: the user gets a new session, and the file
    // that failed is never overwritten.
    tellUser(LoadResString(5202), false);
    NewSessionWindow();
    return true;
}

// Headless nobody could answer for the lost file: the program ends before it
// writes anything. With a display the user is told and the program goes on.
bool MainWindow::reportLoadFailure(const QString &error)
{
    if (isHeadless()) {
        QTextStream(stderr) << "velloca: " << LoadResString(5201) << ' ' << error << '\n';
        Q_EMIT finishedEarly(2);
        return false;
    }
    tellUser(LoadResString(5201) + u'\n' + error, true);
    return true;
}

void MainWindow::takeConfigurationLock()
{
    const QString path = defaultConfigurationPath();
    bool busy = false;
    QString error;
    m_configurationLock = FileLock::tryLock(path + QStringLiteral(".lock"), &busy, &error);
    if (m_configurationLock)
        return;
    // Two copies saving one file at exit would leave only the last one's
    // sessions; this copy runs but leaves the file to the other one.
    m_exitSaveAllowed = false;
    if (busy)
        tellUser(LoadResString(5203) + u'\n' + path, false);
    else
        qWarning("velloca: %s", qPrintable(error));
}

void MainWindow::tellUser(const QString &text, bool critical)
{
    if (isHeadless()) {
        QTextStream(stderr) << "velloca: " << text << '\n';
        return;
    }
    UserDialogs::showMessage({ this, text, QStringLiteral("Velloca"),
                               critical ? UserDialogs::Icon::Critical : UserDialogs::Icon::Warning });
}

bool MainWindow::isHeadless() const
{
    return QGuiApplication::platformName() == QStringLiteral("offscreen");
}

void MainWindow::openCommandChannel()
{
    m_commandChannel = new CommandChannel(
        [this](const QString &topic, const QString &command) { return executeCommand(topic, command); }, this);
    QString error;
    if (!m_commandChannel->listen(defaultVirtualPortFolder(), &error))
        qWarning("velloca: no command channel: %s", qPrintable(error));
}

bool MainWindow::handleServiceSwitch(const QString &commandLine)
{
    const ServiceSwitch serviceSwitch = parseServiceSwitch(commandLine);
    if (serviceSwitch == ServiceSwitch::None)
        return false;
    const ServiceResult result = runServiceSwitch(serviceSwitch, QCoreApplication::applicationFilePath(), servicePaths);
    if (result.messageId != 0) {
        QString text = QString::fromLatin1(kServiceDisplayName) + u' ' + LoadResString(result.messageId);
        if (!result.detail.isEmpty())
            text += u'\n' + result.detail;
        // Without a display nobody would see a box: the terminal gets it.
        if (isHeadless())
            QTextStream(stderr) << text << '\n';
        else
            UserDialogs::showMessage({ this, text, QStringLiteral("Velloca"),
                                       result.critical ? UserDialogs::Icon::Critical : UserDialogs::Icon::Information });
    }
    Q_EMIT finishedEarly(result.ok ? 0 : 1);
    return true;
}

void MainWindow::resetBusInFirstCopy()
{
    if (m_sessions.isEmpty())
        return;
    // The lock lives as long as this copy runs; a second copy does not get
    // it and leaves the first copy's ports alone.
    QString error;
    if (!makeVirtualPortFolder(defaultVirtualPortFolder(), &error))
        return;
    m_instanceLock = std::make_unique<QLockFile>(defaultVirtualPortFolder() + QStringLiteral("/instance.lock"));
    if (m_instanceLock->tryLock(0))
        ResetBus(virtualPortFolder());
}

void MainWindow::autoActivate()
{
    const QList<SessionWindow *> windows = sessionWindows();
    for (int n = 1; n <= windows.size() && n < m_autoActivateList.size(); ++n) {
        if (m_autoActivateList[n] != 1)
            continue;
        windows[n - 1]->engine()->Command1_Click();
        m_autoActivateList[n] = 0;
    }
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
    notifyServiceStopping();
    m_timer1.stop();
    // Before the configuration was loaded there is nothing to save, and
    // saving would overwrite the file with an empty one.
    if (m_startUpDone && m_exitSaveAllowed)
        writeprofilesettings(QString());
    if (m_trayIcon)
        m_trayIcon->hide();
    // Quitting ends every event loop, also that of a dialog still open; the
    // session windows go with this window once the program unwinds, never
    // from under a dialog that is still running.
    QCoreApplication::quit();
}
