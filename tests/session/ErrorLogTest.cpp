#include "config/GlobalOptions.h"
#include "config/ProgramFolder.h"
#include "session/ErrorLog.h"
#include "session/ErrorProgram.h"
#include "support/Wait.h"

#include <QDir>
#include <QFile>
#include <QLocale>
#include <QScopeGuard>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <sys/mount.h>
#include <unistd.h>

namespace {

const QDateTime kMoment(QDate(2004, 7, 14), QTime(16, 5, 9));

ErrorLogContext clientContext()
{
    ErrorLogContext context;
    context.LocalIPAddress = QStringLiteral("127.0.0.1");
    context.TCPOption = 0;
    context.RemoteHost = QStringLiteral("127.0.0.1");
    context.RemotePort = 1000;
    context.LocalPort = 4000;
    return context;
}

ErrorLogContext serverContext()
{
    ErrorLogContext context;
    context.LocalIPAddress = QStringLiteral("192.168.1.20");
    context.TCPOption = 1;
    context.RemoteHost = QStringLiteral("ignored.example");
    context.RemotePort = 1;
    context.LocalPort = 2101;
    return context;
}

QByteArray fileContents(const QString &path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
}

bool writeScript(const QString &path, const QByteArray &text)
{
    QFile file(path);
    if (!file.open(QIODevice::WriteOnly) || file.write(text) != text.size())
        return false;
    file.close();
    return file.setPermissions(QFileDevice::ReadOwner | QFileDevice::WriteOwner
                               | QFileDevice::ExeOwner);
}

class ErrorLogTest : public ::testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_TRUE(m_folder.isValid());
        setProgramFolderForTesting(m_folder.path());
    }
    void TearDown() override { setProgramFolderForTesting({}); }

    QString logPath() const { return m_folder.filePath(QStringLiteral("errorlog.txt")); }

    QTemporaryDir m_folder;
};

} // namespace

TEST(ErrorLogLine, ExactTextForBothRoles)
{
    EXPECT_EQ(errorLogLine(clientContext(), QStringLiteral("TCP/IP Status: Connected"), kMoment)
                  .toStdString(),
              "Velloca Error: TCP/IP Status: Connected, 07-14-2004, 16:05:09, "
              "Velloca IP Address: 127.0.0.1, Client Mode, Remote Host: 127.0.0.1, "
              "RemotePort: 1000");
    EXPECT_EQ(errorLogLine(serverContext(), QStringLiteral("COM Status: Error - Access denied"),
                           QDateTime(QDate(2023, 1, 2), QTime(3, 4, 5)))
                  .toStdString(),
              "Velloca Error: COM Status: Error - Access denied, 01-02-2023, "
              "03:04:05, Velloca IP Address: 192.168.1.20, Server Mode, Local Port: 2101");

    // A user's locale with its own digits and a 12-hour clock changes nothing.
    const QLocale previous;
    QLocale::setDefault(QLocale(QLocale::Arabic, QLocale::Egypt));
    const QString underArabic = errorLogLine(clientContext(), QStringLiteral("x"),
                                             QDateTime(QDate(2004, 12, 31), QTime(23, 59, 58)));
    QLocale::setDefault(previous);
    EXPECT_TRUE(underArabic.startsWith(QStringLiteral("Velloca Error: x, 12-31-2004, 23:59:58, ")))
        << underArabic.toStdString();

    // One event stays one line.
    EXPECT_EQ(errorLogLine(serverContext(), QStringLiteral("first\r\nsecond\nthird"), kMoment)
                  .toStdString(),
              "Velloca Error: first second third, 07-14-2004, 16:05:09, Velloca IP Address: "
              "192.168.1.20, Server Mode, Local Port: 2101");
}

TEST_F(ErrorLogTest, AppendsCrLfLinesOnlyWhenLogging)
{
    GlobalOptions options;
    writeErrorLogLine(clientContext(), QStringLiteral("silent"), options, kMoment);
    EXPECT_FALSE(QFile::exists(logPath()));

    options.LogErrors = 1;
    writeErrorLogLine(clientContext(), QStringLiteral("TCP/IP Status: Connecting..."), options,
                      kMoment);
    writeErrorLogLine(serverContext(), QStringLiteral("Connection refused"), options, kMoment);
    const QByteArray expected
        = (errorLogLine(clientContext(), QStringLiteral("TCP/IP Status: Connecting..."), kMoment)
           + QStringLiteral("\r\n")
           + errorLogLine(serverContext(), QStringLiteral("Connection refused"), kMoment)
           + QStringLiteral("\r\n"))
              .toUtf8();
    EXPECT_EQ(fileContents(logPath()), expected);

    // A folder given with its trailing slash names the same file.
    setProgramFolderForTesting(m_folder.path() + QLatin1Char('/'));
    writeErrorLogLine(clientContext(), QStringLiteral("third"), options, kMoment);
    EXPECT_TRUE(fileContents(logPath()).endsWith(
        (errorLogLine(clientContext(), QStringLiteral("third"), kMoment) + QStringLiteral("\r\n"))
            .toUtf8()));

    // A program folder that does not exist yet is made.
    const QString nested = m_folder.filePath(QStringLiteral("config/velloca"));
    setProgramFolderForTesting(nested);
    writeErrorLogLine(clientContext(), QStringLiteral("fresh"), options, kMoment);
    EXPECT_TRUE(QFile::exists(nested + QStringLiteral("/errorlog.txt")));
}

TEST_F(ErrorLogTest, UnwritableLogIsPassedOver)
{
    GlobalOptions options;
    options.LogErrors = 1;

    // Root writes through any file mode, so a folder stands in for a log
    // that cannot be opened for writing.
    ASSERT_TRUE(QDir(m_folder.path()).mkdir(QStringLiteral("errorlog.txt")));
    writeErrorLogLine(clientContext(), QStringLiteral("lost"), options, kMoment);
    EXPECT_TRUE(QFileInfo(logPath()).isDir());
    ASSERT_TRUE(QDir(m_folder.path()).rmdir(QStringLiteral("errorlog.txt")));

    if (::geteuid() != 0) {
        QFile readOnly(logPath());
        ASSERT_TRUE(readOnly.open(QIODevice::WriteOnly));
        readOnly.write("kept\r\n");
        readOnly.close();
        ASSERT_TRUE(readOnly.setPermissions(QFileDevice::ReadOwner | QFileDevice::ReadGroup
                                            | QFileDevice::ReadOther));
        writeErrorLogLine(clientContext(), QStringLiteral("lost"), options, kMoment);
        EXPECT_EQ(fileContents(logPath()), QByteArray("kept\r\n"));
    }

    // A folder that cannot be made leaves nothing to write to either.
    setProgramFolderForTesting(QStringLiteral("/proc/velloca-no-such-folder"));
    writeErrorLogLine(clientContext(), QStringLiteral("lost"), options, kMoment);
}

TEST_F(ErrorLogTest, ErrorProgramStartsOnEveryCall)
{
    const QString script = m_folder.filePath(QStringLiteral("on error.sh"));
    ASSERT_TRUE(writeScript(script, "#!/bin/sh\necho \"$2\" >> \"$1\"\n"));
    const QString marker = m_folder.filePath(QStringLiteral("runs marker.txt"));

    GlobalOptions options; // not logging: the program runs all the same
    options.OnErrorRunApp = QStringLiteral("\"%1\" \"%2\" alarm").arg(script, marker);
    writeErrorLogLine(clientContext(), QStringLiteral("one"), options, kMoment);
    writeErrorLogLine(clientContext(), QStringLiteral("two"), options, kMoment);

    EXPECT_TRUE(waitUntil([&] { return fileContents(marker) == "alarm\nalarm\n"; }))
        << fileContents(marker).toStdString();
    EXPECT_FALSE(QFile::exists(logPath()));

    // A path with a blank, unquoted as a file dialog gives it, runs as it is.
    ASSERT_TRUE(QDir(m_folder.path()).mkdir(QStringLiteral("my tools")));
    options.OnErrorRunApp = m_folder.filePath(QStringLiteral("my tools/alarm.sh"));
    ASSERT_TRUE(writeScript(options.OnErrorRunApp, "#!/bin/sh\necho ran > \"$0.ran\"\n"));
    writeErrorLogLine(clientContext(), QStringLiteral("three"), options, kMoment);
    EXPECT_TRUE(waitUntil([&] { return fileContents(options.OnErrorRunApp + ".ran") == "ran\n"; }));
}

TEST_F(ErrorLogTest, FloodRunsAtMostFourCopiesAndLogsTheSkippedStarts)
{
    // Each copy notes its start, runs until the release file appears, then
    // notes its end.
    const QString script = m_folder.filePath(QStringLiteral("slow.sh"));
    ASSERT_TRUE(writeScript(script, "#!/bin/sh\necho + >> \"$1\"\n"
                                    "while [ ! -e \"$2\" ]; do sleep 0.1; done\necho - >> \"$1\"\n"));
    const QString marker = m_folder.filePath(QStringLiteral("copies.txt"));
    const QString release = m_folder.filePath(QStringLiteral("release"));
    GlobalOptions options;
    options.LogErrors = 1;
    options.OnErrorRunApp = QStringLiteral("\"%1\" \"%2\" \"%3\"").arg(script, marker, release);

    // Returns at once although no copy ends by itself.
    for (int i = 0; i < 40; ++i)
        writeErrorLogLine(clientContext(), QStringLiteral("flood"), options, kMoment);
    ASSERT_TRUE(waitUntil([&] { return fileContents(marker).count('+') >= 4; }));
    QFile(release).open(QIODevice::WriteOnly);
    ASSERT_TRUE(waitUntil([&] {
        const QByteArray copies = fileContents(marker);
        return copies.count('-') == copies.count('+') && errorProgramHasRoom();
    }));
    EXPECT_EQ(fileContents(marker), "+\n+\n+\n+\n-\n-\n-\n-\n");

    writeErrorLogLine(clientContext(), QStringLiteral("after"), options, kMoment);
    EXPECT_TRUE(waitUntil([&] { return fileContents(marker).count('-') == 5; }));
    const QList<QByteArray> lines = fileContents(logPath()).split('\n');
    ASSERT_EQ(lines.size(), 42);
    EXPECT_TRUE(lines[40].startsWith("Velloca Error: after; 36 error-program starts skipped, ")) << lines[40].constData();
    EXPECT_EQ(fileContents(logPath()).count("skipped"), 1);
}

TEST_F(ErrorLogTest, FullDiskLosesOnlyTheLinesThatDoNotFit)
{
    // A small tmpfs, filled up, stands in for a full disk.
    QTemporaryDir mountPoint;
    const QByteArray target = QFile::encodeName(mountPoint.path());
    if (::mount("tmpfs", target.constData(), "tmpfs", 0, "size=64k") != 0)
        GTEST_SKIP() << "cannot mount a small tmpfs here (" << std::strerror(errno) << "), which needs root";
    const auto unmount = qScopeGuard([&] { ::umount2(target.constData(), MNT_DETACH); });
    setProgramFolderForTesting(mountPoint.path());
    const QString log = mountPoint.filePath(QStringLiteral("errorlog.txt"));
    GlobalOptions options;
    options.LogErrors = 1;
    writeErrorLogLine(clientContext(), QStringLiteral("before"), options, kMoment);
    const QByteArray before = fileContents(log);
    ASSERT_TRUE(before.endsWith("\r\n"));

    QFile filler(mountPoint.filePath(QStringLiteral("filler")));
    ASSERT_TRUE(filler.open(QIODevice::WriteOnly | QIODevice::Unbuffered));
    const QByteArray block(4096, 'x');
    while (filler.write(block) == block.size()) {
    }
    const QString longMessage(6000, QLatin1Char('y'));
    writeErrorLogLine(clientContext(), longMessage, options, kMoment);
    EXPECT_EQ(fileContents(log), before) << "a torn line was left in the log";

    // With room again, the next line starts on a line of its own.
    filler.close();
    ASSERT_TRUE(filler.remove());
    writeErrorLogLine(clientContext(), QStringLiteral("after"), options, kMoment);
    EXPECT_EQ(fileContents(log),
              before + (errorLogLine(clientContext(), QStringLiteral("after"), kMoment) + QStringLiteral("\r\n")).toUtf8());
}

TEST_F(ErrorLogTest, ErrorProgramNeverGoesThroughAShell)
{
    const QString script = m_folder.filePath(QStringLiteral("record.sh"));
    ASSERT_TRUE(writeScript(script, "#!/bin/sh\nout=$1; shift; printf '%s|' \"$@\" >> \"$out\"\n"));
    const QString marker = m_folder.filePath(QStringLiteral("arguments.txt"));
    const QString planted = m_folder.filePath(QStringLiteral("planted"));

    GlobalOptions options;
    options.OnErrorRunApp = QStringLiteral("\"%1\" \"%2\" a;b $(touch %3) `touch %3` | touch %3 && touch %3")
                                .arg(script, marker, planted);
    writeErrorLogLine(clientContext(), QStringLiteral("one"), options, kMoment);

    EXPECT_TRUE(waitUntil([&] { return !fileContents(marker).isEmpty(); }));
    EXPECT_EQ(fileContents(marker),
              QStringLiteral("a;b|$(touch|%1)|`touch|%1`|||touch|%1|&&|touch|%1|").arg(planted).toUtf8());
    EXPECT_FALSE(QFile::exists(planted));
}

TEST_F(ErrorLogTest, MissingErrorProgramIsPassedOver)
{
    GlobalOptions options;
    options.LogErrors = 1;
    options.OnErrorRunApp = m_folder.filePath(QStringLiteral("no-such-program")) + " --flag";
    writeErrorLogLine(clientContext(), QStringLiteral("still logged"), options, kMoment);
    options.OnErrorRunApp = QStringLiteral("   ");
    writeErrorLogLine(clientContext(), QStringLiteral("blank command"), options, kMoment);

    const QByteArray log = fileContents(logPath());
    EXPECT_TRUE(log.contains("still logged"));
    EXPECT_TRUE(log.contains("blank command"));
    EXPECT_EQ(log.count("\r\n"), 2);
}

TEST(ProgramFolder, FollowsXdgConfigHome)
{
    QTemporaryDir home;
    ASSERT_TRUE(home.isValid());
    const QByteArray previous = qgetenv("XDG_CONFIG_HOME");
    const bool hadPrevious = qEnvironmentVariableIsSet("XDG_CONFIG_HOME");
    qputenv("XDG_CONFIG_HOME", QFile::encodeName(home.path()));

    const QString folder = programFolder();
    const QString file = programFolderFile(QStringLiteral("default.vlk"));

    if (hadPrevious)
        qputenv("XDG_CONFIG_HOME", previous);
    else
        qunsetenv("XDG_CONFIG_HOME");

    EXPECT_EQ(folder, home.path() + QStringLiteral("/velloca"));
    EXPECT_TRUE(QFileInfo(folder).isDir());
    EXPECT_EQ(file, home.path() + QStringLiteral("/velloca/default.vlk"));
}
