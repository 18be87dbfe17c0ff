#include "DialogTestSupport.h"

#include "dialogs/ServerOptionsDialog.h"

#include <QPushButton>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

struct ServerOptionsDialogTest : ::testing::Test
{
    void give(int multi, int serial, int tcp)
    {
        given.AllowMultiConnect = multi;
        given.ServerSerialOptions = serial;
        given.ServerTCPOptions = tcp;
    }
    static void expectOptions(const SessionOptions &o, int multi, int serial, int tcp)
    {
        EXPECT_EQ(o.AllowMultiConnect, multi);
        EXPECT_EQ(o.ServerSerialOptions, serial);
        EXPECT_EQ(o.ServerTCPOptions, tcp);
    }

    SessionOptions given;
};

TEST_F(ServerOptionsDialogTest, OkReturnsTheEditedValues)
{
    // Unchanged: the same three values come back.
    give(1, 2, 1);
    {
        ServerOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "Command1");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
        expectOptions(dialog.options(), 1, 2, 1);
    }
    // "Ignore" is option 1 and "first connected client" option 2 in each
    // group; the groups do not clear each other, and unchecking stores 0.
    give(1, 0, 0);
    {
        ServerOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "OptionSerial_1");
        clickControl(dialog, "OptionTCP_2");
        clickControl(dialog, "chkMultiClients");
        clickControl(dialog, "Command1");
        expectOptions(dialog.options(), 0, 1, 2);
    }
    give(0, 1, 2);
    {
        ServerOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "OptionSerial_2");
        clickControl(dialog, "OptionTCP_1");
        clickControl(dialog, "chkMultiClients");
        clickControl(dialog, "Command1");
        expectOptions(dialog.options(), 1, 2, 1);
    }
    // Values the dialog could not show come back as what it showed.
    give(5, 9, -3);
    {
        ServerOptionsDialog dialog(given);
        dialog.accept();
        expectOptions(dialog.options(), 0, 0, 0);
    }
}

TEST_F(ServerOptionsDialogTest, CancelRejects)
{
    give(1, 2, 1);
    ServerOptionsDialog dialog(given);
    dialog.show();
    clickControl(dialog, "OptionSerial_0");
    clickControl(dialog, "OptionTCP_0");
    clickControl(dialog, "chkMultiClients");
    clickControl(dialog, "Command2");
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
    EXPECT_FALSE(dialog.isVisible());
}

TEST_F(ServerOptionsDialogTest, EscPressesCancelAndEnterOnlyAFocusedButton)
{
    give(0, 1, 1);
    {
        ServerOptionsDialog dialog(given);
        dialog.show();
        auto *ok = control<QPushButton>(dialog, u"Command1"_s);
        auto *cancel = control<QPushButton>(dialog, u"Command2"_s);
        EXPECT_FALSE(ok->isDefault());
        EXPECT_FALSE(cancel->isDefault());

        // No default button: Enter on an option changes nothing.
        auto *option = control<QRadioButton>(dialog, u"OptionTCP_2"_s);
        option->setFocus();
        clickControl(dialog, "OptionTCP_2");
        QTest::keyClick(option, Qt::Key_Return);
        QTest::keyClick(option, Qt::Key_Enter);
        EXPECT_TRUE(dialog.isVisible());

        QTest::keyClick(option, Qt::Key_Escape);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Rejected);
    }
    give(0, 1, 1);
    {
        // Enter on the focused OK button presses it.
        ServerOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "OptionSerial_2");
        auto *ok = control<QPushButton>(dialog, u"Command1"_s);
        ok->setFocus();
        QTest::keyClick(ok, Qt::Key_Return);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        expectOptions(dialog.options(), 0, 2, 1);
    }
}

} // namespace
