#include "MainWindow.h"
#include "ui_MainWindow.h"

#include "AppIcon.h"
#include "MdiArrangement.h"
#include "config/GlobalOptions.h"
#include "config/IniProfile.h"
#include "config/ProgramFolder.h"
#include "localisation/ApplyResourceStrings.h"
#include "localisation/ResourceStrings.h"
#include "dialogs/AboutDialog.h"
#include "dialogs/ClientOptionsDialog.h"
#include "dialogs/GlobalOptionsDialog.h"
#include "dialogs/LoginOptionsDialog.h"
#include "dialogs/PasswordDialogs.h"
#include "dialogs/ServerOptionsDialog.h"
#include "nettools/PingDialog.h"
#include "nettools/ResolveDialog.h"
#include "platform/AutostartEntry.h"
#include "platform/CommandChannel.h"
#include "platform/ServiceNotifier.h"
#include "platform/ServiceSwitch.h"
#include "platform/ServiceUnit.h"
#include "platform/PortMap.h"
#include "platform/VirtualPortFolder.h"
#include "session/SessionEngine.h"
#include "session/SessionWindow.h"
#include "session/UserDialogs.h"

#include <QApplication>
#include <QCloseEvent>
#include <QCursor>
#include <QDesktopServices>
#include <QDir>
#include <QFileInfo>
#include <QGuiApplication>
#include <QUrl>
#include <QLockFile>
#include <QMdiSubWindow>
#include <QRegularExpression>
#include <QSystemTrayIcon>
#include <QTextStream>

#include <cmath>

namespace {

constexpr int kStartUpDelayMs = 1000;
constexpr int kExitDelayMs = 500;
constexpr double kTwipsPerInch = 1440.0;
const QString kFileFilter = QStringLiteral("Velloca Files (*.vlk);;All Files (*)");

enum WindowStateValue { StateNormal = 0, StateMinimized = 1, StateMaximized = 2 };

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
    connect(m_ui->mnuOptions_0, &QAction::triggered, this, [this] { showGlobalOptionsDialog(this); });
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
    // The manual is the README installed beside the program, until a
    // manual of its own exists.
    const QString manual = QDir(QCoreApplication::applicationDirPath()).filePath(QStringLiteral("../README.md"));
    if (!QFileInfo::exists(manual) || !QDesktopServices::openUrl(QUrl::fromLocalFile(QFileInfo(manual).canonicalFilePath())))
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
    QDir::setCurrent(programFolder());
    ApplyResourceStrings(this);
    m_timer1.stop();
    m_autoActivateList = { 0, 0 };

    QString configFile;
    if (!m_commandLine.isEmpty()) {
        if (handleServiceSwitch(m_commandLine))
            return;
        configFile = m_commandLine;
    }
    addTrayIcon();
    getprofilesettings(configFile);
    openCommandChannel();
    resetBusInFirstCopy();
    autoActivate();
    m_startUpDone = true;
    notifyServiceReady();
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
        if (QGuiApplication::platformName() == QStringLiteral("offscreen"))
            QTextStream(stderr) << text << '\n';
        else
            UserDialogs::showMessage({ this, text, QStringLiteral("Velloca"),
                                       result.critical ? UserDialogs::Icon::Critical : UserDialogs::Icon::Information });
    }
    Q_EMIT finishedEarly(result.ok ? 0 : 1);
    return true;
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

QString MainWindow::virtualPortFolder() const
{
    return m_virtualPortFolder.isEmpty() ? defaultVirtualPortFolder() : m_virtualPortFolder;
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

QList<SessionWindow *> MainWindow::sessionWindows() const
{
    QList<SessionWindow *> windows;
    for (const QPointer<SessionWindow> &window : m_sessions) {
        if (window)
            windows << window.data();
    }
    return windows;
}

SessionWindow *MainWindow::NewSessionWindow()
{
    auto *engine = new SessionEngine(SessionPlatform::real(virtualPortFolder()));
    auto *window = new SessionWindow(engine);
    engine->setParent(window);
    window->showIOOptionsDialog = [window](bool server) {
        if (server)
            showServerOptionsDialog(window);
        else
            showClientOptionsDialog(window);
    };
    window->showLoginOptionsDialog = [window] { showLoginOptionsDialog(window); };
    QMdiSubWindow *frame = m_ui->mdiArea->addSubWindow(window, Qt::SubWindow | Qt::WindowTitleHint
                                                          | Qt::WindowSystemMenuHint | Qt::WindowMinimizeButtonHint
                                                          | Qt::WindowCloseButtonHint);
    frame->setAttribute(Qt::WA_DeleteOnClose);
    engine->setCaption(LoadResString(5119) + QStringLiteral(" - ") + LoadResString(5120));
    window->show();
    m_sessions.append(window);
    m_ui->mnuFileClose->setEnabled(true);
    return window;
}

void MainWindow::closeAllSessionWindows()
{
    // Deleted at once, newest first, so that their ports are free before a
    // following load opens them again.
    const QList<SessionWindow *> windows = sessionWindows();
    for (auto it = windows.crbegin(); it != windows.crend(); ++it)
        delete (*it)->parentWidget();
    m_sessions.clear();
    m_ui->mnuFileClose->setEnabled(false);
}

void MainWindow::getprofilesettings(const QString &fileName)
{
    const QString path = fileName.isEmpty() ? defaultConfigurationPath() : fileName;
    closeAllSessionWindows();
    const Configuration config = readConfiguration(IniProfile::load(path));

    const double dpi = logicalDpiX() > 0 ? logicalDpiX() : 96.0;
    auto pixels = [dpi](int twips) { return int(std::lround(twips * dpi / kTwipsPerInch)); };
    move(pixels(config.placement.left), pixels(config.placement.top));
    resize(qMax(1, pixels(config.placement.width)), qMax(1, pixels(config.placement.height)));
    if (config.placement.windowState == StateMinimized)
        setWindowState(Qt::WindowMinimized);
    else if (config.placement.windowState == StateMaximized)
        setWindowState(Qt::WindowMaximized);
    else
        setWindowState(Qt::WindowNoState);

    GlobalOptions::global() = config.options;
    PortMap::global().clear();
    for (auto it = config.ports.cbegin(); it != config.ports.cend(); ++it)
        PortMap::global().setDevice(it.key(), it.value());
    m_virtualPortFolder = config.virtualPortFolder;

    if (config.NumSessions == 0) {
        NewSessionWindow();
        return;
    }
    m_autoActivateList = QList<int>(qMax(0, int(config.sessions.size())) + 2, 0);
    for (int n = 1; n <= config.sessions.size(); ++n) {
        const SessionConfig &session = config.sessions[n - 1];
        NewSessionWindow()->applyConfiguration(session);
        if (session.AutoActivate == 1)
            m_autoActivateList[n] = 1;
    }
}

void MainWindow::writeprofilesettings(const QString &fileName)
{
    const QString path = fileName.isEmpty() ? defaultConfigurationPath() : fileName;
    IniProfile profile = IniProfile::load(path);
    Configuration config;
    const double dpi = logicalDpiX() > 0 ? logicalDpiX() : 96.0;
    auto twips = [dpi](int pixels) { return int(std::lround(pixels * kTwipsPerInch / dpi)); };
    const QRect placement = normalGeometry().isValid() ? normalGeometry() : geometry();
    config.placement.left = twips(x());
    config.placement.top = twips(y());
    config.placement.width = twips(placement.width());
    config.placement.height = twips(placement.height());
    config.placement.windowState = isMinimized() ? StateMinimized : isMaximized() ? StateMaximized : StateNormal;
    config.options = GlobalOptions::global();
    for (SessionWindow *window : sessionWindows())
        config.sessions << window->currentConfiguration();
    writeConfiguration(profile, config, !isMinimized());
    QString error;
    if (!SetAutoStart(GlobalOptions::global().LoadWithWindows == 1, QCoreApplication::applicationFilePath(), &error))
        qWarning("velloca: autostart entry not changed: %s", qPrintable(error));
    if (!profile.save(path, &error))
        qWarning("velloca: configuration not saved: %s", qPrintable(error));
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

void MainWindow::mnuFileNew_Click()
{
    NewSessionWindow();
}

void MainWindow::mnuFileOpen_Click()
{
    const auto file = UserDialogs::askFileName({ this, QString(), kFileFilter, QString(), false });
    if (!file)
        return;
    m_currentConfigFile = *file;
    getprofilesettings(m_currentConfigFile);
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
    if (m_startUpDone)
        writeprofilesettings(QString());
    closeAllSessionWindows();
    if (m_trayIcon)
        m_trayIcon->hide();
    QMetaObject::invokeMethod(qApp, &QCoreApplication::quit, Qt::QueuedConnection);
}
