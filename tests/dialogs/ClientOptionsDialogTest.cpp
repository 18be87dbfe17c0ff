#include "DialogTestSupport.h"

#include "dialogs/ClientOptionsDialog.h"

#include <QPushButton>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

struct ClientOptionsDialogTest : ::testing::Test
{
    void give(int clientOptions, int connectOnVirtualOpen)
    {
        given.ClientOptions = clientOptions;
        given.ConnectOnVirtualOpen = connectOnVirtualOpen;
    }
    static void expectOptions(const SessionOptions &o, int clientOptions, int connectOnVirtualOpen)
    {
        EXPECT_EQ(o.ClientOptions, clientOptions);
        EXPECT_EQ(o.ConnectOnVirtualOpen, connectOnVirtualOpen);
    }

    SessionOptions given;
};

TEST_F(ClientOptionsDialogTest, OkReturnsTheEditedValues)
{
    give(2, 1);
    {
        ClientOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "Command1");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
        expectOptions(dialog.options(), 2, 1);
    }
    give(0, 0);
    {
        ClientOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "Option1_1");
        clickControl(dialog, "chkConnectOnVirtualPort");
        clickControl(dialog, "Command1");
        expectOptions(dialog.options(), 1, 1);
    }
    give(1, 1);
    {
        ClientOptionsDialog dialog(given);
        dialog.show();
        clickControl(dialog, "Option1_2");
        clickControl(dialog, "chkConnectOnVirtualPort");
        clickControl(dialog, "Command1");
        expectOptions(dialog.options(), 2, 0);
    }
    give(4, 3);
    {
        ClientOptionsDialog dialog(given);
        dialog.accept();
        expectOptions(dialog.options(), 0, 0);
    }
}

TEST_F(ClientOptionsDialogTest, CancelRejects)
{
    give(2, 1);
    ClientOptionsDialog dialog(given);
    dialog.show();
    clickControl(dialog, "Option1_0");
    clickControl(dialog, "chkConnectOnVirtualPort");
    clickControl(dialog, "Command2");
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
    EXPECT_FALSE(dialog.isVisible());
}

TEST_F(ClientOptionsDialogTest, EscPressesOkAndEnterOnlyAFocusedButton)
{
    give(0, 0);
    {
        ClientOptionsDialog dialog(given);
        dialog.show();
        EXPECT_FALSE(control<QPushButton>(dialog, u"Command1"_s)->isDefault());
        EXPECT_FALSE(control<QPushButton>(dialog, u"Command2"_s)->isDefault());

        auto *option = control<QRadioButton>(dialog, u"Option1_2"_s);
        option->setFocus();
        clickControl(dialog, "Option1_2");
        QTest::keyClick(option, Qt::Key_Return);
        QTest::keyClick(option, Qt::Key_Enter);
        EXPECT_TRUE(dialog.isVisible());

        // OK carries the cancel-button role here: Esc keeps the edit.
        QTest::keyClick(option, Qt::Key_Escape);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        expectOptions(dialog.options(), 2, 0);
    }
    give(1, 1);
    {
        // Enter on the focused Cancel button presses Cancel.
        ClientOptionsDialog dialog(given);
        dialog.show();
        auto *cancel = control<QPushButton>(dialog, u"Command2"_s);
        cancel->setFocus();
        QTest::keyClick(cancel, Qt::Key_Return);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Rejected);
    }
}

} // namespace
