// Volume through a server session on a pty: every byte arrives unchanged,
// in order, in both directions, and nothing a client sent before closing is
// lost.
#include "E2eSupport.h"
#include "ProcessProbe.h"
#include "PtyServerRun.h"
#include "RawStreams.h"

#include "support/Wait.h"

#include <QRandomGenerator>

#include <gtest/gtest.h>

#include <sys/socket.h>
#include <unistd.h>

using namespace e2e;

namespace {

QByteArray randomBytes(qsizetype size, quint32 seed)
{
    QByteArray bytes(size, Qt::Uninitialized);
    QRandomGenerator random(seed);
    random.fillRange(reinterpret_cast<quint32 *>(bytes.data()), size / 4);
    return bytes;
}

QByteArray everyByteValue()
{
    QByteArray bytes(256, Qt::Uninitialized);
    for (int i = 0; i < 256; ++i)
        bytes[i] = char(i);
    return bytes;
}

// The session counts a client only after accepting it; serial bytes sent
// before that are dropped by design.
::testing::AssertionResult connectAndWaitCounted(PtyServerRun &run, int *fd, int expectedCount,
                                                 int receiveBufferSize = 0)
{
    *fd = connectTcp(run.port, receiveBufferSize);
    if (*fd < 0)
        return ::testing::AssertionFailure() << "connection refused";
    const QString counted = QStringLiteral("TCP/IP Status: Connected (%1)").arg(expectedCount);
    if (!run.velloca.waitForLogLine(serverLogLine(counted, run.port)))
        return ::testing::AssertionFailure() << "never counted; log:\n" << qPrintable(run.velloca.errorLog());
    return ::testing::AssertionSuccess();
}

} // namespace

TEST(IntegrityE2e, EveryByteValueAndAMebibyteEachWayAndBothWaysAtOnceArriveUnchanged)
{
    PtyServerRun run;
    ASSERT_TRUE(run.start());
    int client = -1;
    ASSERT_TRUE(connectAndWaitCounted(run, &client, 1));
    const int device = run.device.masterFd();

    {
        SCOPED_TRACE("256 byte values, one way after the other");
        const QByteArray values = everyByteValue();
        Exchange fromDevice = exchange(device, values, 0, client, {}, values.size(), 10000);
        EXPECT_TRUE(sameBytes(fromDevice.atSecond, values));
        Exchange fromNetwork = exchange(device, {}, values.size(), client, values, 0, 10000);
        EXPECT_TRUE(sameBytes(fromNetwork.atFirst, values));
    }

    const qsizetype mebibyte = 1024 * 1024;
    const QByteArray deviceData = randomBytes(mebibyte, 11);
    const QByteArray networkData = randomBytes(mebibyte, 12);
    {
        SCOPED_TRACE("1 MiB device to network");
        const Exchange result = exchange(device, deviceData, 0, client, {}, mebibyte);
        EXPECT_EQ(sha256(result.atSecond), sha256(deviceData)) << result.atSecond.size() << " bytes arrived";
    }
    {
        SCOPED_TRACE("1 MiB network to device");
        const Exchange result = exchange(device, {}, mebibyte, client, networkData, 0);
        EXPECT_EQ(sha256(result.atFirst), sha256(networkData)) << result.atFirst.size() << " bytes arrived";
    }
    {
        SCOPED_TRACE("1 MiB each way at the same time");
        const QByteArray deviceSecond = randomBytes(mebibyte, 21);
        const QByteArray networkSecond = randomBytes(mebibyte, 22);
        const Exchange result = exchange(device, deviceSecond, mebibyte, client, networkSecond, mebibyte);
        EXPECT_EQ(sha256(result.atSecond), sha256(deviceSecond)) << result.atSecond.size() << " bytes arrived";
        EXPECT_EQ(sha256(result.atFirst), sha256(networkSecond)) << result.atFirst.size() << " bytes arrived";
    }
    // Nothing extra trails behind.
    const Exchange trailing = exchange(device, {}, 1, client, {}, 1, 200);
    EXPECT_TRUE(trailing.atFirst.isEmpty());
    EXPECT_TRUE(trailing.atSecond.isEmpty());
    ::close(client);
    EXPECT_TRUE(run.velloca.isRunning());
}

TEST(IntegrityE2e, ClientThatWritesAndClosesAtOnceLosesNoByteAndAHalfClosedOneGetsItsAnswer)
{
    PtyServerRun run;
    ASSERT_TRUE(run.start());
    const qsizetype size = 64 * 1024;
    struct Variant
    {
        const char *name;
        bool halfClose;
    };
    int seed = 0;
    for (const Variant variant : { Variant { "write then close", false }, Variant { "write then shutdown(SHUT_WR)", true } }) {
        SCOPED_TRACE(variant.name);
        const QByteArray sent = allByteValues(int(size), ++seed * 1000);
        const int client = connectTcp(run.port);
        ASSERT_GE(client, 0);
        // The connection's buffers take 64 KiB on loopback; what does not
        // fit at once goes as the program reads.
        const Exchange written = exchange(client, sent, 0, run.device.masterFd(), {}, 0, 10000);
        QByteArray atDevice = written.atSecond;
        if (variant.halfClose) {
            ASSERT_EQ(::shutdown(client, SHUT_WR), 0);
        } else {
            ::close(client);
        }
        atDevice += readFromFd(run.device.masterFd(), int(size - atDevice.size()), 10000);
        EXPECT_TRUE(sameBytes(atDevice, sent));
        if (variant.halfClose) {
            // A half-closed client still gets the answer, which the
            // instrument gives after a while.
            EXPECT_TRUE(readFromFd(client, 1, 300).isEmpty());
            ASSERT_TRUE(run.device.write("answer"));
            EXPECT_EQ(readFromFd(client, 6), QByteArray("answer"));
            ::close(client);
        }
        // Nothing more follows.
        EXPECT_TRUE(readFromFd(run.device.masterFd(), 1, 200).isEmpty());
        EXPECT_TRUE(run.velloca.isRunning());
    }
}

// Clients that do not read while another does: they are let go rather than
// hold up the reader, and their queues together stay within two buffers.
TEST(IntegrityE2e, ClientsThatDoNotReadAreLetGoWhileAnotherReadsAndMemoryStaysBounded)
{
    PtyServerRun run;
    const qint64 buffer = 4 * 1024 * 1024;
    ASSERT_TRUE(run.start(QStringLiteral("BufferSize=11\r\n")));
    int reader = -1;
    ASSERT_TRUE(connectAndWaitCounted(run, &reader, 1));
    const int notReading = 8;
    QList<int> idle;
    for (int i = 0; i < notReading; ++i) {
        // A small window, so the kernel takes in little of what they do not read.
        ASSERT_TRUE(connectAndWaitCounted(run, &idle.emplace_back(), i + 2, 4096));
    }
    const qint64 pid = run.velloca.processId();
    const qint64 residentBefore = residentKiB(pid);

    const QByteArray stream = randomBytes(16 * 1024 * 1024, 31);
    const Exchange result = exchange(run.device.masterFd(), stream, 0, reader, {}, stream.size(), 30000);
    EXPECT_EQ(sha256(result.atSecond), sha256(stream)) << result.atSecond.size() << " bytes arrived";
    EXPECT_EQ(run.velloca.errorLog().count(QStringLiteral("disconnected: not reading")), notReading)
        << qPrintable(run.velloca.errorLog());
    // The queues may hold two buffers; the hold buffer, once touched, one.
    const qint64 grownKiB = peakResidentKiB(pid) - residentBefore;
    EXPECT_LT(grownKiB * 1024, 4 * buffer) << "grew by " << grownKiB << " KiB";
    for (const int fd : std::as_const(idle))
        ::close(fd);
    ::close(reader);
}
