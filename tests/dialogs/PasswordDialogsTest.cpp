#include "DialogTestSupport.h"
#include "MessageRecorder.h"

#include "config/GlobalOptions.h"
#include "dialogs/PasswordDialogs.h"
#include "localisation/ResourceStrings.h"
#include "support/UiLanguageScope.h"

#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QScreen>
#include <QStyle>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

struct PasswordDialogsTest : ::testing::Test
{
    ~PasswordDialogsTest() override { GlobalOptions::global().Password = m_savedPassword; }

    QString &password() { return GlobalOptions::global().Password; }

    static void expectMasked(const QWidget &dialog, const char *name)
    {
        SCOPED_TRACE(name);
        auto *box = control<QLineEdit>(dialog, QString::fromLatin1(name));
        ASSERT_NE(box, nullptr);
        EXPECT_EQ(box->echoMode(), QLineEdit::Password);
        EXPECT_EQ(box->style()->styleHint(QStyle::SH_LineEdit_PasswordCharacter, nullptr, box), u'*');
        EXPECT_NE(box->displayText(), box->text());
    }

    static void expectCentred(const QWidget &dialog)
    {
        const QRect screen = dialog.screen()->geometry();
        EXPECT_EQ(dialog.pos(), QPoint(screen.x() + (screen.width() - dialog.width()) / 2,
                                       screen.y() + (screen.height() - dialog.height()) / 2));
    }

    static QString textOf(const QWidget &dialog, const char *name)
    {
        return control<QLineEdit>(dialog, QString::fromLatin1(name))->text();
    }

    MessageRecorder messages;

private:
    QString m_savedPassword = GlobalOptions::global().Password;
};

TEST_F(PasswordDialogsTest, SetPasswordKeepsTheDialogOpenUntilTheConfirmationMatches)
{
    password() = u"old"_s;
    SetPasswordDialog dialog;
    dialog.show();
    auto *text1 = control<QLineEdit>(dialog, u"Text1"_s);
    auto *text2 = control<QLineEdit>(dialog, u"Text2"_s);
    text1->clear();
    text2->clear();
    QTest::keyClicks(text1, u"Secret"_s);
    QTest::keyClicks(text2, u"secret"_s); // differs in case only

    clickControl(dialog, "Command1");
    ASSERT_EQ(messages.messages().size(), 1);
    EXPECT_EQ(messages.messages()[0].text, LoadResString(5110));
    EXPECT_EQ(messages.messages()[0].title, u"Velloca"_s);
    EXPECT_TRUE(dialog.isVisible());
    EXPECT_EQ(text1->text(), u"Secret"_s);
    EXPECT_EQ(text2->text(), u"secret"_s);
    EXPECT_EQ(password(), u"old"_s);

    text2->clear();
    QTest::keyClicks(text2, u"Secret"_s);
    QTest::keyClick(text2, Qt::Key_Return); // Enter presses the default button
    EXPECT_EQ(messages.messages().size(), 1);
    EXPECT_FALSE(dialog.isVisible());
    EXPECT_EQ(dialog.result(), QDialog::Accepted);
    EXPECT_EQ(password(), u"Secret"_s);
}

TEST_F(PasswordDialogsTest, SetPasswordWithBothBoxesEmptiedRemovesTheProtectionAndCancelKeepsIt)
{
    password() = u"old"_s;
    {
        SetPasswordDialog dialog;
        dialog.show();
        clickControl(dialog, "Command1");
        EXPECT_EQ(password(), u"old"_s) << "OK without changes keeps it";
    }
    for (const char *leave : { "Command2", "Esc" }) {
        SCOPED_TRACE(leave);
        SetPasswordDialog dialog;
        dialog.show();
        control<QLineEdit>(dialog, u"Text1"_s)->setText(u"new"_s);
        control<QLineEdit>(dialog, u"Text2"_s)->setText(u"new"_s);
        if (QByteArray(leave) == "Esc")
            QTest::keyClick(control<QLineEdit>(dialog, u"Text2"_s), Qt::Key_Escape);
        else
            clickControl(dialog, leave);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(password(), u"old"_s);
    }
    {
        SetPasswordDialog dialog;
        dialog.show();
        control<QLineEdit>(dialog, u"Text1"_s)->clear();
        control<QLineEdit>(dialog, u"Text2"_s)->clear();
        clickControl(dialog, "Command1");
        EXPECT_TRUE(password().isEmpty());
    }
    EXPECT_TRUE(messages.messages().isEmpty());
}

TEST_F(PasswordDialogsTest, EnterPasswordFormReturnsTheEntryOrNothingForCancel)
{
    UiLanguageScope japanese(UiLanguage::Japanese); // Form2 stays English
    password() = u"not shown"_s;
    {
        EnterPasswordDialog dialog;
        dialog.show();
        EXPECT_EQ(dialog.objectName(), u"Form2"_s);
        EXPECT_TRUE(dialog.isModal());
        EXPECT_EQ(dialog.windowTitle(), u"Velloca Password"_s);
        EXPECT_EQ(control<QLabel>(dialog, u"Label1"_s)->text(), u"Enter Password:"_s);
        EXPECT_EQ(control<QPushButton>(dialog, u"Command1"_s)->text(), u"OK"_s);
        EXPECT_EQ(control<QPushButton>(dialog, u"Command2"_s)->text(), u"Cancel"_s);
        EXPECT_TRUE(textOf(dialog, "Text1").isEmpty());
        expectCentred(dialog);

        QTest::keyClicks(control<QLineEdit>(dialog, u"Text1"_s), u"My Pass 1"_s);
        expectMasked(dialog, "Text1");
        clickControl(dialog, "Command1");
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.enteredPassword(), u"My Pass 1"_s);
    }
    {
        EnterPasswordDialog dialog;
        dialog.show();
        QTest::keyClick(control<QLineEdit>(dialog, u"Text1"_s), Qt::Key_Return);
        EXPECT_EQ(dialog.enteredPassword(), QString()) << "an empty entry is still an entry";
    }
    for (const char *leave : { "Command2", "Esc" }) {
        SCOPED_TRACE(leave);
        EnterPasswordDialog dialog;
        dialog.show();
        auto *text1 = control<QLineEdit>(dialog, u"Text1"_s);
        QTest::keyClicks(text1, u"typed"_s);
        if (QByteArray(leave) == "Esc")
            QTest::keyClick(text1, Qt::Key_Escape);
        else
            clickControl(dialog, leave);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.enteredPassword(), std::nullopt);
    }
    EXPECT_EQ(password(), u"not shown"_s);
    EXPECT_TRUE(messages.messages().isEmpty());
}

} // namespace
