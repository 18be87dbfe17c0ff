#include "platform/PortMap.h"
#include "platform/TtySerialPort.h"
#include "support/PtyPair.h"
#include "support/Wait.h"

#include <QSignalSpy>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <fcntl.h>
#include <unistd.h>

namespace {

constexpr int kPort = 7;

// Recent Linux kernels force ptys to 8 data bits without parity; the framing
// checks only mean something where the pty keeps what it is given.
bool ptyKeepsFraming()
{
    PtyPair probe;
    termios t = probe.slaveTermios();
    t.c_cflag = (t.c_cflag & ~CSIZE) | CS7 | PARENB;
    int fd = ::open(probe.slavePath().toLocal8Bit().constData(), O_RDWR | O_NOCTTY);
    tcsetattr(fd, TCSANOW, &t);
    tcgetattr(fd, &t);
    ::close(fd);
    return (t.c_cflag & CSIZE) == CS7;
}

struct SerialPortOnPty : ::testing::Test
{
    void SetUp() override
    {
        ASSERT_TRUE(pty.isValid());
        ports.setDevice(kPort, pty.slavePath());
        port.setPortNumber(kPort);
    }

    PtyPair pty;
    PortMap ports;
    TtySerialPort port { ports };
};

TEST_F(SerialPortOnPty, LineSettingsReachTheTty)
{
    ASSERT_TRUE(port.setSettings(QStringLiteral("19200,E,7,2")));
    port.setHandshaking(SerialPortControl::RtsCts);
    ASSERT_TRUE(port.open()) << port.errorString().toStdString();

    const bool framing = ptyKeepsFraming();
    termios t = pty.slaveTermios();
    EXPECT_EQ(cfgetospeed(&t), speed_t(B19200));
    if (framing) {
        EXPECT_TRUE(t.c_cflag & PARENB);
        EXPECT_FALSE(t.c_cflag & PARODD);
        EXPECT_EQ(t.c_cflag & CSIZE, tcflag_t(CS7));
    }
    EXPECT_TRUE(t.c_cflag & CSTOPB);
    EXPECT_TRUE(t.c_cflag & CRTSCTS);
    EXPECT_EQ(port.settings(), QStringLiteral("19200,E,7,2"));

    // Changes on an open port take effect at once.
    ASSERT_TRUE(port.setSettings(QStringLiteral("115200,o,8,1")));
    port.setHandshaking(SerialPortControl::XonXoff);
    t = pty.slaveTermios();
    EXPECT_EQ(cfgetospeed(&t), speed_t(B115200));
    if (framing)
        EXPECT_TRUE((t.c_cflag & PARENB) && (t.c_cflag & PARODD));
    EXPECT_EQ(t.c_cflag & CSIZE, tcflag_t(CS8));
    EXPECT_FALSE(t.c_cflag & CSTOPB);
    EXPECT_FALSE(t.c_cflag & CRTSCTS);
    EXPECT_TRUE((t.c_iflag & IXON) && (t.c_iflag & IXOFF));

    // Mark and space parity use the stick-parity bit; 1.5 stop bits is
    // the 2-stop setting that a UART turns into 1.5 for 5-bit words.
    ASSERT_TRUE(port.setSettings(QStringLiteral("9600,M,5,1.5")));
    t = pty.slaveTermios();
    if (framing) {
        EXPECT_TRUE((t.c_cflag & PARENB) && (t.c_cflag & CMSPAR) && (t.c_cflag & PARODD));
        EXPECT_EQ(t.c_cflag & CSIZE, tcflag_t(CS5));
    }
    EXPECT_TRUE(t.c_cflag & CSTOPB);
    EXPECT_EQ(port.settings(), QStringLiteral("9600,M,5,1.5"));
    ASSERT_TRUE(port.setSettings(QStringLiteral("9600,S,8,1")));
    t = pty.slaveTermios();
    if (framing)
        EXPECT_TRUE((t.c_cflag & CMSPAR) && !(t.c_cflag & PARODD));

    // Nonsense is refused and the port keeps its settings.
    for (const char *bad : { "9600,X,8,1", "9600,N,9,1", "fast,N,8,1", "9600,N,8", "9600,N,8,3", "" })
        EXPECT_FALSE(port.setSettings(QString::fromLatin1(bad))) << bad;
    EXPECT_EQ(port.settings(), QStringLiteral("9600,S,8,1"));
}

TEST_F(SerialPortOnPty, BytesPassBothWaysAndInputCanBeDiscarded)
{
    ASSERT_TRUE(port.open()) << port.errorString().toStdString();
    QSignalSpy received(&port, &SerialPortControl::commEventRaised);

    QByteArray everyByte;
    for (int i = 0; i < 256; ++i)
        everyByte.append(char(i));
    ASSERT_TRUE(pty.write(everyByte));
    ASSERT_TRUE(waitUntil([&] { return port.inBufferCount() >= 256; }));
    EXPECT_GE(received.count(), 1);
    EXPECT_EQ(port.input(10), everyByte.left(10));
    EXPECT_EQ(port.input(), everyByte.mid(10));

    port.output(everyByte);
    EXPECT_EQ(pty.read(256), everyByte);
    EXPECT_TRUE(waitUntil([&] { return port.outBufferCount() == 0; }));
    EXPECT_EQ(port.outBufferSize(), 8192);

    ASSERT_TRUE(pty.write("discard me"));
    ASSERT_TRUE(waitUntil([&] { return port.inBufferCount() > 0; }));
    port.discardInput();
    EXPECT_EQ(port.inBufferCount(), 0);
}

TEST_F(SerialPortOnPty, UnpluggedDeviceIsReportedOnceAndClosesThePort)
{
    ASSERT_TRUE(port.open());
    QSignalSpy lost(&port, &SerialPortControl::deviceLost);
    pty.closeMaster();
    ASSERT_TRUE(waitUntil([&] { return lost.count() > 0; }));
    EXPECT_FALSE(port.isOpen());
    EXPECT_TRUE(port.errorString().contains(pty.slavePath()));
    QTest::qWait(100); // a short look for a second report, which must not come
    EXPECT_EQ(lost.count(), 1);
}

TEST(SerialPortFailures, MissingOrWrongDevicesFailWithTheirPath)
{
    QTemporaryDir dir;
    PortMap ports;
    TtySerialPort port(ports);

    const QString missing = dir.filePath(QStringLiteral("ttyUSB9"));
    ports.setDevice(3, missing);
    port.setPortNumber(3);
    EXPECT_FALSE(port.open());
    EXPECT_FALSE(port.isOpen());
    EXPECT_TRUE(port.errorString().contains(missing)) << port.errorString().toStdString();
    EXPECT_TRUE(port.errorString().contains(QStringLiteral("does not exist")));

    const QString plainFile = dir.filePath(QStringLiteral("notatty"));
    QFile file(plainFile);
    ASSERT_TRUE(file.open(QIODevice::WriteOnly));
    file.close();
    ports.setDevice(3, plainFile);
    EXPECT_FALSE(port.open());
    EXPECT_TRUE(port.errorString().contains(QStringLiteral("not a serial device")));

    // Unmapped numbers name the built-in UARTs; invalid numbers never open.
    EXPECT_EQ(ports.devicePath(4), QStringLiteral("/dev/ttyS3"));
    port.setPortNumber(-1);
    EXPECT_FALSE(port.open());
    EXPECT_TRUE(port.errorString().contains(QStringLiteral("COM-1")));
    // Reading or writing a closed port is harmless.
    EXPECT_TRUE(port.input().isEmpty());
    port.output("x");
    EXPECT_EQ(port.outBufferCount(), 0);
}

} // namespace
