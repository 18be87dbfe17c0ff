#include "BridgeFixture.h"

#include "platform/SerialPortControl.h"

namespace {

using SessionCommandsTest = BridgeTest;

TEST_F(SessionCommandsTest, ActivateAndDeactivateAreAcceptedOnlyWhenTheyChangeSomething)
{
    engine->settings().TCPOption = 1;
    engine->settings().PortNumber = QString::number(freePort());
    EXPECT_FALSE(engine->executeCommand(QStringLiteral("[DEACTIVATE]")));
    EXPECT_TRUE(engine->executeCommand(QStringLiteral("  [activate]  ")));
    EXPECT_TRUE(engine->isActive());
    EXPECT_FALSE(engine->executeCommand(QStringLiteral("[ACTIVATE]")));
    EXPECT_FALSE(engine->executeCommand(QStringLiteral("[APPEXIT]")));
    EXPECT_FALSE(engine->executeCommand(QStringLiteral("activate")));
    EXPECT_TRUE(engine->executeCommand(QStringLiteral("[Deactivate]")));
    EXPECT_FALSE(engine->isActive());
}

TEST_F(SessionCommandsTest, ComSettingsSelectEntriesAndReachTheOpenPort)
{
    struct Case
    {
        const char *command;
        const char *settings; // what the port gets
    };
    // Each case starts from 9600,N,8,1.
    const Case cases[] = {
        { "[COMSETTINGS=19200,E,7,2]", "19200,E,7,2" },
        { "[comsettings=19200,even,7,2]", "19200,E,7,2" },
        { "[COMSETTINGS=19200, E,7,2]", "19200,N,7,2" },   // " E" is no parity
        { "[COMSETTINGS=9600,SPACE,8,1.5]", "9600,S,8,1.5" },
        { "[COMSETTINGS=12345,O,8,1]", "9600,O,8,1" },     // unknown baud
        { "[COMSETTINGS= 57600.4,N, 6 , 2 ]", "57600,N,6,2" },
        { "[COMSETTINGS=]", "9600,N,8,1" },
        { "[COMSETTINGS=115200]", "9600,N,8,1" },           // no comma: nothing selected
        { "[COMSETTINGS=300,X,9,3]", "300,N,8,1" },
    };
    engine->settings().TCPOption = 1;
    engine->settings().PortNumber = QString::number(freePort());
    engine->Command1_Click();
    ASSERT_TRUE(engine->isActive());
    for (const Case &c : cases) {
        SessionSettings &s = engine->settings();
        s.BaudRate = 6;
        s.Parity = 0;
        s.Databits = 3;
        s.Stopbits = 0;
        EXPECT_TRUE(engine->executeCommand(QString::fromLatin1(c.command))) << c.command;
        EXPECT_EQ(engine->serialPort()->settings(), QString::fromLatin1(c.settings)) << c.command;
        EXPECT_EQ(engine->serialSettingsText(), QString::fromLatin1(c.settings)) << c.command;
    }
    // The change reaches the open device at once.
    engine->executeCommand(QStringLiteral("[COMSETTINGS=19200,E,7,2]"));
    const termios t = pty.slaveTermios();
    EXPECT_EQ(cfgetospeed(&t), speed_t(B19200));
    EXPECT_TRUE(t.c_cflag & CSTOPB);
    EXPECT_TRUE(engine->isActive());
}

} // namespace
