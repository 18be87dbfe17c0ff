#pragma once

#include <QHash>
#include <QList>
#include <QMainWindow>
#include <QPointer>
#include <QTimer>

#include <functional>
#include <memory>
#include <optional>

class QMdiSubWindow;
class QMenu;
class QSystemTrayIcon;
class SessionEngine;
class SessionManager;
class SessionWindow;
namespace Ui { class MainWindow; }

// The program's frame over the session manager: shows a window for each of
// its sessions, runs its start-up once, offers its loads and saves in the
// menus, hides in the tray and has it save everything when it ends.
class MainWindow : public QMainWindow
{
    Q_OBJECT
public:
    // commandLine: the program's arguments joined by blanks, as one text.
    // Without a manager the window makes its own.
    explicit MainWindow(QString commandLine, SessionManager *manager = nullptr, QWidget *parent = nullptr);
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
    bool startUpDone() const;
    SessionManager *manager() const { return m_manager; }
    bool hasShutDown() const { return m_shutDown; }
    QString currentConfigFile() const { return m_currentConfigFile; }

    // Asks for the password before the window is shown again; replaced by
    // tests. Returns the entry, or nothing when the user cancelled.
    std::function<std::optional<QString>()> askPassword;
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
    // The start-up ended the program (a service switch, or a file that
    // cannot be loaded headless): it ends with this status.
    void finishedEarly(int exitStatus);

protected:
    void changeEvent(QEvent *event) override;
    void closeEvent(QCloseEvent *event) override;

private:
    void Timer1_Tick();
    void StartUpSequence();
    void wireDialogs();
    void showHelpContents();
    void addTrayIcon();
    void tellUser(const QString &text, bool critical);
    bool isHeadless() const;
    void showSession(SessionEngine *session);
    void takePlacement();
    void putPlacement();
    void handleWindowStateChange();
    void restoreCheck();
    void shutdown();
    void rebuildWindowMenu();
    void wireMenus();
    void showTrayPopup();

    std::unique_ptr<Ui::MainWindow> m_ui;
    QString m_commandLine;
    QTimer m_timer1;
    SessionManager *m_manager;
    QHash<SessionEngine *, QPointer<SessionWindow>> m_windows;
    QString m_currentConfigFile;
    QSystemTrayIcon *m_trayIcon = nullptr;
    QMenu *m_trayMenu = nullptr;
    bool m_exitRequested = false;
    bool m_resizeBusy = false;
    bool m_mainWindowLocked = false;
    bool m_shutDown = false;
};
