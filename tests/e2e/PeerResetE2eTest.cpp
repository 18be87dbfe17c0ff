// Clients that reset their connection in the middle of a transfer, again
// and again: the server session must neither fall over nor keep anything
// of them.
#include "E2eSupport.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"
#include "RawStreams.h"

#include "support/FdIo.h"
#include "support/Wait.h"

#include <QDeadlineTimer>

#include <gtest/gtest.h>

#include <poll.h>
#include <unistd.h>

using namespace e2e;

namespace {

// Keeps the device talking until the client has received something, which
// proves the session counts it and is in the middle of sending to it.
bool receivesFromDevice(int device, int client, int timeoutMs = 5000)
{
    const QByteArray chunk = allByteValues(1024);
    QDeadlineTimer deadline(timeoutMs);
    char buffer[65536];
    while (!deadline.hasExpired()) {
        [[maybe_unused]] const ssize_t written = ::write(device, chunk.constData(), size_t(chunk.size()));
        if (::read(client, buffer, sizeof buffer) > 0)
            return true;
        discardInput(device);
        pollfd wait { client, POLLIN, 0 };
        ::poll(&wait, 1, 10);
    }
    return false;
}

} // namespace

TEST(PeerResetE2e, HundredResetsMidTransferLeaveNoDescriptorBehindAndTheNextClientWorks)
{
    PtyServerRun run;
    ASSERT_TRUE(run.start());
    const int device = run.device.masterFd();
    const qint64 pid = run.velloca.processId();

    // One ordinary client first, so whatever the first connection creates
    // for good is in the baseline.
    {
        const int warmUp = connectTcp(run.port);
        ASSERT_GE(warmUp, 0);
        ASSERT_TRUE(receivesFromDevice(device, warmUp));
        // Reset: a plainly closed client may only have stopped sending, and
        // stays counted until something sent to it fails.
        resetConnection(warmUp);
    }
    ASSERT_TRUE(waitUntil([&] { return run.velloca.logLines().last().contains(QStringLiteral("Listening...")); }, 5000))
        << qPrintable(run.velloca.errorLog());
    discardInput(device);
    const int baseline = openDescriptorCount(pid);
    ASSERT_GT(baseline, 0);

    const QByteArray toDevice = allByteValues(16 * 1024, 3);
    for (int round = 0; round < 100; ++round) {
        const int client = connectTcp(run.port);
        ASSERT_GE(client, 0) << "round " << round;
        // Queue data towards the device as well, then vanish mid-stream.
        [[maybe_unused]] const ssize_t queued = ::write(client, toDevice.constData(), size_t(toDevice.size()));
        ASSERT_TRUE(receivesFromDevice(device, client)) << "round " << round;
        resetConnection(client);
        discardInput(device);
        ASSERT_TRUE(run.velloca.isRunning()) << "round " << round << '\n' << run.velloca.standardError().constData();
    }

    EXPECT_TRUE(waitUntil([&] { discardInput(device); return openDescriptorCount(pid) <= baseline; }, 5000))
        << openDescriptorCount(pid) << " descriptors open, " << baseline << " before the resets";

    const int next = connectTcp(run.port);
    ASSERT_GE(next, 0);
    ASSERT_TRUE(receivesFromDevice(device, next));
    discardInput(device);
    // What the reset clients sent before they vanished may still be on its
    // way to the device; the message must follow it, whole.
    const QByteArray message = allByteValues(4096, 9);
    ASSERT_TRUE(writeToFd(next, message));
    QByteArray atDevice;
    const QDeadlineTimer deadline(10000);
    while (!atDevice.endsWith(message) && !deadline.hasExpired())
        atDevice += readFromFd(device, 1, 100);
    EXPECT_TRUE(atDevice.endsWith(message)) << atDevice.size() << " bytes reached the device";
    ::close(next);
    EXPECT_TRUE(run.velloca.isRunning());
}
