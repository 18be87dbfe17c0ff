// Something already sits where a virtual port's link belongs: the program
// never writes through it; only a stale link of its own kind is replaced.
#include "E2eSupport.h"
#include "PtyServerRun.h"

#include "support/Wait.h"

#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QHostAddress>
#include <QTcpSocket>

#include <gtest/gtest.h>

#include <unistd.h>

using namespace e2e;

namespace {

QString virtualServerSection(int number, int connector, quint16 port)
{
    return QStringLiteral("[Session%1]\r\nConnector=%2\r\nCreateVirtualPort=1\r\nTCPOption=1\r\n"
                          "LocalIP=127.0.0.1\r\nIPAddress=127.0.0.1\r\nPortNumber=%3\r\nAutoActivate=1\r\n"
                          "BufferSerialData=0\r\nWaitForCr=0\r\n")
        .arg(number).arg(connector).arg(port);
}

QByteArray contents(const QString &path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("<unreadable>");
}

bool writeFile(const QString &path, const QByteArray &bytes)
{
    QFile file(path);
    return file.open(QIODevice::WriteOnly) && file.write(bytes) == bytes.size();
}

bool refusesConnections(quint16 port)
{
    QTcpSocket probe;
    probe.connectToHost(QHostAddress::LocalHost, port);
    waitUntil([&] { return probe.state() == QAbstractSocket::ConnectedState
                           || probe.state() == QAbstractSocket::UnconnectedState; }, 5000);
    return probe.error() == QAbstractSocket::ConnectionRefusedError;
}

} // namespace

TEST(VirtualPortLinkE2e, StaleLinkIsReplacedWhileAFileOrALinkToAnotherFileIsLeftAloneAndItsSessionStaysOff)
{
    VellocaProcess velloca;
    ASSERT_TRUE(velloca.isValid());
    const QString folder = velloca.virtualPortFolder();
    ASSERT_TRUE(QDir().mkpath(folder));
    ASSERT_TRUE(QFile::setPermissions(folder, QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner));
    const QString stale = folder + QStringLiteral("/COM5");
    const QString regular = folder + QStringLiteral("/COM6");
    const QString foreignLink = folder + QStringLiteral("/COM7");
    const QString foreignTarget = velloca.rootPath() + QStringLiteral("/someone else's file");
    const QByteArray precious = "not yours\n";
    ASSERT_EQ(::symlink(QFile::encodeName(velloca.rootPath() + "/gone").constData(), QFile::encodeName(stale).constData()), 0);
    ASSERT_TRUE(writeFile(regular, precious));
    ASSERT_TRUE(writeFile(foreignTarget, precious));
    ASSERT_EQ(::symlink(QFile::encodeName(foreignTarget).constData(), QFile::encodeName(foreignLink).constData()), 0);
    const QDateTime regularModified = QFileInfo(regular).lastModified();

    quint16 ports[3];
    QString config = loggingGlobalSection(3);
    for (int i = 0; i < 3; ++i) {
        ports[i] = freeTcpPort();
        ASSERT_NE(ports[i], 0);
        config += virtualServerSection(i + 1, i + 5, ports[i]);
    }
    ASSERT_TRUE(velloca.start(config.toUtf8())) << velloca.standardError().constData();
    ASSERT_TRUE(velloca.waitForLogLine(QStringLiteral("Virtual Port COM5 created"))) << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForLogLine(QStringLiteral("Cannot create virtual COM6 ("))) << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForLogLine(QStringLiteral("Cannot create virtual COM7 ("))) << qPrintable(velloca.errorLog());
    ASSERT_TRUE(velloca.waitForLogLine(serverLogLine(QStringLiteral("TCP/IP Status: Listening..."), ports[0])));

    EXPECT_TRUE(isSymbolicLink(stale));
    EXPECT_TRUE(QFileInfo(stale).symLinkTarget().startsWith(QStringLiteral("/dev/pts/")))
        << qPrintable(QFileInfo(stale).symLinkTarget());

    EXPECT_FALSE(isSymbolicLink(regular));
    EXPECT_EQ(contents(regular), precious);
    EXPECT_EQ(QFileInfo(regular).lastModified(), regularModified);
    EXPECT_TRUE(refusesConnections(ports[1])) << "the session on COM6 was activated";

    EXPECT_TRUE(isSymbolicLink(foreignLink));
    EXPECT_EQ(QFileInfo(foreignLink).symLinkTarget(), foreignTarget);
    EXPECT_EQ(contents(foreignTarget), precious);
    EXPECT_TRUE(refusesConnections(ports[2])) << "the session on COM7 was activated";

    ASSERT_TRUE(velloca.terminate(2000));
    EXPECT_EQ(velloca.exitCode(), 0) << velloca.standardError().constData();
    EXPECT_FALSE(QFileInfo::exists(stale) || isSymbolicLink(stale)) << "its own link outlived the program";
    EXPECT_EQ(contents(regular), precious);
    EXPECT_TRUE(isSymbolicLink(foreignLink));
    EXPECT_EQ(contents(foreignTarget), precious);
}
