#include "config/GlobalOptions.h"
#include "config/ProgramFolder.h"
#include "session/SessionEngine.h"
#include "shell/SessionWindow.h"
#include "viewsupport/UserDialogs.h"
#include "session/SessionManager.h"
#include "shell/MainWindow.h"
#include "support/Wait.h"

#include <QAction>
#include <QComboBox>
#include <QFile>
#include <QMenu>
#include <QTemporaryDir>

#include <gtest/gtest.h>

namespace {

// A main window whose program folder is a temporary one, with file and
// message boxes answered by the test.
class MainWindowTest : public ::testing::Test
{
protected:
    MainWindowTest()
    {
        setProgramFolderForTesting(folder.path());
        qputenv("XDG_RUNTIME_DIR", folder.filePath(QStringLiteral("run")).toLocal8Bit());
        UserDialogs::setFileHandler([this](const UserDialogs::FileRequest &request) {
            fileRequests << request;
            return nextFile;
        });
        UserDialogs::setMessageHandler([this](const UserDialogs::MessageRequest &request) { messages << request.text; });
    }
    ~MainWindowTest() override
    {
        UserDialogs::setFileHandler({});
        UserDialogs::setMessageHandler({});
        setProgramFolderForTesting(QString());
        GlobalOptions::global() = GlobalOptions {};
    }

    void writeFile(const QString &name, const QByteArray &text)
    {
        QFile file(folder.filePath(name));
        ASSERT_TRUE(file.open(QIODevice::WriteOnly));
        file.write(text);
    }
    QByteArray readFile(const QString &name)
    {
        QFile file(folder.filePath(name));
        return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
    }
    QAction *action(MainWindow &window, const char *name)
    {
        return window.findChild<QAction *>(QString::fromLatin1(name));
    }

    QTemporaryDir folder;
    QList<UserDialogs::FileRequest> fileRequests;
    QStringList messages;
    std::optional<QString> nextFile;
};

TEST_F(MainWindowTest, StartsWithOneNewSessionWhenThereIsNoConfiguration)
{
    MainWindow window { QString() };
    window.runStartUpNow();
    ASSERT_TRUE(window.startUpDone());
    EXPECT_EQ(window.objectName(), QStringLiteral("frmMain"));
    EXPECT_EQ(window.windowTitle(), QStringLiteral("Velloca"));
    ASSERT_EQ(window.sessionWindows().size(), 1);
    EXPECT_EQ(window.sessionWindows()[0]->windowTitle(), QStringLiteral("New - RS232 to TCP/IP"));
    // Menu items designed with their ids show their texts.
    EXPECT_EQ(action(window, "mnuFileNew")->text(), QStringLiteral("&New"));
    EXPECT_EQ(action(window, "mnuFileNew")->shortcut(), QKeySequence(QStringLiteral("Ctrl+N")));
    EXPECT_EQ(window.findChild<QMenu *>(QStringLiteral("mnuFile"))->title(), QStringLiteral("&File"));
    EXPECT_FALSE(action(window, "mnuHelpSearch")->isVisible());
    auto *popup = window.findChild<QMenu *>(QStringLiteral("mnuPopUp"));
    ASSERT_NE(popup, nullptr);
    EXPECT_EQ(popup->defaultAction(), action(window, "mnuAbout"));
}

TEST_F(MainWindowTest, SaveAsksForAFileUntilOneIsChosen)
{
    MainWindow window { QString() };
    window.runStartUpNow();
    nextFile = std::nullopt;
    window.mnuFileSave_Click();
    ASSERT_EQ(fileRequests.size(), 1);
    EXPECT_TRUE(fileRequests[0].save);
    EXPECT_EQ(fileRequests[0].defaultSuffix, QStringLiteral("vlk"));
    EXPECT_TRUE(window.currentConfigFile().isEmpty()) << "cancel changes nothing";

    nextFile = folder.filePath(QStringLiteral("plant.vlk"));
    window.mnuFileSave_Click();
    EXPECT_EQ(window.currentConfigFile(), *nextFile);
    EXPECT_TRUE(readFile(QStringLiteral("plant.vlk")).contains("NumSessions=1"));
    window.mnuFileSave_Click();
    EXPECT_EQ(fileRequests.size(), 2) << "a chosen file is saved without asking";
}

TEST_F(MainWindowTest, LoadsSessionsAndActivatesOnlyThoseMarkedAtStartUp)
{
    writeFile(QStringLiteral("default.vlk"),
              "; plant floor\n[Velloca]\nNumSessions=3\nLogErrors=0\n"
              "[Session1]\nConnector=0\nIPAddress=x\nPortNumber=0\nAutoActivate=1\nSessionDescription=Scale\n"
              "[Session2]\nBaudRate=99\nTCPOption=5\nAutoActivate=2\n"
              "[Session3]\nConnector=0\nIPAddress=y\nAutoActivate=1\n");
    MainWindow window { QString() };
    window.runStartUpNow();
    const QList<SessionWindow *> sessions = window.sessionWindows();
    ASSERT_EQ(sessions.size(), 3);
    EXPECT_EQ(sessions[0]->windowTitle(), QStringLiteral("Scale"));
    // A list index the list does not have leaves the new window's choice.
    EXPECT_EQ(sessions[1]->findChild<QComboBox *>(QStringLiteral("Combo1_0"))->currentIndex(), 6);
    EXPECT_EQ(sessions[1]->engine()->settings().TCPOption, 1);
    // Connector "None" refuses activation, which shows up on the status lines.
    EXPECT_EQ(sessions[0]->engine()->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status:"));
    EXPECT_EQ(sessions[1]->engine()->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status:"));
    EXPECT_EQ(sessions[2]->engine()->statusLine(SessionEngine::ComLine), QStringLiteral("COM Status:"));
    EXPECT_EQ(sessions[1]->engine()->statusLine(SessionEngine::NetworkLine), QStringLiteral("TCP/IP Status:"))
        << "AutoActivate 2 does not activate";
    EXPECT_EQ(sessions[2]->engine()->caption(), QStringLiteral("New - RS232 to TCP/IP"));

    window.close();
    const QByteArray saved = readFile(QStringLiteral("default.vlk"));
    EXPECT_TRUE(saved.startsWith("; plant floor")) << "comments are kept";
    EXPECT_TRUE(saved.contains("TCPOption=1"));
    EXPECT_TRUE(saved.contains("SessionDescription=Scale"));
}

TEST_F(MainWindowTest, OpenLoadsTheChosenFileButExitSavesTheDefaultFile)
{
    writeFile(QStringLiteral("other.vlk"), "[Velloca]\nNumSessions=2\n[Session1]\nPortNumber=4001\n[Session2]\nPortNumber=4002\n");
    MainWindow window { QString() };
    window.runStartUpNow();
    nextFile = folder.filePath(QStringLiteral("other.vlk"));
    window.mnuFileOpen_Click();
    EXPECT_FALSE(fileRequests[0].save);
    ASSERT_EQ(window.sessionWindows().size(), 2);
    window.close();
    EXPECT_TRUE(readFile(QStringLiteral("default.vlk")).contains("PortNumber=4002"));
    EXPECT_FALSE(readFile(QStringLiteral("other.vlk")).contains("MainLeft"));
}

TEST_F(MainWindowTest, OpenOfAFileThatCannotBeLoadedChangesNothingAndNewStopsAtTheSessionLimit)
{
    writeFile(QStringLiteral("default.vlk"), "[Velloca]\nNumSessions=256\n");
    MainWindow window { QString() };
    window.runStartUpNow();
    ASSERT_EQ(window.sessionWindows().size(), 256);
    window.mnuFileNew_Click();
    EXPECT_EQ(window.sessionWindows().size(), 256);
    ASSERT_EQ(messages.size(), 1);

    nextFile = folder.path(); // a folder is no configuration file
    window.mnuFileOpen_Click();
    EXPECT_EQ(window.sessionWindows().size(), 256);
    ASSERT_EQ(messages.size(), 2);
    EXPECT_TRUE(messages[1].contains(folder.path())) << qPrintable(messages[1]);
    EXPECT_TRUE(window.currentConfigFile().isEmpty());
}

TEST_F(MainWindowTest, RestoringAsksForThePasswordOnlyWhenOneIsSet)
{
    MainWindow window { QString() };
    window.runStartUpNow();
    QStringList answers { QStringLiteral("wrong"), QStringLiteral("secret") };
    int asked = 0;
    window.askPassword = [&]() -> std::optional<QString> { return answers.value(asked++); };

    window.showMinimized();
    window.mnuOpen_Click();
    EXPECT_EQ(asked, 0) << "no password, no question";
    EXPECT_FALSE(window.isMinimized());

    GlobalOptions::global().Password = QStringLiteral("secret");
    window.showMinimized();
    window.mnuOpen_Click();
    EXPECT_EQ(asked, 1);
    EXPECT_EQ(messages, QStringList { QStringLiteral("Invalid password") });
    EXPECT_TRUE(window.isMinimized());
    window.mnuOpen_Click();
    EXPECT_EQ(asked, 2);
    EXPECT_FALSE(window.isMinimized());
}

TEST_F(MainWindowTest, CommandsReachTheSessionNamedByTheirTopic)
{
    writeFile(QStringLiteral("default.vlk"),
              "[Velloca]\nNumSessions=2\n[Session1]\nConnector=3\n[Session2]\nConnector=4\n");
    MainWindow window { QString() };
    window.runStartUpNow();
    const QList<SessionWindow *> sessions = window.sessionWindows();
    ASSERT_EQ(sessions.size(), 2);
    EXPECT_TRUE(window.executeCommand(QStringLiteral("COM4"), QStringLiteral("[COMSETTINGS=300,N,8,1]")));
    EXPECT_EQ(sessions[1]->engine()->settings().BaudRate, 1);
    EXPECT_TRUE(window.executeCommand(QStringLiteral("session1"), QStringLiteral("[COMSETTINGS=600,N,8,1]")));
    EXPECT_EQ(sessions[0]->engine()->settings().BaudRate, 2);
    EXPECT_FALSE(window.executeCommand(QStringLiteral("Session3"), QStringLiteral("[COMSETTINGS=600,N,8,1]")));
    EXPECT_FALSE(window.executeCommand(QStringLiteral("COM9"), QStringLiteral("[ACTIVATE]")));
    EXPECT_FALSE(window.executeCommand(QStringLiteral("COM3"), QStringLiteral("[APPEXIT]")));
    EXPECT_FALSE(window.executeCommand(QStringLiteral("System"), QStringLiteral("[ACTIVATE]")));

    // The exit comes on a later tick, after the answer.
    EXPECT_TRUE(window.executeCommand(QStringLiteral("System"), QStringLiteral(" [appexit] ")));
    EXPECT_FALSE(window.hasShutDown());
    ASSERT_TRUE(waitUntil([&] { return window.hasShutDown(); }, 5000));
    EXPECT_TRUE(readFile(QStringLiteral("default.vlk")).contains("BaudRate=2"));
}

TEST_F(MainWindowTest, ServiceSwitchesEndTheProgramBeforeAnythingIsLoaded)
{
    // A unit folder that cannot exist and no systemctl: every switch fails
    // without touching the machine.
    writeFile(QStringLiteral("blocker"), "a file, not a folder");
    ServicePaths paths;
    paths.unitFolder = folder.filePath(QStringLiteral("blocker/units"));
    paths.systemctl = folder.filePath(QStringLiteral("no-systemctl"));
    for (const char *commandLine : { " -i ", "/U", "-IH" }) {
        MainWindow window(QString::fromLatin1(commandLine));
        window.manager()->servicePaths = paths;
        int status = -1;
        QObject::connect(&window, &MainWindow::finishedEarly, [&](int s) { status = s; });
        window.runStartUpNow();
        EXPECT_EQ(status, 1) << commandLine;
        EXPECT_FALSE(window.startUpDone());
        EXPECT_TRUE(window.sessionWindows().isEmpty());
        window.close();
        EXPECT_TRUE(readFile(QStringLiteral("default.vlk")).isEmpty()) << "nothing is saved";
    }
    // A switch followed by more text is a file name; this one is missing.
    MainWindow window(QStringLiteral("-I extra"));
    int status = -1;
    QObject::connect(&window, &MainWindow::finishedEarly, [&](int s) { status = s; });
    window.runStartUpNow();
    EXPECT_EQ(status, 2);
}

} // namespace
