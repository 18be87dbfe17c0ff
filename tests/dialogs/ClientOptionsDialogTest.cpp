#include "DialogTestSupport.h"

#include "dialogs/ClientOptionsDialog.h"

#include <QPushButton>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

struct ClientOptionsDialogTest : ::testing::Test
{
    void setTransfer(int clientOptions, int connectOnVirtualOpen)
    {
        OptionsTransfer &t = OptionsTransfer::global();
        t.ClientOptions = clientOptions;
        t.ConnectOnVirtualOpen = connectOnVirtualOpen;
    }
    void expectTransfer(int clientOptions, int connectOnVirtualOpen)
    {
        const OptionsTransfer &t = OptionsTransfer::global();
        EXPECT_EQ(t.ClientOptions, clientOptions);
        EXPECT_EQ(t.ConnectOnVirtualOpen, connectOnVirtualOpen);
    }

    TransferScope transfer;
};

TEST_F(ClientOptionsDialogTest, OkStoresTheEditedValues)
{
    setTransfer(2, 1);
    {
        ClientOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "Command1");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
        expectTransfer(2, 1);
    }
    setTransfer(0, 0);
    {
        ClientOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "Option1_1");
        clickControl(dialog, "chkConnectOnVirtualPort");
        clickControl(dialog, "Command1");
        expectTransfer(1, 1);
    }
    setTransfer(1, 1);
    {
        ClientOptionsDialog dialog;
        dialog.show();
        clickControl(dialog, "Option1_2");
        clickControl(dialog, "chkConnectOnVirtualPort");
        clickControl(dialog, "Command1");
        expectTransfer(2, 0);
    }
    setTransfer(4, 3);
    {
        ClientOptionsDialog dialog;
        dialog.accept();
        expectTransfer(0, 0);
    }
}

TEST_F(ClientOptionsDialogTest, CancelMarksTheClientOptionsAndLeavesTheRest)
{
    setTransfer(2, 1);
    ClientOptionsDialog dialog;
    dialog.show();
    clickControl(dialog, "Option1_0");
    clickControl(dialog, "chkConnectOnVirtualPort");
    clickControl(dialog, "Command2");
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
    EXPECT_FALSE(dialog.isVisible());
    expectTransfer(OptionsTransfer::kCancelled, 1);
}

TEST_F(ClientOptionsDialogTest, EscPressesOkAndEnterOnlyAFocusedButton)
{
    setTransfer(0, 0);
    {
        ClientOptionsDialog dialog;
        dialog.show();
        EXPECT_FALSE(control<QPushButton>(dialog, u"Command1"_s)->isDefault());
        EXPECT_FALSE(control<QPushButton>(dialog, u"Command2"_s)->isDefault());

        auto *option = control<QRadioButton>(dialog, u"Option1_2"_s);
        option->setFocus();
        clickControl(dialog, "Option1_2");
        QTest::keyClick(option, Qt::Key_Return);
        QTest::keyClick(option, Qt::Key_Enter);
        EXPECT_TRUE(dialog.isVisible());
        expectTransfer(0, 0);

        // OK carries the cancel-button role here: Esc keeps the edit.
        QTest::keyClick(option, Qt::Key_Escape);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        expectTransfer(2, 0);
    }
    setTransfer(1, 1);
    {
        // Enter on the focused Cancel button presses Cancel.
        ClientOptionsDialog dialog;
        dialog.show();
        auto *cancel = control<QPushButton>(dialog, u"Command2"_s);
        cancel->setFocus();
        QTest::keyClick(cancel, Qt::Key_Return);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Rejected);
        expectTransfer(OptionsTransfer::kCancelled, 1);
    }
}

} // namespace
