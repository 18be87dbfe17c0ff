#include "NetToolsTestSupport.h"

#include "localisation/ResourceStrings.h"
#include "nettools/ResolveDialog.h"
#include "support/Wait.h"

#include <QApplication>
#include <QLabel>
#include <QPushButton>
#include <QTimer>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

void resolve(ResolveDialog &dialog, const QString &host)
{
    setText(dialog, "txtHostName", host);
    click(dialog, "Command1");
    EXPECT_TRUE(dialog.isBusy());
    EXPECT_FALSE(control<QPushButton>(dialog, "Command1")->isEnabled());
    EXPECT_TRUE(waitUntil([&] { return !dialog.isBusy(); }, 30000)) << qPrintable(host);
    EXPECT_TRUE(control<QPushButton>(dialog, "Command1")->isEnabled());
}

struct ResolveDialogTest : ::testing::Test
{
    MessageRecorder recorder;
};

TEST_F(ResolveDialogTest, FormCarriesItsCaptionsTooltipAndHiddenHelp)
{
    ResolveDialog dialog;
    dialog.show();
    EXPECT_EQ(dialog.objectName(), u"frmResolve"_s);
    EXPECT_EQ(dialog.windowTitle(), LoadResString(5051));
    EXPECT_EQ(control<QLabel>(dialog, "Label1")->text(), LoadResString(5052));
    EXPECT_EQ(control<QLabel>(dialog, "Label2")->text(), LoadResString(5053));
    EXPECT_EQ(control<QPushButton>(dialog, "Command1")->text(), LoadResString(5055));
    EXPECT_EQ(control<QPushButton>(dialog, "Command3")->text(), LoadResString(5054));
    EXPECT_EQ(control<QPushButton>(dialog, "Command4")->text(), LoadResString(5056));
    EXPECT_TRUE(control<QPushButton>(dialog, "Command1")->isDefault());
    EXPECT_FALSE(control<QPushButton>(dialog, "Command3")->isVisible());
    EXPECT_EQ(control<QLineEdit>(dialog, "txtHostName")->toolTip(), LoadResString(5124));
    EXPECT_EQ(textOf(dialog, "txtHostName"), QString());
    EXPECT_EQ(textOf(dialog, "txtIPAddress"), QString());
}

TEST_F(ResolveDialogTest, NamesAndAddressesResolve)
{
    ResolveDialog dialog;
    dialog.show();
    resolve(dialog, u"localhost"_s);
    EXPECT_EQ(textOf(dialog, "txtIPAddress"), u"127.0.0.1"_s);
    setText(dialog, "txtIPAddress", QString());
    resolve(dialog, u"127.0.0.1"_s);
    EXPECT_EQ(textOf(dialog, "txtIPAddress"), u"127.0.0.1"_s);
    EXPECT_TRUE(recorder.messages.empty());
}

TEST_F(ResolveDialogTest, UnresolvableNameIsReportedAndTheAddressKept)
{
    ResolveDialog dialog;
    dialog.show();
    setText(dialog, "txtIPAddress", u"10.1.2.3"_s);
    for (const QString &name : { u"no-such-host.invalid"_s, QString() }) {
        recorder.messages.clear();
        resolve(dialog, name);
        ASSERT_EQ(recorder.messages.size(), 1u);
        EXPECT_EQ(recorder.messages[0].text, LoadResString(5115) + u' ' + name);
        EXPECT_EQ(recorder.messages[0].title, u"Velloca"_s);
        EXPECT_EQ(textOf(dialog, "txtIPAddress"), u"10.1.2.3"_s);
    }
}

TEST_F(ResolveDialogTest, HelpDoesNothingAndCancelCloses)
{
    ResolveDialog dialog;
    dialog.show();
    control<QPushButton>(dialog, "Command3")->click();
    EXPECT_TRUE(dialog.isVisible());
    EXPECT_TRUE(recorder.messages.empty());
    click(dialog, "Command4");
    EXPECT_FALSE(dialog.isVisible());
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
}

TEST_F(ResolveDialogTest, ShowResolveDialogIsModalAndReturnsOnCancel)
{
    QString seenName;
    QTimer::singleShot(0, [&] {
        QWidget *modal = QApplication::activeModalWidget();
        ASSERT_NE(modal, nullptr);
        seenName = modal->objectName();
        click(*modal, "Command4");
    });
    showResolveDialog(nullptr);
    EXPECT_EQ(seenName, u"frmResolve"_s);
}

} // namespace
