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
    static SessionOptions withTexts(const QStringList &texts)
    {
        SessionOptions options;
        options.UserPrompt = texts.value(0);
        options.UserPromptResponse = texts.value(1);
        options.PasswordPrompt = texts.value(2);
        options.PasswordPromptResponse = texts.value(3);
        return options;
    }
    static QStringList textsOf(const SessionOptions &o)
    {
        return { o.UserPrompt, o.UserPromptResponse, o.PasswordPrompt, o.PasswordPromptResponse };
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

    const QStringList defaults{ u"Username:"_s, QString(), u"Password:"_s, QString() };
};

TEST_F(LoginOptionsDialogTest, OkReturnsTheTextsExactly)
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
        LoginOptionsDialog dialog(withTexts(defaults));
        dialog.show();
        EXPECT_EQ(shownTexts(dialog), defaults);
        for (int index = 0; index < 4; ++index)
            retype(dialog, kBoxes[index], row.typed[index]);
        clickControl(dialog, "btnOK");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(textsOf(dialog.options()), row.typed);
    }
}

TEST_F(LoginOptionsDialogTest, CancelAndTheWindowFrameReject)
{
    for (const bool frame : { false, true }) {
        LoginOptionsDialog dialog(withTexts(defaults));
        dialog.show();
        retype(dialog, "txtUserPrompt", u"changed"_s);
        if (frame)
            EXPECT_TRUE(dialog.close());
        else
            clickControl(dialog, "btnCancel");
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Rejected);
    }
}

TEST_F(LoginOptionsDialogTest, EnterAndEscAreBoundToNeitherButton)
{
    LoginOptionsDialog dialog(withTexts(defaults));
    dialog.show();
    auto *box = control<QLineEdit>(dialog, u"txtUserPrompt"_s);
    box->setFocus();
    retype(dialog, "txtUserPrompt", u"changed"_s);

    QTest::keyClick(box, Qt::Key_Return);
    QTest::keyClick(box, Qt::Key_Escape);
    EXPECT_TRUE(dialog.isVisible());

    // A focused button takes Enter as a click.
    auto *cancel = control<QPushButton>(dialog, u"btnCancel"_s);
    cancel->setFocus();
    QTest::keyClick(cancel, Qt::Key_Return);
    EXPECT_FALSE(dialog.isVisible());
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
}

} // namespace
