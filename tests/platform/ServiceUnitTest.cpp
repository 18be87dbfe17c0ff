#include "platform/ServiceNotifier.h"
#include "platform/ServiceSwitch.h"
#include "platform/ServiceUnit.h"
#include "support/Wait.h"

#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QProcess>
#include <QStandardPaths>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace {

// Stands in for systemctl: records each call's arguments in calls.log next
// to itself, fails a verb when a file fail-<verb> is there and hangs when a
// file hang is there.
const char kFakeSystemctl[] = R"(#!/bin/sh
here=$(dirname "$0")
echo "$*" >> "$here/calls.log"
for word in "$@"; do
    case "$word" in --*) ;; *) verb=$word; break ;; esac
done
[ -e "$here/hang" ] && exec sleep 60
if [ -e "$here/fail-$verb" ]; then
    echo "Failed to $verb unit: Access denied" >&2
    exit 1
fi
exit 0
)";

bool writeFile(const QString &path, const QByteArray &data, QFile::Permissions permissions = {})
{
    QFile file(path);
    if (!file.open(QIODevice::WriteOnly) || file.write(data) != data.size())
        return false;
    return permissions == QFile::Permissions() || file.setPermissions(permissions);
}

QString readFile(const QString &path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? QString::fromUtf8(file.readAll()) : QString();
}

constexpr QFile::Permissions kExecutable = QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner;

class ServiceUnitTest : public ::testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_TRUE(m_dir.isValid());
        ASSERT_TRUE(QDir(m_dir.path()).mkpath(QStringLiteral("bin")));
        ASSERT_TRUE(writeFile(binFile(QStringLiteral("systemctl")), kFakeSystemctl, kExecutable));
        m_paths.unitFolder = m_dir.filePath(QStringLiteral("units"));
        m_paths.systemctl = binFile(QStringLiteral("systemctl"));
        m_paths.systemScope = false;
        m_paths.configHome = m_dir.filePath(QStringLiteral("config"));
        m_paths.commandTimeoutMs = 10000;
    }

    QString binFile(const QString &name) const { return m_dir.filePath(QStringLiteral("bin/") + name); }
    QString unitPath() const { return m_paths.unitFolder + QStringLiteral("/velloca.service"); }
    QStringList calls() const
    {
        return readFile(binFile(QStringLiteral("calls.log"))).split(u'\n', Qt::SkipEmptyParts);
    }
    void clearCalls() const { QFile::remove(binFile(QStringLiteral("calls.log"))); }
    void failVerb(const QString &verb) const
    {
        ASSERT_TRUE(writeFile(binFile(QStringLiteral("fail-") + verb), {}));
    }

    QTemporaryDir m_dir;
    ServicePaths m_paths;
};

} // namespace

TEST(ServiceSwitch, OnlyTheWholeTrimmedCommandLineIsASwitch)
{
    const struct {
        const char *commandLine;
        ServiceSwitch expected;
    } cases[] = {
        { "-I", ServiceSwitch::Install },         { "/i", ServiceSwitch::Install },
        { "  -i  ", ServiceSwitch::Install },     { "-IH", ServiceSwitch::InstallHidden },
        { " /ih", ServiceSwitch::InstallHidden }, { "-Ih ", ServiceSwitch::InstallHidden },
        { "-u", ServiceSwitch::Uninstall },       { "\t/U ", ServiceSwitch::Uninstall },
        { "", ServiceSwitch::None },              { "-I extra", ServiceSwitch::None },
        { "\"-I\"", ServiceSwitch::None },        { "I", ServiceSwitch::None },
        { "-IHX", ServiceSwitch::None },          { "my -U.vlk", ServiceSwitch::None },
    };
    for (const auto &c : cases)
        EXPECT_EQ(parseServiceSwitch(QString::fromUtf8(c.commandLine)), c.expected) << c.commandLine;
}

TEST_F(ServiceUnitTest, PlainInstallWaitsForTheNetworkAndEnablesTheUserUnit)
{
    const QString program = QStringLiteral("/opt/My Programs/velloca");
    const ServiceResult result = installService(m_paths, program, false);
    EXPECT_TRUE(result.ok) << result.detail.toStdString();
    EXPECT_EQ(result.messageId, kServiceInstalledMessage);
    EXPECT_FALSE(result.critical);
    EXPECT_TRUE(result.detail.isEmpty());

    const QStringList unit = readFile(unitPath()).split(u'\n');
    EXPECT_TRUE(unit.contains(QStringLiteral("Description=RS232 to TCP/IP Converter")));
    EXPECT_TRUE(unit.contains(QStringLiteral("Type=notify")));
    EXPECT_TRUE(unit.contains(QStringLiteral("ExecStart=\"/opt/My Programs/velloca\"")));
    EXPECT_TRUE(unit.contains(QStringLiteral("Wants=network-online.target")));
    EXPECT_TRUE(unit.contains(QStringLiteral("After=network-online.target")));
    EXPECT_TRUE(unit.contains(QStringLiteral("WantedBy=default.target")));
    EXPECT_FALSE(unit.join(u'\n').contains(QStringLiteral("QT_QPA_PLATFORM")));
    // A user service has a home of its own.
    EXPECT_FALSE(unit.join(u'\n').contains(QStringLiteral("XDG_CONFIG_HOME")));
    struct stat info {};
    ASSERT_EQ(::stat(QFile::encodeName(unitPath()).constData(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0644u);
    EXPECT_EQ(calls(), (QStringList { "--user daemon-reload", "--user enable velloca.service" }));
    EXPECT_EQ(QDir(m_paths.unitFolder).entryList(QDir::Files | QDir::Hidden),
              QStringList { "velloca.service" }); // no temporary file left

    // Installing again replaces the unit.
    EXPECT_TRUE(installService(m_paths, QStringLiteral("/usr/bin/velloca"), false).ok);
    EXPECT_TRUE(readFile(unitPath()).contains(QStringLiteral("ExecStart=\"/usr/bin/velloca\"\n")));
}

TEST_F(ServiceUnitTest, HiddenInstallHasNoDependencyNoDisplayAndNoMessage)
{
    m_paths.systemScope = true;
    const ServiceResult result = installService(m_paths, QStringLiteral("/usr/bin/velloca"), true);
    EXPECT_TRUE(result.ok) << result.detail.toStdString();
    EXPECT_EQ(result.messageId, 0);

    const QString unit = readFile(unitPath());
    EXPECT_FALSE(unit.contains(QStringLiteral("network-online")));
    EXPECT_TRUE(unit.contains(QStringLiteral("\nEnvironment=QT_QPA_PLATFORM=offscreen\n")));
    EXPECT_TRUE(unit.contains(QStringLiteral("\nWantedBy=multi-user.target\n")));
    // The system service reads the configuration of the user who installed it.
    EXPECT_TRUE(unit.contains(QStringLiteral("\nEnvironment=\"XDG_CONFIG_HOME=%1\"\n").arg(m_paths.configHome)));
    EXPECT_EQ(calls(), (QStringList { "daemon-reload", "enable velloca.service" }));
}

// systemd's own parser reads the unit back: the executable it resolves must
// be our program, blanks, '%' and '$' included.
TEST_F(ServiceUnitTest, SystemdAcceptsTheUnitForAProgramInAFolderWithBlanks)
{
    const QString analyze = QStandardPaths::findExecutable(QStringLiteral("systemd-analyze"));
    if (analyze.isEmpty())
        GTEST_SKIP() << "systemd-analyze is not installed";
    const QString folder = m_dir.filePath(QStringLiteral("My Programs 100% $HOME"));
    ASSERT_TRUE(QDir().mkpath(folder));
    const QString program = folder + QStringLiteral("/velloca %n");
    ASSERT_TRUE(writeFile(program, "#!/bin/sh\nexit 0\n", kExecutable));
    m_paths.systemScope = true;
    m_paths.configHome = m_dir.filePath(QStringLiteral("home 50%/.config"));

    for (const bool hidden : { false, true }) {
        ASSERT_TRUE(installService(m_paths, program, hidden).ok);
        QProcess verify;
        verify.setProcessChannelMode(QProcess::MergedChannels);
        verify.start(analyze, { QStringLiteral("verify"), unitPath() });
        ASSERT_TRUE(verify.waitForFinished(60000));
        EXPECT_EQ(verify.exitCode(), 0) << "hidden " << hidden << ": " << verify.readAll().toStdString();
    }
    // The same check fails for a program that is not there, so it does look at the path.
    ASSERT_TRUE(installService(m_paths, folder + QStringLiteral("/missing"), false).ok);
    QProcess verify;
    verify.start(analyze, { QStringLiteral("verify"), unitPath() });
    ASSERT_TRUE(verify.waitForFinished(60000));
    EXPECT_NE(verify.exitCode(), 0);
}

TEST_F(ServiceUnitTest, InstallFailuresSayWhatFailedAndWhy)
{
    // A unit folder under a regular file cannot be created, even by root.
    ASSERT_TRUE(writeFile(m_dir.filePath(QStringLiteral("plain-file")), "x"));
    ServicePaths blocked = m_paths;
    blocked.unitFolder = m_dir.filePath(QStringLiteral("plain-file/units"));
    ServiceResult result = installService(blocked, QStringLiteral("/usr/bin/velloca"), false);
    EXPECT_FALSE(result.ok);
    EXPECT_EQ(result.messageId, kServiceInstallFailedMessage);
    EXPECT_TRUE(result.critical);
    EXPECT_TRUE(result.detail.contains(blocked.unitFolder)) << result.detail.toStdString();
    EXPECT_TRUE(result.detail.contains(QStringLiteral("Not a directory"))) << result.detail.toStdString();
    EXPECT_TRUE(calls().isEmpty());

    // Program paths systemd could never start are refused before anything is written.
    for (const QString &program : { QString(), QStringLiteral("velloca"), QStringLiteral("/opt/o'brien/velloca"),
                                    QStringLiteral("/opt/a\\b/velloca"), QStringLiteral("/opt/x\ny/velloca") }) {
        result = installService(m_paths, program, false);
        EXPECT_FALSE(result.ok) << program.toStdString();
        EXPECT_EQ(result.messageId, kServiceInstallFailedMessage);
        EXPECT_FALSE(result.detail.isEmpty());
    }
    EXPECT_FALSE(QFile::exists(unitPath()));

    // systemctl refusing: its command and its own words reach the user.
    failVerb(QStringLiteral("enable"));
    result = installService(m_paths, QStringLiteral("/usr/bin/velloca"), true);
    EXPECT_FALSE(result.ok);
    EXPECT_EQ(result.messageId, kServiceInstallFailedMessage);
    EXPECT_TRUE(result.detail.contains(QStringLiteral("--user enable velloca.service"))) << result.detail.toStdString();
    EXPECT_TRUE(result.detail.contains(QStringLiteral("exit status 1")));
    EXPECT_TRUE(result.detail.contains(QStringLiteral("Failed to enable unit: Access denied")));

    // No systemctl at all.
    ServicePaths noSystemctl = m_paths;
    noSystemctl.systemctl = m_dir.filePath(QStringLiteral("bin/missing-systemctl"));
    result = installService(noSystemctl, QStringLiteral("/usr/bin/velloca"), false);
    EXPECT_FALSE(result.ok);
    EXPECT_TRUE(result.detail.startsWith(QStringLiteral("Cannot run ") + noSystemctl.systemctl))
        << result.detail.toStdString();

    // A systemctl that never answers is given up on after the time-out.
    ASSERT_TRUE(writeFile(binFile(QStringLiteral("hang")), {}));
    m_paths.commandTimeoutMs = 300;
    result = installService(m_paths, QStringLiteral("/usr/bin/velloca"), false);
    EXPECT_FALSE(result.ok);
    EXPECT_TRUE(result.detail.contains(QStringLiteral("daemon-reload did not finish within 0.3 s")))
        << result.detail.toStdString();
}

TEST_F(ServiceUnitTest, UninstallStopsDisablesAndRemovesTheUnit)
{
    ASSERT_TRUE(installService(m_paths, QStringLiteral("/usr/bin/velloca"), false).ok);
    clearCalls();

    // The switch as typed on the command line.
    ServiceResult result = runServiceSwitch(parseServiceSwitch(QStringLiteral(" -u ")), QString(), m_paths);
    EXPECT_TRUE(result.ok) << result.detail.toStdString();
    EXPECT_EQ(result.messageId, kServiceUninstalledMessage);
    EXPECT_FALSE(QFile::exists(unitPath()));
    EXPECT_EQ(calls(), (QStringList { "--user disable --now velloca.service", "--user daemon-reload" }));

    // Nothing installed: a failure that names the missing unit, and no systemctl call.
    clearCalls();
    result = uninstallService(m_paths);
    EXPECT_FALSE(result.ok);
    EXPECT_EQ(result.messageId, kServiceUninstallFailedMessage);
    EXPECT_FALSE(result.critical);
    EXPECT_TRUE(result.detail.contains(unitPath())) << result.detail.toStdString();
    EXPECT_TRUE(calls().isEmpty());

    // systemctl refusing to disable: the unit stays, so the service is still whole.
    ASSERT_TRUE(installService(m_paths, QStringLiteral("/usr/bin/velloca"), false).ok);
    failVerb(QStringLiteral("disable"));
    result = uninstallService(m_paths);
    EXPECT_FALSE(result.ok);
    EXPECT_EQ(result.messageId, kServiceUninstallFailedMessage);
    EXPECT_TRUE(result.detail.contains(QStringLiteral("Failed to disable unit: Access denied")));
    EXPECT_TRUE(QFile::exists(unitPath()));

    // Not a switch: nothing happens.
    clearCalls();
    result = runServiceSwitch(parseServiceSwitch(QStringLiteral("my.vlk")), QString(), m_paths);
    EXPECT_TRUE(result.ok);
    EXPECT_EQ(result.messageId, 0);
    EXPECT_TRUE(calls().isEmpty());
}

namespace {

// A datagram socket standing in for systemd's notification socket.
class NotifySocket
{
public:
    explicit NotifySocket(const QString &path) : m_fd(::socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK, 0))
    {
        sockaddr_un address {};
        address.sun_family = AF_UNIX;
        const QByteArray name = QFile::encodeName(path);
        if (m_fd < 0 || size_t(name.size()) >= sizeof address.sun_path)
            return;
        qstrcpy(address.sun_path, name.constData());
        m_bound = ::bind(m_fd, reinterpret_cast<sockaddr *>(&address), sizeof address) == 0;
    }
    ~NotifySocket()
    {
        if (m_fd >= 0)
            ::close(m_fd);
    }
    bool isBound() const { return m_bound; }
    QByteArray nextMessage()
    {
        QByteArray message;
        waitUntil([&] {
            char buffer[512];
            const ssize_t length = ::recv(m_fd, buffer, sizeof buffer, 0);
            if (length > 0)
                message = QByteArray(buffer, length);
            return length > 0;
        });
        return message;
    }

private:
    int m_fd;
    bool m_bound = false;
};

class EnvironmentRestorer
{
public:
    explicit EnvironmentRestorer(const char *name)
        : m_name(name), m_wasSet(qEnvironmentVariableIsSet(name)), m_value(qgetenv(name))
    {
    }
    ~EnvironmentRestorer()
    {
        if (m_wasSet)
            qputenv(m_name, m_value);
        else
            qunsetenv(m_name);
    }

private:
    const char *m_name;
    bool m_wasSet;
    QByteArray m_value;
};

} // namespace

TEST(ServiceNotifier, ReadyAndStoppingReachSystemdAndAreHarmlessWithout)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const EnvironmentRestorer restorer("NOTIFY_SOCKET");
    const QString socketPath = dir.filePath(QStringLiteral("notify"));
    NotifySocket socket(socketPath);
    ASSERT_TRUE(socket.isBound());

    qputenv("NOTIFY_SOCKET", QFile::encodeName(socketPath));
    EXPECT_TRUE(notifyServiceReady());
    EXPECT_EQ(socket.nextMessage(), QByteArray("READY=1"));
    EXPECT_TRUE(notifyServiceStopping());
    EXPECT_EQ(socket.nextMessage(), QByteArray("STOPPING=1"));

    qunsetenv("NOTIFY_SOCKET");
    EXPECT_FALSE(notifyServiceReady());
    qputenv("NOTIFY_SOCKET", QFile::encodeName(dir.filePath(QStringLiteral("gone"))));
    EXPECT_FALSE(notifyServiceReady());
    EXPECT_FALSE(notifyServiceStopping());
}
