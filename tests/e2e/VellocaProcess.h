#pragma once

#include <QByteArray>
#include <QList>
#include <QProcess>
#include <QProcessEnvironment>
#include <QString>
#include <QStringList>
#include <QTemporaryDir>

#include <functional>

// The velloca program run as a child process with a private home: its
// configuration folder ($XDG_CONFIG_HOME/velloca) and runtime folder
// ($XDG_RUNTIME_DIR, mode 0700) live in a temporary directory, and with no
// display variables it runs on the offscreen platform. A process still
// running when this object goes away is killed.
class VellocaProcess
{
public:
    // With sameHomeAs, a second copy of the program in that one's home.
    explicit VellocaProcess(const VellocaProcess *sameHomeAs = nullptr);
    ~VellocaProcess();
    VellocaProcess(const VellocaProcess &) = delete;
    VellocaProcess &operator=(const VellocaProcess &) = delete;

    // The program built next to the tests: $VELLOCA_BUILD_DIR/velloca, or
    // the test program's own folder when that variable is not set.
    static QString programPath();

    bool isValid() const { return !m_home.isEmpty(); }
    QString rootPath() const { return m_home; }
    QString configHome() const;      // $XDG_CONFIG_HOME
    QString configFolder() const;    // $XDG_CONFIG_HOME/velloca
    QString runtimeFolder() const;   // $XDG_RUNTIME_DIR
    QString virtualPortFolder() const; // default folder of the virtual port links
    QString defaultConfigPath() const;
    QString errorLogPath() const;

    // Writes default.vlk with this text unless it is null, then starts the
    // program with the arguments. False when the program could not start.
    bool start(const QByteArray &defaultConfiguration, const QStringList &arguments = {});
    // For the next start: the folder it runs in (default: rootPath()), an
    // environment variable, and whether stdin, stdout and stderr are closed.
    void setWorkingDirectory(const QString &folder) { m_workingDirectory = folder; }
    void setEnvironmentValue(const QString &name, const QString &value) { m_extraEnvironment.insert(name, value); }
    void setStandardDescriptorsClosed(bool closed) { m_closeStandardDescriptors = closed; }

    bool isRunning() const;
    qint64 processId() const;
    // Waits until the start-up sequence has run: the running copy then holds
    // its single-instance lock in the virtual port folder.
    bool waitForStartUp(int timeoutMs = 10000);

    QString errorLog() const;
    QStringList logLines() const;
    // Waits until errorlog.txt has a line containing the text.
    bool waitForLogLine(const QString &substring, int timeoutMs = 10000);
    bool waitForLogLine(const std::function<bool(const QString &line)> &matches, int timeoutMs = 10000);

    // Sends SIGTERM and waits at most timeoutMs for the exit; true when the
    // program ended in time.
    bool terminate(int timeoutMs = 2000);
    bool waitForExit(int timeoutMs = 10000);
    int exitCode() const { return m_process.exitCode(); }
    QProcess::ExitStatus exitStatus() const { return m_process.exitStatus(); }
    // What the program wrote to stderr so far (kept for failure messages).
    QByteArray standardError();
    // Why the program could not be started or ended abnormally.
    QString errorString() const { return m_process.errorString(); }

    // Processes that carry this run's environment: the program and anything
    // it started, even after they were orphaned.
    QList<qint64> processesOfThisRun() const;

private:
    QTemporaryDir m_root;
    QString m_home;
    QString m_workingDirectory;
    QProcessEnvironment m_extraEnvironment;
    bool m_closeStandardDescriptors = false;
    QProcess m_process;
    QByteArray m_stderr;
};
