#pragma once

#include "config/ConfigurationFile.h"
#include "platform/ServiceUnit.h"

#include <QList>
#include <QMainWindow>
#include <QPointer>
#include <QTimer>

#include <functional>
#include <memory>
#include <optional>

class CommandChannel;
class FileLock;
class QLockFile;
class QMdiSubWindow;
class QMenu;
class QSystemTrayIcon;
class SessionWindow;
namespace Ui { class MainWindow; }

// The program's frame: holds the session windows, runs the start-up
// sequence once, loads and saves configurations, hides in the tray and
// saves everything to the default file when it ends.
class MainWindow : public QMainWindow
{
    Q_OBJECT
public:
    // commandLine: the program's arguments joined by blanks, as one text.
    explicit MainWindow(QString commandLine, QWidget *parent = nullptr);
    ~MainWindow() override;

    // Load / save a configuration; an empty name means the default file.
    // False, with nothing changed, when the file cannot be loaded; error
    // then names the file and the cause. A named file must exist; a missing
    // default file loads as empty.
    bool getprofilesettings(const QString &fileName, QString *error = nullptr);
    // False, after telling the user, when the file could not be written.
    bool writeprofilesettings(const QString &fileName);
    SessionWindow *NewSessionWindow();
    // Session windows in creation order (session 1, 2, ...).
    QList<SessionWindow *> sessionWindows() const;

    // Ends the program about half a second from now, so that the command
    // that asked for it can still be answered.
    void requestExit();
    // A command from another program for a topic: "System" (this window),
    // "Session<n>" (session n) or a connector such as "COM3". True when
    // accepted.
    bool executeCommand(const QString &topic, const QString &command);
    bool startUpDone() const { return m_startUpDone; }
    bool hasShutDown() const { return m_shutDown; }
    QString currentConfigFile() const { return m_currentConfigFile; }
    bool trayIconAdded() const { return m_trayIcon != nullptr; }

    // Asks for the password before the window is shown again; replaced by
    // tests. Returns the entry, or nothing when the user cancelled.
    std::function<std::optional<QString>()> askPassword;
    // Where the service switches put the unit and which systemctl they run.
    ServicePaths servicePaths = defaultServicePaths();

    // Menu commands, public so tests and other windows can run them.
    void mnuFileNew_Click();
    void mnuFileOpen_Click();
    void mnuFileClose_Click();
    void mnuFileSave_Click();
    void mnuFileSaveAs_Click();
    void mnuFileExit_Click();
    void mnuOpen_Click();
    void mnuExit_Click();
    void runStartUpNow();

Q_SIGNALS:
    // A service switch was handled: the program ends with this status.
    void finishedEarly(int exitStatus);

protected:
    void changeEvent(QEvent *event) override;
    void closeEvent(QCloseEvent *event) override;

private:
    void Timer1_Tick();
    void StartUpSequence();
    bool handleServiceSwitch(const QString &commandLine);
    void wireDialogs();
    void showHelpContents();
    void addTrayIcon();
    void openCommandChannel();
    void resetBusInFirstCopy();
    bool loadStartUpConfiguration(const QString &namedFile);
    bool reportLoadFailure(const QString &error);
    void takeConfigurationLock();
    void tellUser(const QString &text, bool critical);
    void reportSaveFailure(const QString &error);
    bool isHeadless() const;
    void autoActivate();
    void handleWindowStateChange();
    void restoreCheck();
    void shutdown();
    void closeAllSessionWindows();
    void rebuildWindowMenu();
    void wireMenus();
    void showTrayPopup();
    QString virtualPortFolder() const;
    SessionWindow *sessionForTopic(const QString &topic) const;

    std::unique_ptr<Ui::MainWindow> m_ui;
    QString m_commandLine;
    QTimer m_timer1;
    QList<QPointer<SessionWindow>> m_sessions;
    QList<int> m_autoActivateList;
    QString m_currentConfigFile;
    QSystemTrayIcon *m_trayIcon = nullptr;
    QMenu *m_trayMenu = nullptr;
    CommandChannel *m_commandChannel = nullptr;
    std::unique_ptr<QLockFile> m_instanceLock;
    std::unique_ptr<FileLock> m_configurationLock;
    QString m_loadedConfigPath; // the file the sessions came from
    DeviceSettings m_loadedDevices;
    SurplusSessions m_surplusSessions;
    // Only a run whose configuration was loaded, and that holds the lock on
    // the default file, writes it at exit.
    bool m_exitSaveAllowed = false;
    bool m_startUpDone = false;
    bool m_exitRequested = false;
    bool m_resizeBusy = false;
    bool m_mainWindowLocked = false;
    bool m_shutDown = false;
};
