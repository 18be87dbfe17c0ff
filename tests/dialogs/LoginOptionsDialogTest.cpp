#include "DialogTestSupport.h"

#include "dialogs/LoginOptionsDialog.h"
#include "support/UiLanguageScope.h"

#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

const char *const kBoxes[] = { "txtUserPrompt", "txtUserPromptResponse", "txtPasswordPrompt",
                               "txtPasswordPromptResponse" };

struct LoginOptionsDialogTest : ::testing::Test
{
    void setTexts(const QStringList &texts)
    {
        OptionsTransfer &t = OptionsTransfer::global();
        t.UserPrompt = texts.value(0);
        t.UserPromptResponse = texts.value(1);
        t.PasswordPrompt = texts.value(2);
        t.PasswordPromptResponse = texts.value(3);
    }
    QStringList transferTexts() const
    {
        const OptionsTransfer &t = OptionsTransfer::global();
        return { t.UserPrompt, t.UserPromptResponse, t.PasswordPrompt, t.PasswordPromptResponse };
    }
    QStringList shownTexts(const QWidget &dialog) const
    {
        QStringList texts;
        for (const char *name : kBoxes)
            texts << control<QLineEdit>(dialog, QString::fromLatin1(name))->text();
        return texts;
    }
    void retype(const QWidget &dialog, const char *name, const QString &text)
    {
        auto *box = control<QLineEdit>(dialog, QString::fromLatin1(name));
        box->selectAll();
        QTest::keyClick(box, Qt::Key_Delete);
        QTest::keyClicks(box, text);
    }

    TransferScope transfer;
    const QStringList defaults{ u"Username:"_s, QString(), u"Password:"_s, QString() };
};

TEST_F(LoginOptionsDialogTest, OkStoresTheTextsExactlyAndClearsTheCancelFlag)
{
    struct Row
    {
        const char *label;
        QStringList typed;
    };
    const Row rows[] = {
        { "blanks and punctuation kept", { u"  User name? "_s, u"admin , root"_s, u"Pass-word: "_s, u" p@ss w0rd; "_s } },
        { "all four emptied", { QString(), QString(), QString(), QString() } },
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.label);
        setTexts(defaults);
        OptionsTransfer::global().LoginCancel = -1;
        LoginOptionsDialog dialog;
        dialog.show();
        for (int index = 0; index < 4; ++index)
            retype(dialog, kBoxes[index], row.typed[index]);
        clickControl(dialog, "btnOK");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(transferTexts(), row.typed);
        EXPECT_EQ(OptionsTransfer::global().LoginCancel, 0);
    }
}

TEST_F(LoginOptionsDialogTest, CancelAndTheWindowFrameLeaveTheTextsAsPassedIn)
{
    setTexts(defaults);
    {
        LoginOptionsDialog dialog;
        dialog.show();
        retype(dialog, "txtUserPrompt", u"changed"_s);
        clickControl(dialog, "btnCancel");
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(transferTexts(), defaults);
        EXPECT_EQ(OptionsTransfer::global().LoginCancel, -1);
    }
    // The frame sets no flag: the last one stays, whichever it was.
    for (int lastFlag : { -1, 0 }) {
        OptionsTransfer::global().LoginCancel = lastFlag;
        LoginOptionsDialog dialog;
        dialog.show();
        retype(dialog, "txtPasswordPromptResponse", u"changed"_s);
        EXPECT_TRUE(dialog.close());
        EXPECT_EQ(transferTexts(), defaults);
        EXPECT_EQ(OptionsTransfer::global().LoginCancel, lastFlag);
    }
}

TEST_F(LoginOptionsDialogTest, EnterAndEscAreBoundToNeitherButton)
{
    setTexts(defaults);
    OptionsTransfer::global().LoginCancel = 0;
    LoginOptionsDialog dialog;
    dialog.show();
    auto *box = control<QLineEdit>(dialog, u"txtUserPrompt"_s);
    box->setFocus();
    retype(dialog, "txtUserPrompt", u"changed"_s);

    QTest::keyClick(box, Qt::Key_Return);
    QTest::keyClick(box, Qt::Key_Escape);
    EXPECT_TRUE(dialog.isVisible());
    EXPECT_EQ(transferTexts(), defaults);

    // A focused button takes Enter as a click.
    auto *cancel = control<QPushButton>(dialog, u"btnCancel"_s);
    cancel->setFocus();
    QTest::keyClick(cancel, Qt::Key_Return);
    EXPECT_FALSE(dialog.isVisible());
    EXPECT_EQ(OptionsTransfer::global().LoginCancel, -1);
    EXPECT_EQ(transferTexts(), defaults);
}

} // namespace
