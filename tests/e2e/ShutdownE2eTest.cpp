// Ending the program with SIGTERM, as a service manager or a logout does.
#include "E2eSupport.h"
#include "VellocaProcess.h"

#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QFile>
#include <QHostAddress>
#include <QTcpSocket>

#include <gtest/gtest.h>

#include <sys/stat.h>

using namespace e2e;

TEST(ShutdownE2e, SigtermWhileActiveSavesTheSessionsKeepsForeignLinesAndLeavesNothingBehind)
{
    PtyPair device;
    ASSERT_TRUE(device.isValid());
    const quint16 activePort = freeTcpPort();
    const quint16 idlePort = freeTcpPort();
    ASSERT_NE(activePort, 0);
    ASSERT_NE(idlePort, 0);
    const QString config = QStringLiteral("; written by hand, keep this comment\r\n"
                                          "[Velloca]\r\n"
                                          "NumSessions=2\r\n"
                                          "LogErrors=1\r\n"
                                          "SiteName=north cabinet\r\n"
                                          "[Ports]\r\n"
                                          "COM3=%1\r\n")
                               .arg(device.slavePath())
        + serverSessionSection(1, 3, activePort, true)
        + QStringLiteral("; the next key is ours, not the program's\r\n"
                         "OperatorNote=line 7\r\n")
        + serverSessionSection(2, 4, idlePort, false)
        + QStringLiteral("[Extra Tools]\r\nColour=blue\r\n");

    VellocaProcess velloca;
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    // Written by the test with the usual umask: readable by others.
    ASSERT_TRUE(QFile::setPermissions(velloca.defaultConfigPath(), QFile::ReadOwner | QFile::WriteOwner
                                                                        | QFile::ReadGroup | QFile::ReadOther));
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Listening..."), activePort)))
        << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForStartUp());

    QTcpSocket client;
    client.connectToHost(QHostAddress::LocalHost, activePort);
    ASSERT_TRUE(waitUntil([&] { return client.state() == QAbstractSocket::ConnectedState; }));
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("Connected (1)"), activePort)));
    EXPECT_TRUE(velloca.processesOfThisRun().contains(velloca.processId()));
    // Headless the program is a daemon: no platform plugin, so no GUI at all.
    const QString maps = fileText(QStringLiteral("/proc/%1/maps").arg(velloca.processId()));
    EXPECT_FALSE(maps.contains(QStringLiteral("/platforms/"))) << "a Qt platform plugin was loaded";

    ASSERT_TRUE(velloca.terminate(2000)) << "still running 2 s after SIGTERM";
    EXPECT_EQ(velloca.exitStatus(), QProcess::NormalExit);
    EXPECT_EQ(velloca.exitCode(), 0) << velloca.standardError().constData();
    EXPECT_TRUE(velloca.processesOfThisRun().isEmpty());
    EXPECT_TRUE(waitUntil([&] { return client.state() == QAbstractSocket::UnconnectedState; }))
        << "the client's connection outlived the program";

    QFile saved(velloca.defaultConfigPath());
    ASSERT_TRUE(saved.open(QIODevice::ReadOnly));
    const QString text = QString::fromUtf8(saved.readAll());
    EXPECT_EQ(iniValue(text, "Velloca", "NumSessions"), "2");
    EXPECT_EQ(iniValue(text, "Session1", "AutoActivate"), "1");
    EXPECT_EQ(iniValue(text, "Session2", "AutoActivate"), "0");
    EXPECT_EQ(iniValue(text, "Session1", "PortNumber"), QString::number(activePort));
    EXPECT_EQ(iniValue(text, "Session2", "PortNumber"), QString::number(idlePort));
    EXPECT_EQ(iniValue(text, "Session1", "Connector"), "3");
    EXPECT_EQ(iniValue(text, "Session1", "TCPOption"), "1");

    EXPECT_TRUE(text.startsWith("; written by hand, keep this comment\r\n")) << qPrintable(text.left(200));
    EXPECT_TRUE(text.contains("; the next key is ours, not the program's\r\n"));
    EXPECT_EQ(iniValue(text, "Velloca", "SiteName"), "north cabinet");
    EXPECT_EQ(iniValue(text, "Session1", "OperatorNote"), "line 7");
    EXPECT_EQ(iniValue(text, "Ports", "COM3"), device.slavePath());
    EXPECT_EQ(iniValue(text, "Extra Tools", "Colour"), "blue");

    struct stat info {};
    ASSERT_EQ(::stat(QFile::encodeName(velloca.defaultConfigPath()).constData(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, mode_t(0644)) << "an existing file keeps its mode";
}
