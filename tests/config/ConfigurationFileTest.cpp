#include "config/ConfigurationFile.h"
#include "config/ProgramFolder.h"

#include <QElapsedTimer>
#include <QFile>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <climits>

namespace {

const QString kGlobal = QStringLiteral("Velloca");

void writeFile(const QString &path, const QByteArray &bytes)
{
    QFile file(path);
    ASSERT_TRUE(file.open(QIODevice::WriteOnly | QIODevice::Truncate)) << qPrintable(path);
    ASSERT_EQ(file.write(bytes), bytes.size());
}

Configuration loadFile(const QString &path)
{
    return readConfiguration(IniProfile::load(path));
}

void saveFile(const QString &path, const Configuration &config, bool writePlacement = true)
{
    IniProfile profile = IniProfile::load(path);
    writeConfiguration(profile, config, writePlacement);
    QString error;
    ASSERT_TRUE(profile.save(path, &error)) << qPrintable(error);
}

// Every stored field of a session, so comparisons name the field that differs.
QStringList describe(const SessionConfig &c)
{
    const SessionSettings &s = c.settings;
    const SessionOptions &o = c.options;
    QStringList fields;
    for (int value : { s.Connector, s.BaudRate, s.Parity, s.Databits, s.Stopbits, s.FlowControl,
                       s.BufferSize, s.BufferSerialData, s.CreateVirtualPort, s.UseUDP, s.TCPOption,
                       s.WaitForCr, o.AllowMultiConnect, o.ServerSerialOptions, o.ServerTCPOptions,
                       o.ClientOptions, o.ConnectOnVirtualOpen, c.AutoActivate })
        fields << QString::number(value);
    fields << s.LocalIP << s.IPAddress << s.PortNumber << s.TimeoutValue << s.SessionDescription
           << s.ConnectorText << o.UserPrompt << o.UserPromptResponse << o.PasswordPrompt
           << o.PasswordPromptResponse;
    return fields;
}

// A session as a load of a section without keys gives it.
SessionConfig loadDefaults()
{
    SessionConfig c;
    c.settings.BaudRate = 0;
    c.settings.Databits = 0;
    c.settings.BufferSize = 2;
    c.settings.PortNumber = QString();
    c.settings.TimeoutValue = QStringLiteral("150");
    c.options.AllowMultiConnect = 1;
    c.options.ConnectOnVirtualOpen = 1;
    c.options.UserPrompt = QStringLiteral("Username:");
    c.options.PasswordPrompt = QStringLiteral("Password:");
    return c;
}

SessionConfig sampleSession(int n)
{
    SessionConfig c;
    SessionSettings &s = c.settings;
    s.Connector = 3 + n;
    s.BaudRate = 12;
    s.Parity = 2;
    s.Databits = 3;
    s.Stopbits = 2;
    s.FlowControl = 1;
    s.BufferSize = 5;
    s.BufferSerialData = 1;
    s.CreateVirtualPort = 1;
    s.UseUDP = n % 2;
    s.LocalIP = QStringLiteral("192.168.1.%1").arg(n);
    s.IPAddress = QStringLiteral("host%1.example").arg(n);
    s.PortNumber = QStringLiteral("40%1").arg(n, 2, 10, QLatin1Char('0'));
    s.TCPOption = 1;
    s.WaitForCr = 1;
    s.TimeoutValue = QStringLiteral("250");
    s.SessionDescription = QStringLiteral("Weighbridge %1 – 計量").arg(n);
    SessionOptions &o = c.options;
    o.AllowMultiConnect = 0;
    o.ServerSerialOptions = 2;
    o.ServerTCPOptions = 1;
    o.ClientOptions = 2;
    o.ConnectOnVirtualOpen = 0;
    o.UserPrompt = QStringLiteral("login:");
    o.UserPromptResponse = QStringLiteral("operator");
    o.PasswordPrompt = QStringLiteral("pass:");
    o.PasswordPromptResponse = QStringLiteral("s3cret = yes");
    c.AutoActivate = 1;
    return c;
}

Configuration sampleConfiguration(int sessionCount)
{
    Configuration config;
    config.placement = { 120, 240, 9000, 6000, 2 };
    config.options.OnErrorRunApp = QStringLiteral("/usr/bin/logger -t velloca");
    config.options.Password = QStringLiteral("plain text");
    config.options.LogErrors = 1;
    config.options.PacketSize = 512;
    config.options.PingEnabled = 1;
    config.options.PingFrequency = 7;
    config.options.PingTimeout = 12;
    config.options.LoadWithWindows = 1;
    for (int n = 1; n <= sessionCount; ++n)
        config.sessions.append(sampleSession(n));
    config.NumSessions = sessionCount;
    return config;
}

} // namespace

TEST(ConfigurationFile, FullConfigurationRoundTrips)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("round.vlk"));
    const Configuration saved = sampleConfiguration(2);
    saveFile(path, saved);

    const Configuration loaded = loadFile(path);
    EXPECT_EQ(loaded.NumSessions, 2);
    EXPECT_EQ(loaded.placement.left, 120);
    EXPECT_EQ(loaded.placement.top, 240);
    EXPECT_EQ(loaded.placement.width, 9000);
    EXPECT_EQ(loaded.placement.height, 6000);
    EXPECT_EQ(loaded.placement.windowState, 2);
    EXPECT_EQ(loaded.options.OnErrorRunApp, saved.options.OnErrorRunApp);
    EXPECT_EQ(loaded.options.Password, saved.options.Password);
    EXPECT_EQ(loaded.options.LogErrors, 1);
    EXPECT_EQ(loaded.options.PacketSize, 512);
    EXPECT_EQ(loaded.options.PingEnabled, 1);
    EXPECT_EQ(loaded.options.PingFrequency, 7);
    EXPECT_EQ(loaded.options.PingTimeout, 12);
    EXPECT_EQ(loaded.options.LoadWithWindows, 1);
    ASSERT_EQ(loaded.sessions.size(), 2);
    for (int i = 0; i < 2; ++i)
        EXPECT_EQ(describe(loaded.sessions[i]), describe(saved.sessions[i])) << "session " << i + 1;

    // A new file lists the keys in the order they were always written.
    const IniProfile profile = IniProfile::load(path);
    EXPECT_EQ(profile.keys(kGlobal),
              QStringList({ "MainLeft", "MainTop", "MainWidth", "MainHeight", "NumSessions",
                            "WindowState", "OnErrorRunApp", "LogErrors", "LoadWithWindows",
                            "PingEnabled", "PingFrequency", "PingTimeout", "PacketSize",
                            "Password" }));
    EXPECT_EQ(profile.keys(QStringLiteral("Session2")),
              QStringList({ "Connector", "BaudRate", "Parity", "Databits", "Stopbits",
                            "FlowControl", "BufferSize", "CreateVirtualPort", "UseUDP",
                            "BufferSerialData", "LocalIP", "IPAddress", "PortNumber", "TCPOption",
                            "AutoActivate", "WaitForCr", "TimeoutValue", "AllowMultiConnect",
                            "ServerSerialOptions", "ServerTCPOptions", "ClientOptions",
                            "ConnectOnVirtualOpen", "UserPrompt", "UserPromptResponse",
                            "PasswordPrompt", "PasswordPromptResponse", "SessionDescription" }));
    EXPECT_FALSE(profile.hasSection(QStringLiteral("Ports")));
    EXPECT_FALSE(profile.hasKey(kGlobal, QStringLiteral("VirtualPortFolder")));
}

TEST(ConfigurationFile, MissingFileGivesLoadDefaults)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const Configuration config = loadFile(dir.filePath(QStringLiteral("absent.vlk")));
    EXPECT_EQ(config.NumSessions, 0);
    EXPECT_TRUE(config.sessions.isEmpty());
    EXPECT_EQ(config.placement.left, 1000);
    EXPECT_EQ(config.placement.top, 1000);
    EXPECT_EQ(config.placement.width, 7000);
    EXPECT_EQ(config.placement.height, 7000);
    EXPECT_EQ(config.placement.windowState, 0);
    EXPECT_EQ(config.options.OnErrorRunApp, QString());
    EXPECT_EQ(config.options.Password, QString());
    EXPECT_EQ(config.options.LogErrors, 0);
    EXPECT_EQ(config.options.PingEnabled, 0);
    EXPECT_EQ(config.options.PingFrequency, 3);
    EXPECT_EQ(config.options.PingTimeout, 9);
    EXPECT_EQ(config.options.PacketSize, 2000);
    EXPECT_EQ(config.options.LoadWithWindows, 0);
    EXPECT_TRUE(config.ports.isEmpty());
    EXPECT_EQ(config.devices.virtualPortFolder, QString());
}

TEST(ConfigurationFile, HandWrittenFileReadsWithAnyCaseAndMissingSections)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("hand.vlk"));
    writeFile(path,
              "[velloca]\n"
              " numsessions = 3 \n"
              "VirtualPortFolder = /run/user/1000/ports \n"
              "[SESSION1]\n"
              " baudrate = 6 \n"
              "portnumber=4001\n"
              "TCPOption=5\n"
              "AutoActivate=2\n"
              "TimeoutValue=150.5\n"
              "SessionDescription=" + QByteArray(250, 'n') + "\n"
              "[ports]\n"
              "com5=/dev/ttyUSB0\n"
              "COM1 = /dev/serial/by-id/usb-FTDI-if00\n"
              "COM0=/dev/null\n"
              "COM257=/dev/null\n"
              "COMX=/dev/null\n"
              "COM7=\n"
              "Com5=/dev/duplicate\n");

    const Configuration config = loadFile(path);
    EXPECT_EQ(config.NumSessions, 3);
    ASSERT_EQ(config.sessions.size(), 3);
    const SessionSettings &first = config.sessions[0].settings;
    EXPECT_EQ(first.BaudRate, 6);
    EXPECT_EQ(first.PortNumber, QStringLiteral("4001"));
    EXPECT_EQ(first.TCPOption, 1) << "any non-zero value is the server";
    EXPECT_EQ(config.sessions[0].AutoActivate, 2) << "passed on; only 1 activates";
    EXPECT_EQ(first.TimeoutValue, QStringLiteral("150"));
    EXPECT_EQ(first.SessionDescription, QString(199, QLatin1Char('n')));
    EXPECT_EQ(first.ConnectorText, QString());
    for (int i = 1; i < 3; ++i)
        EXPECT_EQ(describe(config.sessions[i]), describe(loadDefaults())) << "session " << i + 1;

    EXPECT_EQ(config.devices.virtualPortFolder, QStringLiteral("/run/user/1000/ports"));
    QHash<int, QString> ports;
    ports.insert(5, QStringLiteral("/dev/ttyUSB0"));
    ports.insert(1, QStringLiteral("/dev/serial/by-id/usb-FTDI-if00"));
    EXPECT_EQ(config.ports, ports);

    // A save keeps what it does not write, and the server choice is saved as "1".
    Configuration changed = config;
    changed.sessions.resize(1);
    saveFile(path, changed);
    const IniProfile profile = IniProfile::load(path);
    EXPECT_EQ(profile.readString(QStringLiteral("Session1"), QStringLiteral("TCPOption"), QString()),
              QStringLiteral("1"));
    EXPECT_EQ(profile.readString(QStringLiteral("Ports"), QStringLiteral("COM5"), QString()),
              QStringLiteral("/dev/ttyUSB0"));
    EXPECT_EQ(loadFile(path).devices.virtualPortFolder, QStringLiteral("/run/user/1000/ports"));
    EXPECT_EQ(loadFile(path).ports, ports);
}

TEST(ConfigurationFile, SavingFewerSessionsKeepsTheOldSections)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("five.vlk"));
    saveFile(path, sampleConfiguration(5));

    Configuration two = sampleConfiguration(2);
    two.sessions[0].settings.PortNumber = QStringLiteral("5001");
    two.sessions[1].AutoActivate = 0;
    saveFile(path, two);

    const IniProfile profile = IniProfile::load(path);
    EXPECT_EQ(profile.readInt(kGlobal, QStringLiteral("NumSessions"), -1), 2);
    for (int n = 3; n <= 5; ++n) {
        EXPECT_EQ(profile.readString(QStringLiteral("Session%1").arg(n), QStringLiteral("PortNumber"),
                                     QString()),
                  QStringLiteral("40%1").arg(n, 2, 10, QLatin1Char('0')));
    }
    const Configuration loaded = readConfiguration(profile);
    ASSERT_EQ(loaded.sessions.size(), 2);
    EXPECT_EQ(loaded.sessions[0].settings.PortNumber, QStringLiteral("5001"));
    EXPECT_EQ(loaded.sessions[1].AutoActivate, 0);
}

TEST(ConfigurationFile, MinimizedSaveKeepsGeometryAndWritesWindowState)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("min.vlk"));
    saveFile(path, sampleConfiguration(1));

    Configuration minimized = sampleConfiguration(1);
    minimized.placement = { -32000, -32000, 160, 30, 1 };
    saveFile(path, minimized, false);

    const Configuration loaded = loadFile(path);
    EXPECT_EQ(loaded.placement.left, 120);
    EXPECT_EQ(loaded.placement.top, 240);
    EXPECT_EQ(loaded.placement.width, 9000);
    EXPECT_EQ(loaded.placement.height, 6000);
    EXPECT_EQ(loaded.placement.windowState, 1);

    // Into a new file nothing is written for the geometry, so a load gives defaults.
    const QString fresh = dir.filePath(QStringLiteral("fresh.vlk"));
    saveFile(fresh, minimized, false);
    EXPECT_FALSE(IniProfile::load(fresh).hasKey(kGlobal, QStringLiteral("MainLeft")));
    EXPECT_EQ(loadFile(fresh).placement.width, 7000);
}

TEST(ConfigurationFile, TimeoutValueIsSavedAsItsNumericValue)
{
    const std::pair<const char *, const char *> cases[] = {
        { "150", "150" }, { "abc", "0" }, { "200xyz", "200" }, { "150.5", "150.5" },
        { "  42 ms", "42" }, { "-5", "-5" }, { "+7", "7" }, { "007", "7" }, { "1.500", "1.5" },
        { "3.", "3" }, { ".25", "0.25" }, { "-0", "0" }, { "", "0" }, { "1,5", "1" },
    };
    for (const auto &[text, expected] : cases)
        EXPECT_EQ(numericText(QString::fromUtf8(text)), QString::fromUtf8(expected)) << text;

    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("timeout.vlk"));
    Configuration config = sampleConfiguration(3);
    config.sessions[0].settings.TimeoutValue = QStringLiteral("abc");
    config.sessions[1].settings.TimeoutValue = QStringLiteral("200xyz");
    config.sessions[2].settings.TimeoutValue = QStringLiteral("150.5");
    saveFile(path, config);

    const IniProfile profile = IniProfile::load(path);
    auto stored = [&](int n) {
        return profile.readString(QStringLiteral("Session%1").arg(n), QStringLiteral("TimeoutValue"),
                                  QString());
    };
    EXPECT_EQ(stored(1), QStringLiteral("0"));
    EXPECT_EQ(stored(2), QStringLiteral("200"));
    EXPECT_EQ(stored(3), QStringLiteral("150.5"));
    const Configuration loaded = readConfiguration(profile);
    EXPECT_EQ(loaded.sessions[2].settings.TimeoutValue, QStringLiteral("150")) << "loads as its whole part";
}

TEST(ConfigurationFile, BadValuesStayBounded)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("bad.vlk"));

    writeFile(path, "[Velloca]\nNumSessions=-1\n[Session1]\nBaudRate=3\n");
    EXPECT_EQ(loadFile(path).NumSessions, -1);
    EXPECT_TRUE(loadFile(path).sessions.isEmpty());

    writeFile(path, "[Velloca]\nNumSessions=2147483647\nPacketSize=70000\n"
                    "[Session1]\nPortNumber=99999\nBaudRate=1099511627776\nConnector=-1\n");
    QElapsedTimer timer;
    timer.start();
    Configuration config = loadFile(path);
    EXPECT_EQ(config.NumSessions, INT_MAX);
    ASSERT_EQ(config.sessions.size(), kMaxSessionsRead);
    EXPECT_EQ(config.sessions[0].settings.PortNumber, QStringLiteral("99999"));
    EXPECT_EQ(config.sessions[0].settings.BaudRate, INT_MAX) << "2^40 is clamped, not wrapped";
    EXPECT_EQ(config.sessions[0].settings.Connector, -1);
    EXPECT_EQ(config.options.PacketSize, 2000) << "the options dialog allows 1 to 10000";

    // Ten thousand real sections: read up to the cap, the rest kept and
    // numbered on behind the open sessions when one of those is closed.
    QByteArray many = "[Velloca]\r\nNumSessions=10000\r\n";
    for (int n = 1; n <= 10000; ++n)
        many += "[Session" + QByteArray::number(n) + "]\r\nPortNumber=" + QByteArray::number(n) + "\r\n";
    writeFile(path, many);
    config = loadFile(path);
    ASSERT_EQ(config.sessions.size(), kMaxSessionsRead);
    EXPECT_EQ(config.sessions.last().settings.PortNumber, QString::number(kMaxSessionsRead));
    config.sessions.removeFirst();
    saveFile(path, config);
    const IniProfile profile = IniProfile::load(path);
    EXPECT_EQ(profile.readInt(kGlobal, QStringLiteral("NumSessions"), 0), 9999);
    auto port = [&](int session) {
        return profile.readString(QStringLiteral("Session%1").arg(session), QStringLiteral("PortNumber"), QString());
    };
    EXPECT_EQ(port(1), QStringLiteral("2"));
    EXPECT_EQ(port(256), QStringLiteral("257"));
    EXPECT_EQ(port(9999), QStringLiteral("10000"));
    EXPECT_LT(timer.elapsed(), 30000);
}
