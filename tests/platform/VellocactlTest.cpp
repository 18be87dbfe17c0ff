// Runs the real vellocactl against a channel in this process. The event
// loop keeps running while the child works, so the channel can answer it.
#include "platform/CommandChannel.h"
#include "support/Wait.h"

#include <QCoreApplication>
#include <QElapsedTimer>
#include <QFileInfo>
#include <QLocalServer>
#include <QLocalSocket>
#include <QProcess>
#include <QTemporaryDir>

#include <gtest/gtest.h>

namespace {

struct Outcome
{
    bool finished = false;
    int exitCode = -1;
    QString out;
    QString err;
};

// Programs are built into the build folder's top, next to the test programs.
QString vellocactlPath()
{
    QString buildDir = qEnvironmentVariable("VELLOCA_BUILD_DIR");
    if (buildDir.isEmpty())
        buildDir = QCoreApplication::applicationDirPath();
    return buildDir + QStringLiteral("/vellocactl");
}

Outcome runVellocactl(const QStringList &arguments,
                      const QProcessEnvironment &environment = QProcessEnvironment::systemEnvironment())
{
    QProcess process;
    process.setProcessEnvironment(environment);
    process.start(vellocactlPath(), arguments);
    Outcome outcome;
    // Longer than the client's own 10 s reply time-out.
    outcome.finished = waitUntil([&] { return process.state() == QProcess::NotRunning; }, 30000);
    if (!outcome.finished) {
        process.kill();
        waitUntil([&] { return process.state() == QProcess::NotRunning; });
        return outcome;
    }
    outcome.exitCode = process.exitStatus() == QProcess::NormalExit ? process.exitCode() : -1;
    outcome.out = QString::fromUtf8(process.readAllStandardOutput());
    outcome.err = QString::fromUtf8(process.readAllStandardError());
    return outcome;
}

class VellocactlTest : public ::testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_TRUE(QFileInfo(vellocactlPath()).isExecutable())
            << "build the vellocactl target first: " << vellocactlPath().toStdString();
    }
};

} // namespace

TEST_F(VellocactlTest, ExitStatusFollowsTheReply)
{
    QTemporaryDir temporary;
    QList<QPair<QString, QString>> calls;
    CommandChannel channel([&](const QString &topic, const QString &command) {
        calls.append({ topic, command });
        return command != QLatin1String("[APPEXIT]");
    });
    ASSERT_TRUE(channel.listen(temporary.path()));
    const QString socket = channel.socketPath();

    // The command's words are joined by blanks.
    Outcome accepted = runVellocactl({ "--socket", socket, "COM3", "[COMSETTINGS=9600,", "N,8,1]" });
    ASSERT_TRUE(accepted.finished);
    EXPECT_EQ(accepted.exitCode, 0) << accepted.err.toStdString();
    EXPECT_TRUE(accepted.err.isEmpty());

    Outcome refused = runVellocactl({ "--socket", socket, "COM3", "[APPEXIT]" });
    ASSERT_TRUE(refused.finished);
    EXPECT_EQ(refused.exitCode, 1) << refused.err.toStdString();

    const QList<QPair<QString, QString>> expected { { "COM3", "[COMSETTINGS=9600, N,8,1]" },
                                                    { "COM3", "[APPEXIT]" } };
    EXPECT_EQ(calls, expected);

    // Without --socket the client finds the first program's channel.
    QTemporaryDir runtime;
    CommandChannel inRuntimeFolder([](const QString &, const QString &) { return true; });
    ASSERT_TRUE(inRuntimeFolder.listen(runtime.filePath(QStringLiteral("velloca"))));
    QProcessEnvironment environment = QProcessEnvironment::systemEnvironment();
    environment.insert(QStringLiteral("XDG_RUNTIME_DIR"), runtime.path());
    Outcome byDefault = runVellocactl({ "System", "[APPEXIT]" }, environment);
    ASSERT_TRUE(byDefault.finished);
    EXPECT_EQ(byDefault.exitCode, 0) << byDefault.err.toStdString();
}

TEST_F(VellocactlTest, ReportsAnUnreachableChannelByItsPath)
{
    QTemporaryDir temporary;
    const QString missing = temporary.filePath(QStringLiteral("control"));
    Outcome nobody = runVellocactl({ "--socket", missing, "System", "[APPEXIT]" });
    ASSERT_TRUE(nobody.finished);
    EXPECT_EQ(nobody.exitCode, 2);
    EXPECT_TRUE(nobody.err.contains(missing)) << nobody.err.toStdString();
    EXPECT_EQ(nobody.err.count(QLatin1Char('\n')), 1) << nobody.err.toStdString();

    // A server that hangs up on the request without answering.
    QLocalServer hangsUp;
    const QString hangsUpPath = temporary.filePath(QStringLiteral("hangs-up"));
    ASSERT_TRUE(hangsUp.listen(hangsUpPath));
    QObject::connect(&hangsUp, &QLocalServer::newConnection, [&] {
        QLocalSocket *socket = hangsUp.nextPendingConnection();
        QObject::connect(socket, &QLocalSocket::readyRead, socket, [socket] {
            if (socket->canReadLine())
                socket->abort();
        });
    });
    Outcome cut = runVellocactl({ "--socket", hangsUpPath, "System", "[APPEXIT]" });
    ASSERT_TRUE(cut.finished);
    EXPECT_EQ(cut.exitCode, 2);
    EXPECT_TRUE(cut.err.contains(hangsUpPath)) << cut.err.toStdString();
}

TEST_F(VellocactlTest, GivesUpOnASilentChannel)
{
    QTemporaryDir temporary;
    QLocalServer silent;
    const QString path = temporary.filePath(QStringLiteral("silent"));
    ASSERT_TRUE(silent.listen(path));
    QElapsedTimer clock;
    clock.start();
    Outcome outcome = runVellocactl({ "--socket", path, "System", "[APPEXIT]" });
    ASSERT_TRUE(outcome.finished);
    EXPECT_EQ(outcome.exitCode, 2);
    EXPECT_GE(clock.elapsed(), 9000);
    EXPECT_TRUE(outcome.err.contains(path) && outcome.err.contains(QLatin1String("no reply")))
        << outcome.err.toStdString();
}

TEST_F(VellocactlTest, ExplainsItsUsage)
{
    Outcome help = runVellocactl({ "--help" });
    ASSERT_TRUE(help.finished);
    EXPECT_EQ(help.exitCode, 0);
    EXPECT_TRUE(help.out.startsWith(QLatin1String("usage: vellocactl"))) << help.out.toStdString();

    const QList<QStringList> wrong { {},
                                     { "System" },
                                     { "--socket" },
                                     { "--socket", "/tmp/x" },
                                     { "--bogus", "System", "[APPEXIT]" },
                                     { "Sys\ttem", "[APPEXIT]" },
                                     { "System", "[APPEXIT]\nCOM1\t[ACTIVATE]" } };
    for (const QStringList &arguments : wrong) {
        Outcome outcome = runVellocactl(arguments);
        ASSERT_TRUE(outcome.finished);
        EXPECT_EQ(outcome.exitCode, 2) << arguments.join(QLatin1Char(' ')).toStdString();
        EXPECT_TRUE(outcome.err.contains(QLatin1String("usage: vellocactl"))) << outcome.err.toStdString();
    }
}
