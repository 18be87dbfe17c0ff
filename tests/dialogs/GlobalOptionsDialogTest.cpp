#include "DialogTestSupport.h"

#include "config/GlobalOptions.h"
#include "dialogs/GlobalOptionsDialog.h"
#include "localisation/ResourceStrings.h"
#include "support/UiLanguageScope.h"
#include "viewsupport/UserDialogs.h"

#include <QComboBox>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

// Every option this dialog edits; the password is there to show that the
// dialog leaves it alone.
GlobalOptions someOptions()
{
    GlobalOptions o;
    o.OnErrorRunApp = u"/usr/bin/logger -t velloca \"session error\""_s;
    o.Password = u"secret"_s;
    o.LogErrors = 1;
    o.PacketSize = 1500;
    o.PingEnabled = 1;
    o.PingFrequency = 3;
    o.PingTimeout = 9;
    o.LoadWithWindows = 1;
    return o;
}

void expectOptions(const GlobalOptions &expected)
{
    const GlobalOptions &o = GlobalOptions::global();
    EXPECT_EQ(o.OnErrorRunApp, expected.OnErrorRunApp);
    EXPECT_EQ(o.Password, expected.Password);
    EXPECT_EQ(o.LogErrors, expected.LogErrors);
    EXPECT_EQ(o.PacketSize, expected.PacketSize);
    EXPECT_EQ(o.PingEnabled, expected.PingEnabled);
    EXPECT_EQ(o.PingFrequency, expected.PingFrequency);
    EXPECT_EQ(o.PingTimeout, expected.PingTimeout);
    EXPECT_EQ(o.LoadWithWindows, expected.LoadWithWindows);
}

// The dialog as the main window uses it: it shows the global options and
// OK puts its value back into them.
class OptionsDialog : public GlobalOptionsDialog
{
public:
    OptionsDialog() : GlobalOptionsDialog(GlobalOptions::global())
    {
        QObject::connect(this, &QDialog::accepted, this, [this] { GlobalOptions::global() = options(); });
    }
};

// The global options and the file box answer of one test stay in that test.
class GlobalOptionsDialogTest : public ::testing::Test
{
protected:
    GlobalOptionsDialogTest() : m_saved(GlobalOptions::global())
    {
        UserDialogs::setFileHandler([this](const UserDialogs::FileRequest &request) {
            fileRequests << request;
            return nextFile;
        });
    }
    ~GlobalOptionsDialogTest() override
    {
        UserDialogs::setFileHandler({});
        GlobalOptions::global() = m_saved;
    }

    static QComboBox *list(const QWidget &dialog, const char *name)
    {
        return control<QComboBox>(dialog, QString::fromLatin1(name));
    }
    static QLineEdit *commandLine(const QWidget &dialog) { return control<QLineEdit>(dialog, u"Text1"_s); }

    // Replaces the text of the packet-size box by typing, as a user does.
    static void typePacketSize(QWidget &dialog, const QString &text)
    {
        QLineEdit *edit = list(dialog, "Combo1")->lineEdit();
        ASSERT_NE(edit, nullptr);
        // Completion only acts on the box that has the focus.
        dialog.activateWindow();
        ASSERT_TRUE(QTest::qWaitForWindowActive(&dialog));
        edit->setFocus();
        ASSERT_TRUE(edit->hasFocus());
        edit->selectAll();
        QTest::keyClick(edit, Qt::Key_Backspace);
        QTest::keyClicks(edit, text);
    }

    // Changes every control away from someOptions().
    static void editEveryControl(QWidget &dialog)
    {
        commandLine(dialog)->setText(u"/bin/true"_s);
        clickControl(dialog, "Check1");
        clickControl(dialog, "Check2");
        clickControl(dialog, "chkLoadWithWindows");
        typePacketSize(dialog, u"700"_s);
        list(dialog, "Combo2")->setCurrentIndex(0);
        list(dialog, "Combo3")->setCurrentIndex(19);
    }

    QList<UserDialogs::FileRequest> fileRequests;
    std::optional<QString> nextFile;

private:
    GlobalOptions m_saved;
};

TEST_F(GlobalOptionsDialogTest, UnknownListIndexesShowNoSelectionAndSurviveOkUnlessPicked)
{
    struct Row
    {
        qint32 frequency, timeout;
    };
    // A hand-edited configuration file; -1 is what OK stores for no selection.
    const Row rows[] = { { 14, 20 }, { -1, -1 }, { 99, -7 } };
    for (const Row &row : rows) {
        SCOPED_TRACE(testing::Message() << row.frequency << ' ' << row.timeout);
        GlobalOptions options = someOptions();
        options.PingFrequency = row.frequency;
        options.PingTimeout = row.timeout;
        GlobalOptions::global() = options;

        OptionsDialog dialog;
        EXPECT_EQ(list(dialog, "Combo2")->currentIndex(), -1);
        EXPECT_EQ(list(dialog, "Combo2")->currentText(), QString());
        EXPECT_EQ(list(dialog, "Combo3")->currentIndex(), -1);
        EXPECT_EQ(list(dialog, "Combo3")->currentText(), QString());
        dialog.accept();
        expectOptions(options);
    }
    // Picking an entry in one list stores it; the other list keeps its value.
    GlobalOptions options = someOptions();
    options.PingFrequency = 20;
    options.PingTimeout = 25;
    GlobalOptions::global() = options;
    OptionsDialog dialog;
    dialog.show();
    QComboBox *frequency = list(dialog, "Combo2");
    QTest::keyClick(frequency, Qt::Key_Down);
    EXPECT_EQ(frequency->currentIndex(), 0);
    QTest::keyClick(frequency, Qt::Key_Down);
    clickControl(dialog, "Command2");
    EXPECT_EQ(dialog.result(), QDialog::Accepted);
    options.PingFrequency = 1;
    expectOptions(options);
}

TEST_F(GlobalOptionsDialogTest, OkStoresEveryControlAndReopeningShowsTheTypedPacketSize)
{
    GlobalOptions::global() = someOptions();
    {
        OptionsDialog dialog;
        dialog.show();
        editEveryControl(dialog);
        clickControl(dialog, "Command2");
        EXPECT_EQ(dialog.result(), QDialog::Accepted);
        EXPECT_FALSE(dialog.isVisible());
    }
    GlobalOptions edited = someOptions();
    edited.OnErrorRunApp = u"/bin/true"_s;
    edited.LogErrors = 0;
    edited.PingEnabled = 0;
    edited.LoadWithWindows = 0;
    edited.PacketSize = 700;
    edited.PingFrequency = 0;
    edited.PingTimeout = 19;
    expectOptions(edited);

    OptionsDialog reopened;
    EXPECT_EQ(list(reopened, "Combo1")->currentText(), u"700"_s);
}

TEST_F(GlobalOptionsDialogTest, TypedPacketSizesOutsideOneTo10000Become2000)
{
    struct Row
    {
        const char *typed;
        qint32 stored;
    };
    const Row rows[] = {
        { "1500", 1500 }, { "12000", 2000 }, { "10000", 10000 }, { "0", 2000 }, { "abc", 2000 },
        { "-50", 2000 },  { " 4000 ", 4000 }, { "", 2000 },
        // No completion from the list: "1" stays 1, not "100".
        { "1", 1 }, { "10", 10 },
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.typed);
        GlobalOptions::global() = someOptions();
        OptionsDialog dialog;
        dialog.show();
        typePacketSize(dialog, QString::fromLatin1(row.typed));
        EXPECT_EQ(list(dialog, "Combo1")->currentText(), QString::fromLatin1(row.typed));
        clickControl(dialog, "Command2");
        EXPECT_EQ(GlobalOptions::global().PacketSize, row.stored);
        // A typed size never becomes a list entry.
        EXPECT_EQ(list(dialog, "Combo1")->count(), 7);
    }
    // Picked from the list.
    OptionsDialog dialog;
    list(dialog, "Combo1")->setCurrentIndex(3);
    dialog.accept();
    EXPECT_EQ(GlobalOptions::global().PacketSize, 500);
}

TEST_F(GlobalOptionsDialogTest, BrowsePutsTheChosenPathInTheCommandLineAndCancelKeepsIt)
{
    GlobalOptions::global() = someOptions();
    OptionsDialog dialog;
    dialog.show();

    // Cancelled, or no name: the command line stays.
    for (const std::optional<QString> &answer : { std::optional<QString>(), std::optional<QString>(QString()) }) {
        nextFile = answer;
        clickControl(dialog, "Command1");
        EXPECT_EQ(commandLine(dialog)->text(), someOptions().OnErrorRunApp);
    }
    ASSERT_EQ(fileRequests.size(), 2);
    const UserDialogs::FileRequest &request = fileRequests.constFirst();
    EXPECT_EQ(request.parent, &dialog);
    EXPECT_FALSE(request.save); // an open box: only existing files
    EXPECT_TRUE(request.filter.endsWith(u"(*)"_s)) << qPrintable(request.filter);

    // A path with blanks goes in as returned, without quotes.
    nextFile = u"/opt/alarm tools/notify"_s;
    clickControl(dialog, "Command1");
    EXPECT_EQ(commandLine(dialog)->text(), u"/opt/alarm tools/notify"_s);
    expectOptions(someOptions());

    // Browsing is editing: Cancel drops it, OK stores it.
    clickControl(dialog, "Command3");
    expectOptions(someOptions());
    OptionsDialog second;
    second.show();
    clickControl(second, "Command1");
    clickControl(second, "Command2");
    EXPECT_EQ(GlobalOptions::global().OnErrorRunApp, u"/opt/alarm tools/notify"_s);
}

TEST_F(GlobalOptionsDialogTest, OnlyOkStoresAndEnterInATextBoxPressesIt)
{
    const std::function<void(GlobalOptionsDialog &)> closers[] = {
        [](GlobalOptionsDialog &dialog) { clickControl(dialog, "Command3"); },
        [](GlobalOptionsDialog &dialog) { QTest::keyClick(commandLine(dialog), Qt::Key_Escape); },
        [](GlobalOptionsDialog &dialog) { EXPECT_TRUE(dialog.close()); },
    };
    int way = 0;
    for (const auto &close : closers) {
        SCOPED_TRACE(way++);
        GlobalOptions::global() = someOptions();
        OptionsDialog dialog;
        dialog.show();
        editEveryControl(dialog);
        close(dialog);
        EXPECT_FALSE(dialog.isVisible());
        EXPECT_EQ(dialog.result(), QDialog::Rejected);
        expectOptions(someOptions());
    }

    OptionsDialog dialog;
    dialog.show();
    EXPECT_TRUE(control<QPushButton>(dialog, u"Command2"_s)->isDefault());
    commandLine(dialog)->setText(u"/bin/false"_s);
    QTest::keyClick(commandLine(dialog), Qt::Key_Return);
    EXPECT_EQ(dialog.result(), QDialog::Accepted);
    EXPECT_EQ(GlobalOptions::global().OnErrorRunApp, u"/bin/false"_s);

    // Enter in the packet-size box neither adds the typed size to the list
    // nor stops there.
    OptionsDialog second;
    second.show();
    typePacketSize(second, u"3000"_s);
    QTest::keyClick(list(second, "Combo1")->lineEdit(), Qt::Key_Enter);
    EXPECT_FALSE(second.isVisible());
    EXPECT_EQ(GlobalOptions::global().PacketSize, 3000);
    EXPECT_EQ(list(second, "Combo1")->count(), 7);
}

} // namespace
