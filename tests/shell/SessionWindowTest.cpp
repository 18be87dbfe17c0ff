#include "config/GlobalOptions.h"
#include "config/SessionOptions.h"
#include "session/SessionEngine.h"
#include "shell/SessionWindow.h"
#include "viewsupport/UserDialogs.h"
#include "platform/SocketMember.h"
#include "platform/VirtualPortFolder.h"
#include "support/Wait.h"

#include <QAbstractButton>
#include <QApplication>
#include <QComboBox>
#include <QGroupBox>
#include <QLabel>
#include <QLineEdit>
#include <QRadioButton>
#include <QSignalSpy>
#include <QTcpSocket>
#include <QTest>
#include <QTemporaryDir>

#include <gtest/gtest.h>

namespace {

// A session window on real platform controls, with message and input boxes
// captured instead of shown.
struct SessionWindowTest : ::testing::Test
{
    SessionWindowTest()
    {
        UserDialogs::setMessageHandler([this](const UserDialogs::MessageRequest &r) { messages.append(r); });
        UserDialogs::setInputHandler([this](const UserDialogs::InputRequest &r) {
            inputs.append(r);
            return nextAnswer;
        });
        window.show();
    }
    ~SessionWindowTest() override
    {
        UserDialogs::setMessageHandler({});
        UserDialogs::setInputHandler({});
    }

    template <typename T> T *child(const char *name)
    {
        T *widget = window.findChild<T *>(QString::fromLatin1(name));
        EXPECT_NE(widget, nullptr) << name;
        return widget;
    }
    QString label(const char *name) { return child<QLabel>(name)->text(); }

    QTemporaryDir portFolder;
    SessionEngine engine { SessionPlatform::real(portFolder.path()) };
    SessionWindow window { &engine };
    QList<UserDialogs::MessageRequest> messages;
    QList<UserDialogs::InputRequest> inputs;
    std::optional<QString> nextAnswer;
};

TEST_F(SessionWindowTest, NewWindowShowsTheDefaults)
{
    EXPECT_EQ(window.objectName(), QStringLiteral("frmDocument"));
    EXPECT_EQ(window.windowTitle(), QStringLiteral("New - RS232 to TCP/IP"));
    auto *connector = child<QComboBox>("Combo2");
    ASSERT_EQ(connector->count(), 257);
    EXPECT_EQ(connector->currentText(), QStringLiteral("None"));
    EXPECT_EQ(connector->itemText(1), QStringLiteral("COM1"));
    EXPECT_EQ(connector->itemText(256), QStringLiteral("COM256"));
    EXPECT_EQ(child<QComboBox>("Combo1_0")->currentText(), QStringLiteral("9600"));
    auto *parity = child<QComboBox>("Combo1_1");
    const QStringList parityOrder { "None", "Even", "Odd", "Mark", "Space" };
    for (int i = 0; i < parityOrder.size(); ++i)
        EXPECT_EQ(parity->itemText(i), parityOrder[i]);
    EXPECT_EQ(parity->currentIndex(), 0);
    EXPECT_EQ(child<QComboBox>("Combo1_2")->currentText(), QStringLiteral("8"));
    EXPECT_EQ(child<QComboBox>("Combo1_3")->currentText(), QStringLiteral("1"));
    EXPECT_EQ(child<QComboBox>("Combo1_4")->currentText(), QStringLiteral("None"));
    EXPECT_EQ(child<QComboBox>("Combo1_4")->itemText(3), QStringLiteral("Opto-RS"));
    EXPECT_EQ(child<QComboBox>("Combo1_5")->currentText(), QStringLiteral("8192"));
    EXPECT_EQ(child<QComboBox>("Combo1_5")->count(), 16);
    EXPECT_EQ(child<QLineEdit>("PortNumber")->text(), QStringLiteral("1000"));
    EXPECT_EQ(child<QLineEdit>("txtTimeoutValue")->text(), QStringLiteral("150"));
    EXPECT_TRUE(child<QRadioButton>("TCPOption_0")->isChecked());
    for (const char *box : { "BufferSerData", "chkVPort", "WaitForCr", "chkUDP" })
        EXPECT_FALSE(child<QAbstractButton>(box)->isChecked()) << box;
    EXPECT_FALSE(child<QWidget>("btnLogin")->isVisible());
    EXPECT_EQ(child<QAbstractButton>("Command1")->text(), QStringLiteral("Activate"));
    EXPECT_EQ(label("StatusBar1_0"), QStringLiteral("COM Status:"));
    EXPECT_EQ(label("StatusBar1_1"), QStringLiteral("TCP/IP Status:"));
    EXPECT_EQ(child<QGroupBox>("Frame1")->title(), QStringLiteral("Serial Port"));
    EXPECT_EQ(label("Label2"), QStringLiteral("Remote Host IP Address"));
    EXPECT_EQ(label("Label3"), QStringLiteral("Remote Port"));

    // The engine holds the same values as the controls.
    const SessionSettings &s = engine.settings();
    EXPECT_EQ(s.Connector, 0);
    EXPECT_EQ(s.BaudRate, 6);
    EXPECT_EQ(s.Databits, 3);
    EXPECT_EQ(s.BufferSize, 2);
    EXPECT_EQ(s.PortNumber, QStringLiteral("1000"));
    EXPECT_EQ(s.TCPOption, 0);
    EXPECT_EQ(engine.record().AllowMultiConnect, 1);
    EXPECT_EQ(engine.record().ConnectOnVirtualOpen, 1);
    EXPECT_EQ(PingTimeoutMs, 1000);

    // This machine has at least the loopback address, so it can serve.
    EXPECT_FALSE(engine.record().LocalIPAddress.isEmpty());
    EXPECT_TRUE(child<QWidget>("TCPOption_1")->isEnabled());
    EXPECT_EQ(child<QComboBox>("LocalIP")->currentText(), engine.record().LocalIPAddress);
}

TEST_F(SessionWindowTest, RoleSwitchChangesCaptionsAndTheAddressField)
{
    child<QRadioButton>("TCPOption_1")->click();
    EXPECT_EQ(label("Label2"), QStringLiteral("Local IP Address"));
    EXPECT_EQ(label("Label3"), QStringLiteral("Local Port"));
    EXPECT_FALSE(child<QWidget>("IPAddress")->isVisible());
    EXPECT_TRUE(child<QWidget>("LocalIP")->isVisible());
    EXPECT_EQ(engine.settings().TCPOption, 1);

    child<QRadioButton>("TCPOption_0")->click();
    EXPECT_EQ(label("Label2"), QStringLiteral("Remote Host IP Address"));
    EXPECT_EQ(label("Label3"), QStringLiteral("Remote Port"));
    EXPECT_TRUE(child<QWidget>("IPAddress")->isVisible());
    EXPECT_FALSE(child<QWidget>("LocalIP")->isVisible());
    EXPECT_EQ(engine.settings().TCPOption, 0);
}

TEST_F(SessionWindowTest, PortAbove65535WarnsOnEveryKeystrokeButKeepsTheText)
{
    auto *port = child<QLineEdit>("PortNumber");
    port->clear();
    QTest::keyClicks(port, QStringLiteral("6553"));
    QTest::keyClicks(port, QStringLiteral("5"));
    EXPECT_TRUE(messages.isEmpty()) << "65535 is a valid port";

    port->clear();
    QTest::keyClicks(port, QStringLiteral("7000"));
    EXPECT_TRUE(messages.isEmpty());
    QTest::keyClicks(port, QStringLiteral("0"));
    ASSERT_EQ(messages.size(), 1);
    EXPECT_EQ(messages[0].text, QStringLiteral("Port numbers must range between 0 and 65535"));
    EXPECT_EQ(messages[0].title, QStringLiteral("Error"));
    QTest::keyClicks(port, QStringLiteral("1"));
    EXPECT_EQ(messages.size(), 2);
    EXPECT_EQ(port->text(), QStringLiteral("700001"));
    EXPECT_EQ(engine.settings().PortNumber, QStringLiteral("700001"));

    // Text that is no number reads as 0 and negative numbers pass here.
    port->clear();
    QTest::keyClicks(port, QStringLiteral("abc -5"));
    EXPECT_EQ(messages.size(), 2);
}

TEST_F(SessionWindowTest, ConnectorChoiceSetsTheCommandTopicAndTypedTextSelectsOnlyAConnector)
{
    auto *connector = child<QComboBox>("Combo2");
    QSignalSpy topics(&engine, &SessionEngine::commandTopicChanged);
    connector->setCurrentIndex(3);
    Q_EMIT connector->activated(3);
    EXPECT_EQ(engine.commandTopic(), QStringLiteral("COM3"));
    EXPECT_EQ(engine.settings().Connector, 3);
    EXPECT_EQ(topics.count(), 1);

    connector->setEditText(QStringLiteral("my port"));
    EXPECT_EQ(engine.settings().Connector, -1);
    EXPECT_EQ(engine.settings().ConnectorText, QStringLiteral("my port"));

    // A typed connector name, left with Tab, is chosen as if picked.
    QApplication::setActiveWindow(&window);
    connector->setFocus();
    connector->clearEditText();
    QTest::keyClicks(connector, QStringLiteral("COM7"));
    QTest::keyClick(connector, Qt::Key_Tab);
    EXPECT_EQ(connector->currentIndex(), 7);
    EXPECT_EQ(engine.settings().Connector, 7);
    EXPECT_EQ(engine.settings().ConnectorText, QStringLiteral("COM7"));
    EXPECT_EQ(engine.commandTopic(), QStringLiteral("COM7"));
    connector->setEditText(QStringLiteral("my port"));

    // Every session lists the same connectors but keeps its own choice, and
    // typed text never adds to the list the others see.
    QTemporaryDir otherFolder;
    SessionEngine otherEngine { SessionPlatform::real(otherFolder.path()) };
    SessionWindow other { &otherEngine };
    auto *otherConnector = other.findChild<QComboBox *>(QStringLiteral("Combo2"));
    ASSERT_NE(otherConnector, nullptr);
    otherConnector->setCurrentIndex(7);
    QTest::keyClick(connector->lineEdit(), Qt::Key_Return);
    EXPECT_EQ(otherConnector->count(), 257);
    EXPECT_EQ(otherConnector->currentText(), QStringLiteral("COM7"));
    EXPECT_EQ(connector->currentText(), QStringLiteral("my port"));
    EXPECT_EQ(otherEngine.settings().Connector, 7);
}

TEST_F(SessionWindowTest, SetWindowNameKeepsTheCaptionOnEmptyOrCancel)
{
    nextAnswer = QString();
    window.Command3_Click();
    ASSERT_EQ(inputs.size(), 1);
    EXPECT_EQ(inputs[0].title, QStringLiteral("Set Window Name"));
    EXPECT_EQ(inputs[0].defaultText, QStringLiteral("New - RS232 to TCP/IP"));
    EXPECT_EQ(window.windowTitle(), QStringLiteral("New - RS232 to TCP/IP"));

    nextAnswer = std::nullopt;
    window.Command3_Click();
    EXPECT_EQ(window.windowTitle(), QStringLiteral("New - RS232 to TCP/IP"));

    nextAnswer = QStringLiteral("Line 4");
    window.Command3_Click();
    EXPECT_EQ(window.windowTitle(), QStringLiteral("Line 4"));
    EXPECT_EQ(engine.settings().SessionDescription, QStringLiteral("Line 4"));
}

TEST_F(SessionWindowTest, StatusLinesAndLockFollowTheEngine)
{
    QSignalSpy changes(&engine, &SessionEngine::statusLineChanged);
    engine.setStatusLine(SessionEngine::NetworkLine, QStringLiteral("TCP/IP Status: Listening..."));
    engine.setStatusLine(SessionEngine::NetworkLine, QStringLiteral("TCP/IP Status: Listening..."));
    EXPECT_EQ(label("StatusBar1_1"), QStringLiteral("TCP/IP Status: Listening..."));
    EXPECT_EQ(changes.count(), 1) << "an unchanged text is no change";

    engine.setSettingsLocked(true);
    for (const char *locked : { "Combo2", "Combo1_0", "Combo1_5", "Command2", "TCPOption_0", "TCPOption_1",
                                "IPAddress", "PortNumber", "LocalIP", "chkVPort", "chkUDP" })
        EXPECT_FALSE(child<QWidget>(locked)->isEnabled()) << locked;
    for (const char *free : { "BufferSerData", "WaitForCr", "txtTimeoutValue", "Command3", "Command1" })
        EXPECT_TRUE(child<QWidget>(free)->isEnabled()) << free;
    engine.setSettingsLocked(false);
    EXPECT_TRUE(child<QWidget>("Combo1_0")->isEnabled());

    // Serial settings changed by a command show in the lists.
    ASSERT_TRUE(engine.executeCommand(QStringLiteral("[COMSETTINGS=19200,E,7,2]")));
    EXPECT_EQ(child<QComboBox>("Combo1_0")->currentText(), QStringLiteral("19200"));
    EXPECT_EQ(child<QComboBox>("Combo1_1")->currentText(), QStringLiteral("Even"));
    EXPECT_EQ(child<QComboBox>("Combo1_2")->currentText(), QStringLiteral("7"));
    EXPECT_EQ(child<QComboBox>("Combo1_3")->currentText(), QStringLiteral("2"));
}

TEST_F(SessionWindowTest, IOOptionsTakeTheDialogsValueUnlessCancelled)
{
    window.showIOOptionsDialog = [&](bool server, SessionOptions options) -> std::optional<SessionOptions> {
        EXPECT_FALSE(server);
        EXPECT_EQ(options.ConnectOnVirtualOpen, 1);
        options.ClientOptions = 2;
        options.ConnectOnVirtualOpen = 0;
        return options;
    };
    window.Command2_Click();
    EXPECT_EQ(engine.record().ClientOptions, 2);
    EXPECT_EQ(engine.record().ConnectOnVirtualOpen, 0);

    child<QRadioButton>("TCPOption_1")->click();
    window.showIOOptionsDialog = [&](bool server, const SessionOptions &) -> std::optional<SessionOptions> {
        EXPECT_TRUE(server);
        return std::nullopt;
    };
    window.Command2_Click();
    EXPECT_EQ(engine.record().AllowMultiConnect, 1);
    EXPECT_EQ(engine.record().ServerSerialOptions, 0);
}

TEST_F(SessionWindowTest, DoubleClickOnTheNetworkPanelListsConnectedClientsInServerRole)
{
    // A listening member 0 hands two real loopback clients to members 1 and 2.
    SocketMember *listener = engine.socket(0);
    ASSERT_TRUE(listener->bind(0, QStringLiteral("127.0.0.1")));
    ASSERT_TRUE(listener->listen());
    int next = 1;
    QObject::connect(listener, &SocketMember::connectionRequested, [&](int, qintptr id) {
        engine.createSocketMember(next)->accept(id);
        engine.record().MaxSocketIndex = next++;
    });
    QTcpSocket first, second;
    first.connectToHost(QStringLiteral("127.0.0.1"), quint16(listener->localPort()));
    second.connectToHost(QStringLiteral("127.0.0.1"), quint16(listener->localPort()));
    ASSERT_TRUE(waitUntil([&] { return engine.connectedClientAddresses().size() == 2; }));

    window.Frame2_DblClick();
    EXPECT_TRUE(messages.isEmpty()) << "client role shows nothing";

    child<QRadioButton>("TCPOption_1")->click();
    window.Frame2_DblClick();
    ASSERT_EQ(messages.size(), 1);
    EXPECT_EQ(messages[0].title, QStringLiteral("Connected Clients:"));
    EXPECT_EQ(messages[0].text, QStringLiteral("127.0.0.1\r\n127.0.0.1\r\n"));
}

} // namespace
