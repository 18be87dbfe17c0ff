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

} // namespace
