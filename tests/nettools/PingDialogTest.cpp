#include "NetToolsTestSupport.h"

#include "config/GlobalOptions.h"
#include "localisation/ResourceStrings.h"
#include "nettools/PingDialog.h"
#include "platform/IcmpEcho.h"
#include "support/Wait.h"

#include <QApplication>
#include <QGroupBox>
#include <QLabel>
#include <QPushButton>
#include <QTimer>

#include <gtest/gtest.h>

#include <memory>

using namespace Qt::StringLiterals;

namespace {

const char *const kResultBoxes[] = { "Text4_0", "Text4_1", "Text4_2", "Text4_3", "Text4_4" };

QStringList results(const PingDialog &dialog)
{
    QStringList texts;
    for (const char *name : kResultBoxes)
        texts << textOf(dialog, name);
    return texts;
}

// Clicks Ping and waits until the result is shown.
void ping(PingDialog &dialog, const QString &host)
{
    setText(dialog, "Text1", host);
    click(dialog, "Command1");
    EXPECT_TRUE(dialog.isBusy());
    EXPECT_FALSE(control<QPushButton>(dialog, "Command1")->isEnabled());
    EXPECT_TRUE(waitUntil([&] { return !dialog.isBusy(); }, 30000)) << qPrintable(host);
    EXPECT_TRUE(control<QPushButton>(dialog, "Command1")->isEnabled());
}

struct PingDialogTest : ::testing::Test
{
    PingDialogTest() : savedTimeoutIndex(GlobalOptions::global().PingTimeout)
    {
        GlobalOptions::global().PingTimeout = 19; // 2000 ms, plenty on a loaded machine
    }
    ~PingDialogTest() override { GlobalOptions::global().PingTimeout = savedTimeoutIndex; }
    int savedTimeoutIndex;
    MessageRecorder recorder;
};

TEST_F(PingDialogTest, EmptyHostAsksForOneAndSendsNothing)
{
    PingDialog dialog;
    dialog.show();
    setText(dialog, "Text4_0", u"earlier result"_s);
    control<QLineEdit>(dialog, "Text2")->setFocus();
    click(dialog, "Command1");
    ASSERT_EQ(recorder.messages.size(), 1u);
    EXPECT_EQ(recorder.messages[0].text, LoadResString(5112));
    EXPECT_EQ(recorder.messages[0].title, LoadResString(5113));
    EXPECT_EQ(dialog.focusWidget(), control<QLineEdit>(dialog, "Text1"));
    EXPECT_FALSE(dialog.isBusy());
    EXPECT_EQ(dialog.findChild<IcmpEcho *>()->pendingCount(), 0);
    EXPECT_EQ(textOf(dialog, "Text4_0"), u"earlier result"_s);
}

TEST_F(PingDialogTest, PingOfLoopbackFillsTheResultBoxes)
{
    if (!canSendIcmp())
        GTEST_SKIP() << "no ICMP socket permitted here (ping_group_range, CAP_NET_RAW)";
    PingDialog dialog;
    dialog.show();
    for (const QString &host : { u"127.0.0.1"_s, u"localhost"_s }) {
        SCOPED_TRACE(host.toStdString());
        ping(dialog, host);
        const QStringList shown = results(dialog);
        EXPECT_EQ(shown[0], u"0   [IP Success]"_s);
        EXPECT_EQ(shown[1], u"16777343"_s);
        EXPECT_TRUE(shown[2].endsWith(u" ms"_s)) << shown[2].toStdString();
        EXPECT_EQ(shown[3], u"11 bytes"_s);
        EXPECT_EQ(shown[4], u"Testing 123"_s);
    }
    setText(dialog, "Text2", u"other"_s);
    ping(dialog, u"127.0.0.1"_s);
    EXPECT_EQ(textOf(dialog, "Text4_3"), u"5 bytes"_s);
    EXPECT_EQ(textOf(dialog, "Text4_4"), u"other"_s);
    EXPECT_TRUE(recorder.messages.empty());
}

TEST_F(PingDialogTest, UnresolvableHostShowsBadIpFormatAndZeros)
{
    PingDialog dialog;
    dialog.show();
    setText(dialog, "Text4_4", u"stale"_s);
    ping(dialog, u"no-such-host.invalid"_s);
    EXPECT_EQ(results(dialog),
              QStringList({ u"-1   [Bad IP Format]"_s, u"0"_s, u"0 ms"_s, u"0 bytes"_s, QString() }));
    EXPECT_TRUE(recorder.messages.empty());
}

TEST_F(PingDialogTest, WithoutIcmpPermissionThePingReportsGeneralFailure)
{
    WithoutRawSockets noRaw;
    if (canSendIcmp())
        GTEST_SKIP() << "ICMP datagram sockets are permitted for our group "
                        "(net.ipv4.ping_group_range), so no failure can be provoked";
    PingDialog dialog;
    dialog.show();
    ping(dialog, u"127.0.0.1"_s);
    // Not "0   [IP Success]": nothing was sent, so nothing succeeded.
    EXPECT_EQ(results(dialog),
              QStringList({ u"11050   [IP General Failure]"_s, u"0"_s, u"0 ms"_s, u"0 bytes"_s, QString() }));
}

TEST_F(PingDialogTest, ClosingWhileAPingIsPendingIsSafe)
{
    auto dialog = std::make_unique<PingDialog>();
    dialog->show();
    setText(*dialog, "Text1", u"localhost"_s);
    click(*dialog, "Command1");
    ASSERT_TRUE(dialog->isBusy());
    click(*dialog, "Command3");
    EXPECT_FALSE(dialog->isVisible());
    EXPECT_EQ(dialog->result(), QDialog::Rejected);
    dialog.reset();
    // A later lookup completes once the abandoned one has been delivered.
    bool done = false;
    QObject context;
    GetIPFromHostName(u"localhost"_s, &context, [&](const QString &) { done = true; });
    EXPECT_TRUE(waitUntil([&] { return done; }, 30000));
}

} // namespace
