#include "DialogTestSupport.h"

#include "dialogs/ServerOptionsDialog.h"

#include <QPushButton>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

struct ServerOptionsDialogTest : ::testing::Test
{
    void setTransfer(int multi, int serial, int tcp)
    {
        OptionsTransfer &t = OptionsTransfer::global();
        t.AllowMultiConnect = multi;
        t.ServerSerialOptions = serial;
        t.ServerTCPOptions = tcp;
    }
    void expectTransfer(int multi, int serial, int tcp)
    {
        const OptionsTransfer &t = OptionsTransfer::global();
        EXPECT_EQ(t.AllowMultiConnect, multi);
        EXPECT_EQ(t.ServerSerialOptions, serial);
        EXPECT_EQ(t.ServerTCPOptions, tcp);
    }

    TransferScope transfer;
};

TEST_F(ServerOptionsDialogTest, OkStoresTheEditedValues)
{
    // Unchanged: the same three values come back.
    setTransfer(1, 2, 1);
    {
        ServerOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "Command1");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
        expectTransfer(1, 2, 1);
    }
    // "Ignore" is option 1 and "first connected client" option 2 in each
    // group; the groups do not clear each other, and unchecking stores 0.
    setTransfer(1, 0, 0);
    {
        ServerOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "OptionSerial_1");
        clickControl(dialog, "OptionTCP_2");
        clickControl(dialog, "chkMultiClients");
        clickControl(dialog, "Command1");
        expectTransfer(0, 1, 2);
    }
    setTransfer(0, 1, 2);
    {
        ServerOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "OptionSerial_2");
        clickControl(dialog, "OptionTCP_1");
        clickControl(dialog, "chkMultiClients");
        clickControl(dialog, "Command1");
        expectTransfer(1, 2, 1);
    }
    // Values the dialog could not show come back as what it showed.
    setTransfer(5, 9, -3);
    {
        ServerOptionsDialog dialog;
        dialog.accept();
        expectTransfer(0, 0, 0);
    }
}

TEST_F(ServerOptionsDialogTest, CancelMarksTheMultiClientValueAndLeavesTheRest)
{
    setTransfer(1, 2, 1);
    ServerOptionsDialog dialog;
    dialog.show();
    clickControl(dialog, "OptionSerial_0");
    clickControl(dialog, "OptionTCP_0");
    clickControl(dialog, "chkMultiClients");
    clickControl(dialog, "Command2");
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
    EXPECT_FALSE(dialog.isVisible());
    expectTransfer(OptionsTransfer::kCancelled, 2, 1);
}

TEST_F(ServerOptionsDialogTest, EscPressesCancelAndEnterOnlyAFocusedButton)
{
    setTransfer(0, 1, 1);
    {
        ServerOptionsDialog dialog;
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
        expectTransfer(0, 1, 1);

        QTest::keyClick(option, Qt::Key_Escape);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Rejected);
        expectTransfer(OptionsTransfer::kCancelled, 1, 1);
    }
    setTransfer(0, 1, 1);
    {
        // Enter on the focused OK button presses it.
        ServerOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "OptionSerial_2");
        auto *ok = control<QPushButton>(dialog, u"Command1"_s);
        ok->setFocus();
        QTest::keyClick(ok, Qt::Key_Return);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        expectTransfer(0, 2, 1);
    }
}

} // namespace
