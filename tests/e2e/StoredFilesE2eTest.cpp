// What the user stored survives every start and every save: files named
// on the command line, files that cannot be read, file modes and owners,
// bytes that are not UTF-8, and a second copy of the program.
#include "CommandClient.h"
#include "E2eSupport.h"
#include "VellocaProcess.h"

#include "support/Wait.h"

#include <QDir>
#include <QFile>
#include <QFileInfo>

#include <gtest/gtest.h>

#include <csignal>
#include <sys/stat.h>
#include <unistd.h>

using namespace e2e;

namespace {

bool writeFile(const QString &path, const QByteArray &bytes)
{
    QFile file(path);
    return file.open(QIODevice::WriteOnly | QIODevice::Truncate) && file.write(bytes) == bytes.size();
}

struct stat statOf(const QString &path)
{
    struct stat info {};
    ::stat(QFile::encodeName(path).constData(), &info);
    return info;
}

// One inactive server session, so that the start-up takes its instance lock.
QByteArray oneSession(const QByteArray &extraGlobalLines = {})
{
    return "[Velloca]\r\nNumSessions=1\r\n" + extraGlobalLines
        + "[Session1]\r\nTCPOption=1\r\nPortNumber=" + QByteArray::number(freeTcpPort()) + "\r\n";
}

bool waitForStderr(VellocaProcess &velloca, const QByteArray &text, QByteArray *seen)
{
    return waitUntil([&] {
        *seen = velloca.standardError();
        return seen->contains(text);
    });
}

} // namespace

TEST(StoredFilesE2e, RelativeFileIsReadFromTheStartFolderAndItsPortsGoWithItsSessions)
{
    VellocaProcess velloca;
    const QString site = velloca.rootPath() + QStringLiteral("/site");
    ASSERT_TRUE(QDir().mkpath(site));
    ASSERT_TRUE(writeFile(site + QStringLiteral("/plant.vlk"),
                          "[Velloca]\r\nNumSessions=1\r\n[Ports]\r\nCOM7=/dev/plant-scale\r\n"
                          "[Session1]\r\nTCPOption=1\r\nPortNumber=4242\r\n"));
    velloca.setWorkingDirectory(site);
    ASSERT_TRUE(velloca.start("[Velloca]\r\nNumSessions=2\r\n[Ports]\r\nCOM7=/dev/default-meter\r\n"
                              "COM8=/dev/default-modem\r\n",
                              { QStringLiteral("plant.vlk") }));
    ASSERT_TRUE(velloca.waitForStartUp()) << velloca.standardError().constData();
    ASSERT_TRUE(velloca.terminate(5000));

    const QString saved = fileText(velloca.defaultConfigPath());
    EXPECT_EQ(iniValue(saved, "Velloca", "NumSessions"), "1") << qPrintable(saved);
    EXPECT_EQ(iniValue(saved, "Session1", "PortNumber"), "4242");
    // The sessions keep driving plant's devices after a plain restart.
    EXPECT_EQ(iniValue(saved, "Ports", "COM7"), "/dev/plant-scale");
    EXPECT_TRUE(iniValue(saved, "Ports", "COM8").isNull());
}

TEST(StoredFilesE2e, FileThatCannotBeLoadedEndsAHeadlessStartBeforeAnythingIsWritten)
{
    struct Case
    {
        const char *name;
        QStringList arguments; // relative to the home folder the program starts in
        bool defaultIsFolder;
    };
    const Case cases[] = {
        { "missing named file", { QStringLiteral("no such.vlk") }, false },
        { "folder named", { QStringLiteral("config") }, false },
        { "default file is a folder", {}, true },
    };
    const QByteArray original = "[Velloca]\r\nNumSessions=3\r\nLogErrors=1\r\n";
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        VellocaProcess velloca;
        if (c.defaultIsFolder)
            ASSERT_TRUE(QDir().mkpath(velloca.defaultConfigPath()));
        ASSERT_TRUE(velloca.start(c.defaultIsFolder ? QByteArray() : original, c.arguments));
        ASSERT_TRUE(velloca.waitForExit(10000));
        EXPECT_EQ(velloca.exitCode(), 2);
        const QByteArray message = velloca.standardError();
        const QString named = c.defaultIsFolder ? velloca.defaultConfigPath()
                                                : velloca.rootPath() + u'/' + c.arguments.join(u' ');
        EXPECT_TRUE(message.contains(QFile::encodeName(named))) << message.constData();
        if (c.defaultIsFolder)
            EXPECT_TRUE(QFileInfo(velloca.defaultConfigPath()).isDir());
        else
            EXPECT_EQ(fileBytes(velloca.defaultConfigPath()), original);
        EXPECT_FALSE(QFileInfo::exists(velloca.errorLogPath()));
    }
}

TEST(StoredFilesE2e, SaveKeepsModeAndOwnerAndLeavesReadOnlyFilesAlone)
{
    {
        VellocaProcess velloca;
        ASSERT_TRUE(writeFile(velloca.defaultConfigPath(), oneSession()));
        ASSERT_EQ(::chmod(QFile::encodeName(velloca.defaultConfigPath()).constData(), 0640), 0);
        // As root the file is given to another user, as a user's own file is
        // when root runs the program for them.
        const bool root = ::geteuid() == 0;
        if (root)
            ASSERT_EQ(::chown(QFile::encodeName(velloca.defaultConfigPath()).constData(), 4321, 4321), 0);
        ASSERT_TRUE(velloca.start(QByteArray()));
        ASSERT_TRUE(velloca.waitForStartUp()) << velloca.standardError().constData();
        ASSERT_TRUE(velloca.terminate(5000));
        EXPECT_FALSE(iniValue(fileText(velloca.defaultConfigPath()), "Velloca", "MainLeft").isNull());
        const struct stat info = statOf(velloca.defaultConfigPath());
        EXPECT_EQ(info.st_mode & 07777, mode_t(0640));
        if (root) {
            EXPECT_EQ(info.st_uid, uid_t(4321));
            EXPECT_EQ(info.st_gid, gid_t(4321));
        }
    }
    {
        VellocaProcess velloca;
        const QByteArray original = oneSession("LogErrors=1\r\n");
        ASSERT_TRUE(writeFile(velloca.defaultConfigPath(), original));
        ASSERT_EQ(::chmod(QFile::encodeName(velloca.defaultConfigPath()).constData(), 0444), 0);
        ASSERT_TRUE(velloca.start(QByteArray()));
        ASSERT_TRUE(velloca.waitForStartUp()) << velloca.standardError().constData();
        ASSERT_TRUE(velloca.terminate(5000));
        EXPECT_EQ(velloca.exitCode(), 0);
        EXPECT_EQ(fileBytes(velloca.defaultConfigPath()), original);
        EXPECT_EQ(statOf(velloca.defaultConfigPath()).st_mode & 07777, mode_t(0444));
        EXPECT_TRUE(velloca.standardError().contains("read-only")) << velloca.standardError().constData();
        EXPECT_TRUE(velloca.errorLog().contains(QStringLiteral("read-only"))) << qPrintable(velloca.errorLog());
    }
}

TEST(StoredFilesE2e, BytesThatAreNotUtf8ComeBackAsTheyWereStored)
{
    struct Case
    {
        const char *language;
        QByteArray globalLines; // Windows-1252, or Shift-JIS for a Japanese locale
        QByteArray sessionLines;
    };
    const Case cases[] = {
        { "de_DE.UTF-8", "; Kommentar f\xFCr K\xF6ln\r\nPassword=p\xE4ss\xDF\r\n[Notizen]\r\nStra\xDF" "e=M\xFCller\r\n",
          "SessionDescription=Ofen S\xFC" "d\r\n" },
        // "パス", a section "メモ", and "シリアル".
        { "ja_JP.UTF-8", "Password=\x83\x70\x83\x58\r\n[\x83\x81\x83\x82]\r\nA=\x83\x81\r\n",
          "SessionDescription=\x83\x56\x83\x8a\x83\x41\x83\x8b\r\n" },
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.language);
        VellocaProcess velloca;
        velloca.setEnvironmentValue(QStringLiteral("LANG"), QString::fromLatin1(c.language));
        const QByteArray original = "[Velloca]\r\nNumSessions=1\r\n" + c.globalLines
            + "[Session1]\r\nTCPOption=1\r\nPortNumber=4243\r\n" + c.sessionLines;
        ASSERT_TRUE(velloca.start(original));
        ASSERT_TRUE(velloca.waitForStartUp()) << velloca.standardError().constData();
        ASSERT_TRUE(velloca.terminate(5000));
        const QByteArray saved = fileBytes(velloca.defaultConfigPath());
        for (const QByteArray &line : (c.globalLines + c.sessionLines).split('\n'))
            EXPECT_TRUE(saved.contains(line)) << "lost: " << line.toHex().constData();
        EXPECT_FALSE(saved.contains("\xEF\xBF\xBD")) << "a replacement character was written";
    }
}

TEST(StoredFilesE2e, SecondCopyOnTheSameFileLeavesItToTheFirstAndOtherFilesAreFree)
{
    VellocaProcess first;
    ASSERT_TRUE(first.start(oneSession()));
    ASSERT_TRUE(first.waitForStartUp()) << first.standardError().constData();
    const QByteArray asLoaded = fileBytes(first.defaultConfigPath());

    VellocaProcess second(&first);
    ASSERT_TRUE(second.start(QByteArray()));
    QByteArray message;
    EXPECT_TRUE(waitForStderr(second, "Another copy of Velloca", &message)) << message.constData();
    ASSERT_TRUE(second.terminate(5000));
    EXPECT_EQ(fileBytes(first.defaultConfigPath()), asLoaded) << "the second copy saved the first copy's file";

    // Its standard descriptors closed, a copy still writes its message
    // somewhere harmless and keeps running.
    VellocaProcess silent(&first);
    silent.setStandardDescriptorsClosed(true);
    ASSERT_TRUE(silent.start(QByteArray()));
    const QString channel = first.virtualPortFolder() + QStringLiteral("/control.%1").arg(silent.processId());
    ASSERT_TRUE(waitUntil([&] { return QFile::exists(channel) || !silent.isRunning(); }));
    QLocalSocket socket;
    socket.connectToServer(channel);
    ASSERT_TRUE(waitUntil([&] { return socket.state() == QLocalSocket::ConnectedState || !silent.isRunning(); }));
    socket.write("Session1\t[DEACTIVATE]\n");
    EXPECT_TRUE(waitUntil([&] { return socket.bytesAvailable() > 0 || !silent.isRunning(); }));
    EXPECT_TRUE(silent.isRunning()) << "a copy without standard descriptors ended by itself";
    ASSERT_TRUE(silent.terminate(5000));

    VellocaProcess elsewhere;
    ASSERT_TRUE(elsewhere.start(oneSession()));
    ASSERT_TRUE(elsewhere.waitForStartUp()) << elsewhere.standardError().constData();
    ASSERT_TRUE(elsewhere.terminate(5000));
    ASSERT_TRUE(first.terminate(5000));
    for (VellocaProcess *copy : { &first, &elsewhere })
        EXPECT_FALSE(iniValue(fileText(copy->defaultConfigPath()), "Velloca", "MainLeft").isNull());
}

TEST(StoredFilesE2e, HangUpSavesAndCleansUpLikeTerminate)
{
    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start("[Velloca]\r\nNumSessions=1\r\n[Session1]\r\nConnector=9\r\nCreateVirtualPort=1\r\n"
                              "TCPOption=1\r\nIPAddress=127.0.0.1\r\nPortNumber=" + QByteArray::number(freeTcpPort())
                              + "\r\nAutoActivate=1\r\n"));
    const QString link = velloca.virtualPortFolder() + QStringLiteral("/COM9");
    ASSERT_TRUE(waitUntil([&] { return isSymbolicLink(link); })) << velloca.standardError().constData();
    ASSERT_EQ(::kill(pid_t(velloca.processId()), SIGHUP), 0);
    ASSERT_TRUE(velloca.waitForExit(5000));
    EXPECT_EQ(velloca.exitStatus(), QProcess::NormalExit);
    EXPECT_EQ(velloca.exitCode(), 0);
    EXPECT_EQ(iniValue(fileText(velloca.defaultConfigPath()), "Session1", "AutoActivate"), "1");
    EXPECT_FALSE(isSymbolicLink(link));
    EXPECT_FALSE(QFileInfo::exists(commandChannelPath(velloca)));
}
