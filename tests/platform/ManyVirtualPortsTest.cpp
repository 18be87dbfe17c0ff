#include "platform/PtyVirtualPort.h"
#include "support/Wait.h"

#include <QSignalSpy>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <fcntl.h>
#include <unistd.h>

#include <memory>
#include <vector>

namespace {

// The kernel grants 128 inotify instances per user by default; a program
// with more virtual ports than that must still see every application that
// opens one, without falling back to polling.
TEST(ManyVirtualPorts, OpensAreSeenBeyondTheInotifyInstanceLimit)
{
    QTemporaryDir folder;
    constexpr int kPorts = 160;
    std::vector<std::unique_ptr<PtyVirtualPort>> ports;
    for (int n = 1; n <= kPorts; ++n) {
        ports.push_back(std::make_unique<PtyVirtualPort>(folder.path()));
        ASSERT_TRUE(ports.back()->createPort(QStringLiteral("COM%1").arg(n))) << ports.back()->errorString().toStdString();
    }
    PtyVirtualPort &last = *ports.back();
    QSignalSpy events(&last, &VirtualPortControl::openedOrClosed);
    const int application = ::open(QFile::encodeName(folder.filePath(QStringLiteral("COM%1").arg(kPorts))).constData(),
                                   O_RDWR | O_NOCTTY | O_NONBLOCK);
    ASSERT_GE(application, 0);
    ASSERT_TRUE(waitUntil([&] { return events.count() == 1; }));
    EXPECT_TRUE(events.at(0).at(0).toBool());
    ::close(application);
    ASSERT_TRUE(waitUntil([&] { return events.count() == 2; }));
    EXPECT_FALSE(events.at(1).at(0).toBool());
}

} // namespace
