// Loading and saving configurations into and from the session windows.
#include "MainWindow.h"
#include "ui_MainWindow.h"

#include "config/GlobalOptions.h"
#include "config/IniProfile.h"
#include "dialogs/ClientOptionsDialog.h"
#include "dialogs/LoginOptionsDialog.h"
#include "dialogs/ServerOptionsDialog.h"
#include "localisation/ResourceStrings.h"
#include "platform/AutostartEntry.h"
#include "platform/PortMap.h"
#include "platform/VirtualPortFolder.h"
#include "session/ErrorLog.h"
#include "session/SessionEngine.h"
#include "session/SessionWindow.h"
#include "session/UserDialogs.h"

#include <QCoreApplication>
#include <QFileInfo>
#include <QMdiSubWindow>
#include <QTextStream>

#include <cmath>

namespace {

constexpr double kTwipsPerInch = 1440.0;

enum WindowStateValue { StateNormal = 0, StateMinimized = 1, StateMaximized = 2 };

} // namespace

QString MainWindow::virtualPortFolder() const
{
    const QString &folder = m_loadedDevices.virtualPortFolder;
    return folder.isEmpty() ? defaultVirtualPortFolder() : folder;
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

bool MainWindow::getprofilesettings(const QString &fileName, QString *error)
{
    const QString path = fileName.isEmpty() ? defaultConfigurationPath() : fileName;
    QString loadError;
    const IniProfile profile = IniProfile::load(path, &loadError);
    if (loadError.isEmpty() && !fileName.isEmpty() && !QFileInfo::exists(path))
        loadError = QStringLiteral("Cannot read %1: no such file").arg(path);
    if (!loadError.isEmpty()) {
        if (error)
            *error = loadError;
        return false;
    }
    closeAllSessionWindows();
    const Configuration config = readConfiguration(profile);
    m_loadedConfigPath = path;
    m_loadedDevices = config.devices;
    m_surplusSessions = config.surplus;

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

    if (config.NumSessions == 0) {
        NewSessionWindow();
        return true;
    }
    m_autoActivateList = QList<int>(qMax(0, int(config.sessions.size())) + 2, 0);
    for (int n = 1; n <= config.sessions.size(); ++n) {
        const SessionConfig &session = config.sessions[n - 1];
        NewSessionWindow()->applyConfiguration(session);
        if (session.AutoActivate == 1)
            m_autoActivateList[n] = 1;
    }
    return true;
}

bool MainWindow::writeprofilesettings(const QString &fileName)
{
    const QString path = fileName.isEmpty() ? defaultConfigurationPath() : fileName;
    QString error;
    IniProfile profile = IniProfile::load(path, &error);
    // What cannot be read cannot be kept: saving would drop its lines.
    if (!error.isEmpty()) {
        reportSaveFailure(error);
        return false;
    }
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
    config.surplus = m_surplusSessions;
    config.devices = m_loadedDevices;
    config.writeDevices = QFileInfo(path).absoluteFilePath() != QFileInfo(m_loadedConfigPath).absoluteFilePath();
    writeConfiguration(profile, config, !isMinimized());
    if (!SetAutoStart(GlobalOptions::global().LoadWithWindows == 1, QCoreApplication::applicationFilePath(), &error))
        qWarning("velloca: autostart entry not changed: %s", qPrintable(error));
    if (!profile.save(path, &error)) {
        reportSaveFailure(error);
        return false;
    }
    return true;
}

void MainWindow::reportSaveFailure(const QString &error)
{
    const QString text = LoadResString(5204) + u' ' + error;
    writeErrorLogLine(ErrorLogContext(), text, GlobalOptions::global());
    // A box at exit would hold up a logout or a service stop; any other save
    // was asked for from a menu.
    if (m_shutDown)
        QTextStream(stderr) << "velloca: " << text << '\n';
    else
        UserDialogs::showMessage({ this, text, QStringLiteral("Velloca"), UserDialogs::Icon::Critical });
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
