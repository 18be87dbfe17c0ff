#pragma once

#include "config/ConfigurationFile.h"
#include "platform/ServiceUnit.h"

#include <QList>
#include <QObject>
#include <QString>

#include <functional>
#include <memory>

class CommandChannel;
class FileLock;
class QLockFile;
class SessionEngine;

// Everything that concerns all sessions, with no window: creating and
// numbering them, loading and saving the configuration, the start-up
// (service switches, auto-activation), the command channel and its topics,
// the locks, the virtual port folder and the service manager. The desktop
// shows what it holds; headless it runs alone.
class SessionManager : public QObject
{
    Q_OBJECT
public:
    explicit SessionManager(QObject *parent = nullptr);
    ~SessionManager() override;

    // How the user is told something: a box with a display; stderr by default.
    std::function<void(const QString &text, bool critical)> tellUser;
    // Headless a configuration that cannot be loaded ends the start-up with
    // status 2; with a display the user is told and the program goes on.
    bool headless = true;
    ServicePaths servicePaths;

    QList<SessionEngine *> sessions() const { return m_sessions; }
    // A new session with a new window's settings, numbered last; null past
    // the most sessions the program opens.
    SessionEngine *addSession();
    void removeSession(SessionEngine *session);
    SessionEngine *sessionForTopic(const QString &topic) const;
    // A command from another program; true when it was accepted.
    bool executeCommand(const QString &topic, const QString &command);

    // Loads a file (the default file for an empty name) in place of every
    // session. False, with nothing changed, when it cannot be loaded; error
    // then names the file and the cause. A missing default file loads empty.
    bool load(const QString &fileName, QString *error);
    // Saves into a file (the default file for an empty name); false, after
    // telling the user and the error log, when it could not be written.
    bool save(const QString &fileName);
    // The main window keys: as loaded until a view puts in its own. While
    // writePlacement is false (a minimized window) the geometry keys keep
    // their old values.
    MainWindowPlacement placement;
    bool writePlacement = true;

    // A service switch on the command line is carried out and ends the
    // program (finished); true when there was one.
    bool handleServiceSwitch(const QString &commandLine);
    // Loads (the named file, else the default file), locks the default
    // file, opens the command channel, cleans the virtual port folder,
    // activates the sessions saved as active and tells the service manager.
    // False when the program ends here (finished was raised).
    bool startUp(const QString &commandLine);
    bool startUpDone() const { return m_startUpDone; }
    // Saves (when this run may) and tells the service manager; once.
    void shutDown();

Q_SIGNALS:
    void sessionAdded(SessionEngine *session);
    // Raised before the session is deleted.
    void sessionRemoved(SessionEngine *session);
    // A load replaced the sessions; placement holds its window keys.
    void loaded();
    void exitRequested();
    void finished(int exitStatus);

private:
    void removeAllSessions();
    bool loadAtStartUp(const QString &namedFile);
    bool reportLoadFailure(const QString &error);
    void reportSaveFailure(const QString &error);
    void takeConfigurationLock();
    void openCommandChannel();
    void resetBusInFirstCopy();
    void autoActivate();
    QString virtualPortFolder() const;
    QString programPath() const;

    QList<SessionEngine *> m_sessions;
    QList<int> m_autoActivateList;
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
    bool m_shutDown = false;
};
