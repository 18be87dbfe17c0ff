#include "SessionManager.h"

#include "ErrorLog.h"
#include "SessionEngine.h"
#include "config/GlobalOptions.h"
#include "localisation/ResourceStrings.h"
#include "platform/AutostartEntry.h"
#include "platform/CommandChannel.h"
#include "platform/FileLock.h"
#include "platform/PortMap.h"
#include "platform/ServiceNotifier.h"
#include "platform/ServiceSwitch.h"
#include "platform/VirtualPortFolder.h"

#include <QCoreApplication>
#include <QFileInfo>
#include <QLockFile>
#include <QRegularExpression>
#include <QTextStream>

SessionManager::SessionManager(QObject *parent)
    : QObject(parent)
{
    tellUser = [](const QString &text, bool) { QTextStream(stderr) << "velloca: " << text << '\n'; };
}

SessionManager::~SessionManager() = default;

QString SessionManager::programPath() const
{
    // The desktop program runs beside velloca; what starts at login or as a
    // service is velloca, which finds the display itself.
    const QString program = QCoreApplication::applicationFilePath();
    const QString daemon = QFileInfo(program).absolutePath() + QStringLiteral("/velloca");
    return program.endsWith(QStringLiteral("/velloca-desktop")) && QFileInfo(daemon).isExecutable() ? daemon : program;
}

QString SessionManager::virtualPortFolder() const
{
    const QString &folder = m_loadedDevices.virtualPortFolder;
    return folder.isEmpty() ? defaultVirtualPortFolder() : folder;
}

SessionEngine *SessionManager::addSession()
{
    if (m_sessions.size() >= kMaxSessionsRead)
        return nullptr;
    auto *session = new SessionEngine(SessionPlatform::real(virtualPortFolder()), this);
    m_sessions.append(session);
    Q_EMIT sessionAdded(session);
    return session;
}

void SessionManager::removeSession(SessionEngine *session)
{
    if (!m_sessions.removeOne(session))
        return;
    Q_EMIT sessionRemoved(session);
    delete session;
}

void SessionManager::removeAllSessions()
{
    // Newest first, and at once, so that their ports are free before a
    // following load opens them again.
    while (!m_sessions.isEmpty())
        removeSession(m_sessions.constLast());
}

SessionEngine *SessionManager::sessionForTopic(const QString &topic) const
{
    static const QRegularExpression numbered(QStringLiteral("^Session([0-9]{1,9})$"),
                                             QRegularExpression::CaseInsensitiveOption);
    if (const auto match = numbered.match(topic); match.hasMatch()) {
        const int n = match.captured(1).toInt();
        return n >= 1 && n <= m_sessions.size() ? m_sessions[n - 1] : nullptr;
    }
    // Several sessions may share a connector name; the first one answers.
    for (SessionEngine *session : m_sessions) {
        if (session->commandTopic().compare(topic, Qt::CaseInsensitive) == 0)
            return session;
    }
    return nullptr;
}

bool SessionManager::executeCommand(const QString &topic, const QString &command)
{
    if (topic.compare(QStringLiteral("System"), Qt::CaseInsensitive) == 0) {
        if (command.toUpper().trimmed() != QStringLiteral("[APPEXIT]"))
            return false;
        Q_EMIT exitRequested();
        return true;
    }
    SessionEngine *session = sessionForTopic(topic);
    return session && session->executeCommand(command);
}

bool SessionManager::load(const QString &fileName, QString *error)
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
    removeAllSessions();
    const Configuration config = readConfiguration(profile);
    m_loadedConfigPath = path;
    m_loadedDevices = config.devices;
    m_surplusSessions = config.surplus;
    placement = config.placement;
    // A file loaded after start-up (File -> Open) is what an exit saves.
    if (m_startUpDone)
        m_exitSaveAllowed = m_configurationLock != nullptr;
    GlobalOptions::global() = config.options;
    PortMap::global().clear();
    for (auto it = config.ports.cbegin(); it != config.ports.cend(); ++it)
        PortMap::global().setDevice(it.key(), it.value());

    m_autoActivateList = QList<int>(config.sessions.size() + 2, 0);
    if (config.NumSessions == 0)
        addSession();
    for (int n = 1; n <= config.sessions.size(); ++n) {
        const SessionConfig &session = config.sessions[n - 1];
        addSession()->applyConfiguration(session);
        if (session.AutoActivate == 1)
            m_autoActivateList[n] = 1;
    }
    Q_EMIT loaded();
    return true;
}

bool SessionManager::save(const QString &fileName)
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
    config.placement = placement;
    config.options = GlobalOptions::global();
    for (SessionEngine *session : m_sessions)
        config.sessions << session->currentConfiguration();
    config.surplus = m_surplusSessions;
    config.devices = m_loadedDevices;
    config.writeDevices = QFileInfo(path).absoluteFilePath() != QFileInfo(m_loadedConfigPath).absoluteFilePath();
    writeConfiguration(profile, config, writePlacement);
    if (!SetAutoStart(GlobalOptions::global().LoadWithWindows == 1, programPath(), &error))
        qWarning("velloca: autostart entry not changed: %s", qPrintable(error));
    if (!profile.save(path, &error)) {
        reportSaveFailure(error);
        return false;
    }
    return true;
}

void SessionManager::reportSaveFailure(const QString &error)
{
    const QString text = LoadResString(5204) + u' ' + error;
    writeErrorLogLine(ErrorLogContext(), text, GlobalOptions::global());
    // Nobody is left to answer a box at exit (a logout, a service stop).
    if (m_shutDown)
        QTextStream(stderr) << "velloca: " << text << '\n';
    else
        tellUser(text, true);
}

bool SessionManager::handleServiceSwitch(const QString &commandLine)
{
    const ServiceSwitch serviceSwitch = parseServiceSwitch(commandLine);
    if (serviceSwitch == ServiceSwitch::None)
        return false;
    const ServiceResult result = runServiceSwitch(serviceSwitch, programPath(), servicePaths);
    if (result.messageId != 0) {
        QString text = QString::fromLatin1(kServiceDisplayName) + u' ' + LoadResString(result.messageId);
        if (!result.detail.isEmpty())
            text += u'\n' + result.detail;
        // The result is the program's last word, so it is not prefixed.
        if (headless)
            QTextStream(stderr) << text << '\n';
        else
            tellUser(text, result.critical);
    }
    Q_EMIT finished(result.ok ? 0 : 1);
    return true;
}

bool SessionManager::startUp(const QString &commandLine)
{
    m_autoActivateList = { 0, 0 };
    // The working folder is never changed: a relative file name on the
    // command line means the folder the program was started in.
    const QString namedFile = commandLine.isEmpty() ? QString() : QFileInfo(commandLine).absoluteFilePath();
    if (!loadAtStartUp(namedFile))
        return false;
    takeConfigurationLock();
    openCommandChannel();
    resetBusInFirstCopy();
    autoActivate();
    m_startUpDone = true;
    notifyServiceReady();
    return true;
}

bool SessionManager::loadAtStartUp(const QString &namedFile)
{
    QString error;
    if (!namedFile.isEmpty()) {
        if (load(namedFile, &error)) {
            m_exitSaveAllowed = true;
            return true;
        }
        if (!reportLoadFailure(error))
            return false;
    }
    if (load(QString(), &error)) {
        m_exitSaveAllowed = true;
        return true;
    }
    if (!reportLoadFailure(error))
        return false;
    // Nothing could be loaded: the user gets a new session, and the file
    // that failed is never overwritten.
    tellUser(LoadResString(5202), false);
    addSession();
    return true;
}

// Headless nobody could answer for the lost file: the program ends before it
// writes anything. With a display the user is told and the program goes on.
bool SessionManager::reportLoadFailure(const QString &error)
{
    if (headless) {
        QTextStream(stderr) << "velloca: " << LoadResString(5201) << ' ' << error << '\n';
        Q_EMIT finished(2);
        return false;
    }
    tellUser(LoadResString(5201) + u'\n' + error, true);
    return true;
}

void SessionManager::takeConfigurationLock()
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

void SessionManager::openCommandChannel()
{
    m_commandChannel = new CommandChannel(
        [this](const QString &topic, const QString &command) { return executeCommand(topic, command); }, this);
    QString error;
    if (!m_commandChannel->listen(defaultVirtualPortFolder(), &error))
        qWarning("velloca: no command channel: %s", qPrintable(error));
}

void SessionManager::resetBusInFirstCopy()
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

void SessionManager::autoActivate()
{
    for (int n = 1; n <= m_sessions.size() && n < m_autoActivateList.size(); ++n) {
        if (m_autoActivateList[n] != 1)
            continue;
        m_sessions[n - 1]->Command1_Click();
        m_autoActivateList[n] = 0;
    }
}

void SessionManager::shutDown()
{
    if (m_shutDown)
        return;
    m_shutDown = true;
    notifyServiceStopping();
    // Before the configuration was loaded there is nothing to save, and
    // saving would overwrite the file with an empty one.
    if (m_startUpDone && m_exitSaveAllowed)
        save(QString());
}
