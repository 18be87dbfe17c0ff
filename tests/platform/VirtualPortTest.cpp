#include "platform/PtyVirtualPort.h"
#include "platform/VirtualPortFolder.h"
#include "support/Wait.h"

#include <QEventLoop>
#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QTemporaryDir>
#include <QTimer>

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

QByteArray allByteValues()
{
    QByteArray bytes;
    for (int value = 0; value < 256; ++value)
        bytes.append(char(value));
    return bytes;
}

// A local application holding the port open through its link.
struct Application
{
    explicit Application(const QString &linkPath)
        : fd(::open(QFile::encodeName(linkPath).constData(), O_RDWR | O_NOCTTY | O_NONBLOCK))
    {
    }
    ~Application() { close(); }
    void close()
    {
        if (fd >= 0)
            ::close(fd);
        fd = -1;
    }
    QByteArray readUntil(qsizetype count)
    {
        QByteArray got;
        waitUntil([&] {
            char chunk[1024];
            const ssize_t n = ::read(fd, chunk, sizeof chunk);
            if (n > 0)
                got.append(chunk, n);
            return got.size() >= count;
        });
        return got;
    }
    int fd;
};

QString linkTargetOf(const QString &path)
{
    return QFileInfo(path).symLinkTarget();
}

bool isSymlink(const QString &path)
{
    struct stat info {};
    return ::lstat(QFile::encodeName(path).constData(), &info) == 0 && S_ISLNK(info.st_mode);
}

double cpuSeconds()
{
    rusage usage {};
    ::getrusage(RUSAGE_SELF, &usage);
    return usage.ru_utime.tv_sec + usage.ru_stime.tv_sec
        + (usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
}

// Runs the event loop for the interval; returns the share of it this
// process spent on the CPU. A busy loop shows as a large share even on a
// loaded machine; an idle wait as almost none. A plain QEventLoop, because
// waitUntil() naps between passes and would hide a spinning notifier.
double cpuShareWhileWaiting(int intervalMs)
{
    const double before = cpuSeconds();
    QEventLoop loop;
    QTimer::singleShot(intervalMs, &loop, &QEventLoop::quit);
    loop.exec();
    return (cpuSeconds() - before) / (intervalMs / 1000.0);
}

} // namespace

TEST(VirtualPort, CreateLinksSlaveAndRemoveTakesLinkAway)
{
    QTemporaryDir dir;
    const QString folder = dir.path() + "/ports";
    QString link;
    {
        PtyVirtualPort port(folder);
        ASSERT_TRUE(port.createPort("COM5")) << port.errorString().toStdString();
        link = folder + "/COM5";
        EXPECT_EQ(port.linkPath(), link);
        EXPECT_TRUE(isSymlink(link));
        EXPECT_TRUE(linkTargetOf(link).startsWith("/dev/pts/")) << linkTargetOf(link).toStdString();
        EXPECT_EQ(linkTargetOf(link), port.slavePath());
        struct stat folderInfo {};
        ASSERT_EQ(::stat(QFile::encodeName(folder).constData(), &folderInfo), 0);
        EXPECT_EQ(folderInfo.st_mode & 07777, 0700u);
        EXPECT_FALSE(port.isOpenedByApplication());

        EXPECT_TRUE(port.removePort());
        EXPECT_FALSE(QFileInfo::exists(link) || isSymlink(link));
        EXPECT_TRUE(port.removePort()); // nothing left to remove is success

        ASSERT_TRUE(port.createPort("COM5")) << port.errorString().toStdString();
        ASSERT_TRUE(port.createPort("COM5")) << "re-creating replaces our own port";
        EXPECT_TRUE(isSymlink(link));
    }
    EXPECT_FALSE(isSymlink(link)) << "the destructor removes the port";
}

TEST(VirtualPort, ApplicationOpenAndCloseRaiseEventsInOrder)
{
    QTemporaryDir dir;
    PtyVirtualPort port(dir.path());
    ASSERT_TRUE(port.createPort("COM3")) << port.errorString().toStdString();
    std::vector<bool> events;
    QObject::connect(&port, &VirtualPortControl::openedOrClosed, [&](bool opened) { events.push_back(opened); });

    for (int round = 1; round <= 2; ++round) {
        Application app(port.linkPath());
        ASSERT_GE(app.fd, 0);
        ASSERT_TRUE(waitUntil([&] { return events.size() == size_t(2 * round - 1); }));
        EXPECT_TRUE(events.back());
        EXPECT_TRUE(port.isOpenedByApplication());
        app.close();
        ASSERT_TRUE(waitUntil([&] { return events.size() == size_t(2 * round); }));
        EXPECT_FALSE(events.back());
        EXPECT_FALSE(port.isOpenedByApplication());
    }

    // Opened and closed before the event loop had a look: both are reported.
    Application(port.linkPath()).close();
    ASSERT_TRUE(waitUntil([&] { return events.size() == 6; }));
    EXPECT_EQ(events, (std::vector<bool> { true, false, true, false, true, false }));
    EXPECT_FALSE(waitUntil([&] { return events.size() > 6; }, 300)) << "no spurious events";
}

TEST(VirtualPort, BytesPassBothWaysUntranslated)
{
    QTemporaryDir dir;
    PtyVirtualPort port(dir.path());
    ASSERT_TRUE(port.createPort("COM4")) << port.errorString().toStdString();
    QStringList log;
    QByteArray received;
    QObject::connect(&port, &VirtualPortControl::dataReceived, [&] {
        log << "data";
        received += port.read(port.available());
    });
    QObject::connect(&port, &VirtualPortControl::openedOrClosed, [&](bool opened) {
        log << (opened ? "opened" : "closed");
    });

    const QByteArray pattern = allByteValues() + "\r\n\n\r";
    Application app(port.linkPath());
    ASSERT_TRUE(waitUntil([&] { return port.isOpenedByApplication(); }));
    ASSERT_EQ(::write(app.fd, pattern.constData(), size_t(pattern.size())), pattern.size());
    ASSERT_TRUE(waitUntil([&] { return received.size() >= pattern.size(); }));
    EXPECT_EQ(received, pattern);

    EXPECT_EQ(port.write(pattern), pattern.size());
    EXPECT_EQ(app.readUntil(pattern.size()), pattern) << "no echo, no CR/LF translation";

    // The application's last words before closing are not lost.
    received.clear();
    log.clear();
    ASSERT_EQ(::write(app.fd, "bye", 3), 3);
    app.close();
    ASSERT_TRUE(waitUntil([&] { return log.contains("closed"); }));
    EXPECT_EQ(received, "bye");
    EXPECT_EQ(log.indexOf("data"), 0) << log.join(' ').toStdString();
    EXPECT_EQ(log.last(), "closed");

    // Written while nobody listens: dropped, the next application starts clean.
    EXPECT_EQ(port.write("stale"), 5);
    Application next(port.linkPath());
    ASSERT_TRUE(waitUntil([&] { return port.isOpenedByApplication(); }));
    char byte;
    const ssize_t got = ::read(next.fd, &byte, 1);
    const int readError = errno;
    EXPECT_EQ(got, -1);
    EXPECT_EQ(readError, EAGAIN) << "nothing waits for the new application";
}

TEST(VirtualPort, UnreadInputIsHeldAndDiscardable)
{
    QTemporaryDir dir;
    PtyVirtualPort port(dir.path());
    ASSERT_TRUE(port.createPort("COM6")) << port.errorString().toStdString();
    int notices = 0;
    QObject::connect(&port, &VirtualPortControl::dataReceived, [&] { ++notices; });

    Application app(port.linkPath());
    ASSERT_TRUE(waitUntil([&] { return port.isOpenedByApplication(); }));
    ASSERT_EQ(::write(app.fd, "abcdef", 6), 6);
    // The receiver does not read: the notice comes again, at a calm pace.
    ASSERT_TRUE(waitUntil([&] { return notices >= 2; }));
    EXPECT_LT(cpuShareWhileWaiting(800), 0.1);
    EXPECT_EQ(port.available(), 6);
    EXPECT_EQ(port.read(4), "abcd");
    EXPECT_EQ(port.available(), 2);

    port.discardInput();
    EXPECT_EQ(port.available(), 0);
    EXPECT_EQ(port.read(10), QByteArray());
}

TEST(VirtualPort, NoBusyLoopWhileNobodyIsAttached)
{
    QTemporaryDir dir;
    PtyVirtualPort port(dir.path());
    ASSERT_TRUE(port.createPort("COM2")) << port.errorString().toStdString();
    EXPECT_LT(cpuShareWhileWaiting(800), 0.1) << "port created, never opened";

    {
        Application app(port.linkPath());
        ASSERT_TRUE(waitUntil([&] { return port.isOpenedByApplication(); }));
    }
    ASSERT_TRUE(waitUntil([&] { return !port.isOpenedByApplication(); }));
    EXPECT_LT(cpuShareWhileWaiting(800), 0.1) << "after an application has closed (master hung up)";
}

TEST(VirtualPort, ExistingEntriesAreReplacedOnlyWhenStaleOrOurs)
{
    QTemporaryDir dir;
    const QString folder = dir.path();
    PtyVirtualPort port(folder);

    ASSERT_EQ(::symlink("/dev/pts/999999", QFile::encodeName(folder + "/COM7").constData()), 0);
    ASSERT_TRUE(port.createPort("COM7")) << port.errorString().toStdString();
    EXPECT_EQ(linkTargetOf(folder + "/COM7"), port.slavePath());

    QFile regular(folder + "/COM8");
    ASSERT_TRUE(regular.open(QIODevice::WriteOnly));
    regular.write("keep me");
    regular.close();
    QFile other(folder + "/target.txt");
    ASSERT_TRUE(other.open(QIODevice::WriteOnly));
    other.write("also keep me");
    other.close();
    ASSERT_EQ(::symlink(QFile::encodeName(other.fileName()).constData(),
                        QFile::encodeName(folder + "/COM9").constData()), 0);
    ASSERT_TRUE(QDir(folder).mkdir("COM10"));
    PtyVirtualPort neighbour(folder);
    ASSERT_TRUE(neighbour.createPort("COM11"));

    for (const QString name : { "COM8", "COM9", "COM10", "COM11" }) {
        EXPECT_FALSE(port.createPort(name)) << name.toStdString();
        const QString message = port.errorString();
        EXPECT_TRUE(message.contains(folder + "/" + name) && message.contains("already exists"))
            << message.toStdString();
    }
    QFile check(regular.fileName());
    ASSERT_TRUE(check.open(QIODevice::ReadOnly));
    EXPECT_EQ(check.readAll(), "keep me");
    EXPECT_EQ(linkTargetOf(folder + "/COM9"), other.fileName());
    QFile target(other.fileName());
    ASSERT_TRUE(target.open(QIODevice::ReadOnly));
    EXPECT_EQ(target.readAll(), "also keep me");
    EXPECT_TRUE(QFileInfo(folder + "/COM10").isDir());
    EXPECT_EQ(linkTargetOf(folder + "/COM11"), neighbour.slavePath());

    EXPECT_FALSE(port.createPort("a/b"));
    EXPECT_TRUE(port.errorString().contains("a/b")) << port.errorString().toStdString();
}

TEST(VirtualPort, ResetBusRemovesOnlyOurStaleLinks)
{
    QTemporaryDir dir;
    const QString folder = dir.path();
    PtyVirtualPort live(folder);
    ASSERT_TRUE(live.createPort("COM1"));
    auto link = [&](const char *target, const QString &name) {
        return ::symlink(target, QFile::encodeName(folder + name).constData());
    };
    ASSERT_EQ(link("/dev/pts/999999", "/COM2"), 0);
    ASSERT_EQ(link("/dev/null", "/COM3"), 0);
    // Dangling too, but not ours: another name, or a target that is no pty.
    ASSERT_EQ(link("/dev/pts/999998", "/backup"), 0);
    ASSERT_EQ(link("/srv/gone/file", "/COM4"), 0);
    // In a folder that is not private, not even a link of ours is touched.
    ASSERT_EQ(::chmod(QFile::encodeName(folder).constData(), 0755), 0);
    EXPECT_EQ(ResetBus(folder), 0);
    ASSERT_EQ(::chmod(QFile::encodeName(folder).constData(), 0700), 0);
    QFile regular(folder + "/notes");
    ASSERT_TRUE(regular.open(QIODevice::WriteOnly));
    regular.close();
    ASSERT_TRUE(QDir(folder).mkdir("sub"));

    EXPECT_EQ(ResetBus(folder), 1);
    EXPECT_FALSE(isSymlink(folder + "/COM2"));
    EXPECT_TRUE(isSymlink(folder + "/COM1"));
    EXPECT_TRUE(isSymlink(folder + "/COM3"));
    EXPECT_TRUE(isSymlink(folder + "/COM4"));
    EXPECT_TRUE(isSymlink(folder + "/backup"));
    EXPECT_TRUE(QFileInfo::exists(folder + "/notes"));
    EXPECT_TRUE(QFileInfo(folder + "/sub").isDir());
    EXPECT_EQ(ResetBus(folder), 0);
    EXPECT_EQ(ResetBus(folder + "/missing"), 0);
}

TEST(VirtualPort, UnusableFolderFailsWithReason)
{
    QTemporaryDir dir;
    QFile blocker(dir.path() + "/file");
    ASSERT_TRUE(blocker.open(QIODevice::WriteOnly));
    blocker.close();
    const QString folder = blocker.fileName() + "/ports";
    PtyVirtualPort port(folder);
    EXPECT_FALSE(port.createPort("COM5"));
    EXPECT_TRUE(port.errorString().contains(folder)) << port.errorString().toStdString();
    EXPECT_TRUE(port.errorString().contains(QString::fromLocal8Bit(strerror(ENOTDIR))))
        << port.errorString().toStdString();

    PtyVirtualPort onFile(blocker.fileName());
    EXPECT_FALSE(onFile.createPort("COM5"));
    EXPECT_TRUE(onFile.errorString().contains(blocker.fileName())) << onFile.errorString().toStdString();

    if (::geteuid() == 0) {
        const QString foreign = dir.path() + "/foreign";
        ASSERT_TRUE(QDir(dir.path()).mkdir("foreign"));
        ASSERT_EQ(::chown(QFile::encodeName(foreign).constData(), 4242, 4242), 0);
        PtyVirtualPort planted(foreign);
        EXPECT_FALSE(planted.createPort("COM5"));
        EXPECT_TRUE(planted.errorString().contains("another user")) << planted.errorString().toStdString();
    }
}

TEST(VirtualPort, DefaultFolderFollowsRuntimeDirectory)
{
    const QByteArray saved = qgetenv("XDG_RUNTIME_DIR");
    const bool wasSet = qEnvironmentVariableIsSet("XDG_RUNTIME_DIR");
    qputenv("XDG_RUNTIME_DIR", "/run/user/4242");
    EXPECT_EQ(defaultVirtualPortFolder(), "/run/user/4242/velloca");
    qunsetenv("XDG_RUNTIME_DIR");
    EXPECT_EQ(defaultVirtualPortFolder(), QString("/tmp/velloca-%1").arg(::getuid()));
    if (wasSet)
        qputenv("XDG_RUNTIME_DIR", saved);
}
