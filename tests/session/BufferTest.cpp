#include "session/SessionBuffer.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <deque>
#include <random>

#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

QByteArray numbered(int n, int first = 0)
{
    QByteArray bytes(n, Qt::Uninitialized);
    for (int i = 0; i < n; ++i)
        bytes[i] = char((first + i) % 251);
    return bytes;
}

QByteArray front(const std::deque<char> &queue, qsizetype n)
{
    QByteArray bytes;
    bytes.reserve(n);
    for (qsizetype i = 0; i < n; ++i)
        bytes.append(queue[size_t(i)]);
    return bytes;
}

} // namespace

TEST(SessionBuffer, AddTakesWhatFits)
{
    SessionBuffer buffer;
    ASSERT_TRUE(buffer.resize(1024));
    EXPECT_EQ(buffer.add(numbered(1000)), 1000);
    EXPECT_EQ(buffer.freeSpace(), 24);
    EXPECT_EQ(buffer.add(numbered(100, 1000)), 24);
    EXPECT_TRUE(buffer.isFull());
    EXPECT_EQ(buffer.add(numbered(5)), 0);
    EXPECT_EQ(buffer.count(), 1024);

    qint32 all = -1;
    EXPECT_EQ(buffer.read(all), numbered(1024));

    // Exactly the free space is taken whole and fills the buffer.
    EXPECT_EQ(buffer.add(numbered(24)), 24);
    EXPECT_EQ(buffer.add(numbered(1000)), 1000);
    EXPECT_TRUE(buffer.isFull());

    // Nothing offered, nothing taken.
    EXPECT_EQ(buffer.add(nullptr, 10), 0);
    EXPECT_EQ(buffer.add("x", -3), 0);
}

TEST(SessionBuffer, ReadTakesFromTheFront)
{
    SessionBuffer buffer;
    ASSERT_TRUE(buffer.resize(1024));
    const QByteArray ten = numbered(10);

    buffer.add(ten);
    qint32 numBytes = -1;
    EXPECT_EQ(buffer.read(numBytes), ten);
    EXPECT_EQ(numBytes, 10);
    EXPECT_EQ(buffer.count(), 0);

    buffer.add(ten);
    numBytes = 4;
    EXPECT_EQ(buffer.read(numBytes), ten.left(4));
    EXPECT_EQ(numBytes, 4);
    numBytes = -1;
    EXPECT_EQ(buffer.read(numBytes), ten.mid(4));
    EXPECT_EQ(numBytes, 6);

    buffer.add(ten);
    numBytes = 50;
    EXPECT_EQ(buffer.read(numBytes), ten);
    EXPECT_EQ(numBytes, 10);

    buffer.add(ten);
    numBytes = 0;
    EXPECT_TRUE(buffer.read(numBytes).isEmpty());
    EXPECT_EQ(numBytes, 0);
    EXPECT_EQ(buffer.count(), 10);

    // A nonsense request takes nothing rather than guessing.
    numBytes = -7;
    EXPECT_TRUE(buffer.read(numBytes).isEmpty());
    EXPECT_EQ(numBytes, 0);
    EXPECT_EQ(buffer.count(), 10);

    buffer.clear();
    numBytes = 5;
    EXPECT_TRUE(buffer.read(numBytes).isEmpty());
    EXPECT_EQ(numBytes, 0);
}

TEST(SessionBuffer, UnsizedHoldsNothingAndResizeEmpties)
{
    SessionBuffer buffer;
    EXPECT_EQ(buffer.capacity(), 0);
    EXPECT_EQ(buffer.add(numbered(10)), 0);
    qint32 numBytes = -1;
    EXPECT_TRUE(buffer.read(numBytes).isEmpty());
    EXPECT_EQ(numBytes, 0);
    char byte = 0;
    EXPECT_EQ(buffer.peek(&byte, 1), 0);
    EXPECT_TRUE(buffer.frontSpan().isEmpty());

    ASSERT_TRUE(buffer.resize(8192));
    buffer.add(numbered(100));
    ASSERT_TRUE(buffer.resize(8192));
    EXPECT_EQ(buffer.count(), 0);
    EXPECT_EQ(buffer.freeSpace(), 8192);

    EXPECT_FALSE(buffer.resize(-1));
    EXPECT_EQ(buffer.capacity(), 0);
    EXPECT_EQ(buffer.add(numbered(10)), 0);
}

// Random adds, reads, peeks and drops on a small ring wrap many times; the
// bytes must come out as a plain queue would give them.
TEST(SessionBuffer, WrapAroundKeepsOrder)
{
    constexpr qint32 kCapacity = 37;
    SessionBuffer buffer;
    ASSERT_TRUE(buffer.resize(kCapacity));
    std::deque<char> model;
    std::mt19937 random(20240611);
    int next = 0;

    for (int step = 0; step < 20000; ++step) {
        const int action = int(random() % 4);
        const qint32 size = qint32(random() % (kCapacity + 5));
        if (action == 0) {
            const QByteArray data = numbered(size, next);
            const qint32 taken = buffer.add(data);
            ASSERT_EQ(taken, std::min<qint32>(size, kCapacity - qint32(model.size())));
            model.insert(model.end(), data.begin(), data.begin() + taken);
            next += taken;
        } else if (action == 1) {
            qint32 numBytes = random() % 3 == 0 ? -1 : size;
            const qint32 asked = numBytes;
            const QByteArray got = buffer.read(numBytes);
            const qint32 expected = asked == -1 ? qint32(model.size())
                                                : std::min<qint32>(asked, qint32(model.size()));
            ASSERT_EQ(numBytes, expected);
            ASSERT_EQ(got, front(model, expected));
            model.erase(model.begin(), model.begin() + expected);
        } else if (action == 2) {
            QByteArray copy(size, Qt::Uninitialized);
            const qint32 copied = buffer.peek(copy.data(), size);
            ASSERT_EQ(copied, std::min<qint32>(size, qint32(model.size())));
            ASSERT_EQ(copy.left(copied), front(model, copied));
        } else {
            // A sender writes what lies in one piece, then drops it.
            const QByteArrayView span = buffer.frontSpan();
            ASSERT_EQ(span.isEmpty(), model.empty());
            ASSERT_EQ(span.toByteArray(), front(model, span.size()));
            ASSERT_EQ(buffer.drop(qint32(span.size())), span.size());
            model.erase(model.begin(), model.begin() + span.size());
        }
        ASSERT_EQ(buffer.count(), qint32(model.size()));
    }
}

TEST(SessionBuffer, LargestCapacityWrapsIntact)
{
    constexpr qint32 kLargest = 67108864;
    constexpr qint32 kChunk = 1 << 20;
    SessionBuffer buffer;
    ASSERT_TRUE(buffer.resize(kLargest));
    const QByteArray whole = numbered(kLargest);
    EXPECT_EQ(buffer.add(whole), kLargest);

    qint32 numBytes = kChunk;
    EXPECT_EQ(buffer.read(numBytes), whole.left(kChunk));
    EXPECT_EQ(buffer.add(numbered(kChunk, 7)), kChunk); // lands at the storage start
    numBytes = -1;
    const QByteArray rest = buffer.read(numBytes);
    ASSERT_EQ(numBytes, kLargest);
    EXPECT_TRUE(rest.startsWith(QByteArrayView(whole).sliced(kChunk)));
    EXPECT_TRUE(rest.endsWith(numbered(kChunk, 7)));
}

// A 64 MiB buffer that the system refuses leaves a usable, empty buffer
// instead of ending the program. The refusal is made real in a child
// process with a low address-space limit.
TEST(SessionBuffer, RefusedAllocationLeavesCapacityZero)
{
#if defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "AddressSanitizer aborts on a refused allocation instead of failing it";
#endif
    const pid_t child = ::fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        SessionBuffer buffer;
        if (!buffer.resize(1024))
            ::_exit(2);
        rlimit limit {};
        ::getrlimit(RLIMIT_AS, &limit);
        // Current usage plus a little: small allocations still work.
        long pages = 0;
        if (FILE *statm = std::fopen("/proc/self/statm", "r")) {
            if (std::fscanf(statm, "%ld", &pages) != 1)
                pages = 0;
            std::fclose(statm);
        }
        if (pages <= 0)
            ::_exit(3);
        limit.rlim_cur = rlim_t(pages) * rlim_t(::sysconf(_SC_PAGESIZE)) + (16 << 20);
        if (limit.rlim_max != RLIM_INFINITY && limit.rlim_cur > limit.rlim_max)
            limit.rlim_cur = limit.rlim_max;
        if (::setrlimit(RLIMIT_AS, &limit) != 0)
            ::_exit(4);
        const bool resized = buffer.resize(67108864);
        const bool emptyAndUnsized = buffer.capacity() == 0 && buffer.add("abc", 3) == 0;
        ::_exit(!resized && emptyAndUnsized ? 0 : 1);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFEXITED(status)) << "the child ended by signal " << WTERMSIG(status);
    EXPECT_EQ(WEXITSTATUS(status), 0);
}
