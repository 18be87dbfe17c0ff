#include "ConfigurationFile.h"

#include "ProgramFolder.h"

#include <QRegularExpression>

#include <algorithm>
#include <climits>

namespace {

using ConfigurationKeys::kGlobalSection;
using ConfigurationKeys::kPortsSection;

SessionConfig readSession(const IniProfile &profile, const QString &section)
{
    auto number = [&](const char *key, int defaultValue) {
        return profile.readInt(section, QLatin1String(key), defaultValue);
    };
    auto text = [&](const char *key, const QString &defaultValue) {
        return profile.readString(section, QLatin1String(key), defaultValue);
    };

    SessionConfig session;
    SessionSettings &s = session.settings;
    s.Connector = number("Connector", 0);
    s.BaudRate = number("BaudRate", 0);
    s.Parity = number("Parity", 0);
    s.Databits = number("Databits", 0);
    s.Stopbits = number("Stopbits", 0);
    s.FlowControl = number("FlowControl", 0);
    s.BufferSize = number("BufferSize", 2);
    s.BufferSerialData = number("BufferSerialData", 0);
    s.CreateVirtualPort = number("CreateVirtualPort", 0);
    s.UseUDP = number("UseUDP", 0);
    s.LocalIP = text("LocalIP", QString());
    s.IPAddress = text("IPAddress", QString());
    s.PortNumber = text("PortNumber", QString());
    s.TCPOption = number("TCPOption", 0) != 0 ? 1 : 0;

    SessionOptions &o = session.options;
    o.AllowMultiConnect = number("AllowMultiConnect", 1);
    o.ServerSerialOptions = number("ServerSerialOptions", 0);
    o.ServerTCPOptions = number("ServerTCPOptions", 0);
    o.ClientOptions = number("ClientOptions", 0);
    o.ConnectOnVirtualOpen = number("ConnectOnVirtualOpen", 1);
    o.UserPrompt = text("UserPrompt", QStringLiteral("Username:"));
    o.UserPromptResponse = text("UserPromptResponse", QString());
    o.PasswordPrompt = text("PasswordPrompt", QStringLiteral("Password:"));
    o.PasswordPromptResponse = text("PasswordPromptResponse", QString());

    session.AutoActivate = number("AutoActivate", 0);
    s.WaitForCr = number("WaitForCr", 0);
    s.TimeoutValue = QString::number(number("TimeoutValue", 150));
    s.SessionDescription = text("SessionDescription", QString());
    s.ConnectorText.clear(); // the window derives it from Connector
    return session;
}

QHash<int, QString> readPorts(const IniProfile &profile)
{
    static const QRegularExpression portKey(QStringLiteral("^COM(\\d{1,3})$"),
                                            QRegularExpression::CaseInsensitiveOption);
    QHash<int, QString> ports;
    const QStringList keys = profile.keys(kPortsSection);
    for (const QString &key : keys) {
        const QRegularExpressionMatch match = portKey.match(key);
        if (!match.hasMatch())
            continue;
        const int number = match.captured(1).toInt();
        if (number < 1 || number >= SessionLists::kConnectorCount || ports.contains(number))
            continue;
        const QString device = profile.readString(kPortsSection, key, QString());
        // An empty entry means the port's usual device.
        if (!device.isEmpty())
            ports.insert(number, device);
    }
    return ports;
}

void writeSession(IniProfile &profile, const QString &section, const SessionConfig &session)
{
    auto number = [&](const char *key, int value) {
        profile.writeInt(section, QLatin1String(key), value);
    };
    auto text = [&](const char *key, const QString &value) {
        profile.writeString(section, QLatin1String(key), value);
    };

    const SessionSettings &s = session.settings;
    number("Connector", s.Connector);
    number("BaudRate", s.BaudRate);
    number("Parity", s.Parity);
    number("Databits", s.Databits);
    number("Stopbits", s.Stopbits);
    number("FlowControl", s.FlowControl);
    number("BufferSize", s.BufferSize);
    number("CreateVirtualPort", s.CreateVirtualPort);
    number("UseUDP", s.UseUDP);
    number("BufferSerialData", s.BufferSerialData);
    text("LocalIP", s.LocalIP);
    text("IPAddress", s.IPAddress);
    text("PortNumber", s.PortNumber);
    number("TCPOption", s.TCPOption != 0 ? 1 : 0);
    number("AutoActivate", session.AutoActivate);
    number("WaitForCr", s.WaitForCr);
    text("TimeoutValue", numericText(s.TimeoutValue));

    const SessionOptions &o = session.options;
    number("AllowMultiConnect", o.AllowMultiConnect);
    number("ServerSerialOptions", o.ServerSerialOptions);
    number("ServerTCPOptions", o.ServerTCPOptions);
    number("ClientOptions", o.ClientOptions);
    number("ConnectOnVirtualOpen", o.ConnectOnVirtualOpen);
    text("UserPrompt", o.UserPrompt);
    text("UserPromptResponse", o.UserPromptResponse);
    text("PasswordPrompt", o.PasswordPrompt);
    text("PasswordPromptResponse", o.PasswordPromptResponse);
    text("SessionDescription", s.SessionDescription);
}

// The number of a "SessionN" section name, or 0.
qint64 sessionNumber(const QString &sectionName)
{
    static const QRegularExpression name(QStringLiteral("^Session([1-9][0-9]{0,17})$"),
                                         QRegularExpression::CaseInsensitiveOption);
    const QRegularExpressionMatch match = name.match(sectionName.trimmed());
    return match.hasMatch() ? match.captured(1).toLongLong() : 0;
}

SurplusSessions readSurplus(const IniProfile &profile, int numSessions)
{
    SurplusSessions surplus;
    if (numSessions <= kMaxSessionsRead)
        return surplus;
    surplus.count = qint64(numSessions) - kMaxSessionsRead;
    const QStringList names = profile.sectionNames();
    for (const QString &name : names) {
        const qint64 n = sessionNumber(name);
        if (n > kMaxSessionsRead && n <= numSessions && !surplus.sections.contains(n - kMaxSessionsRead))
            surplus.sections.insert(n - kMaxSessionsRead, *profile.copySection(name));
    }
    return surplus;
}

// The surplus sessions follow the open ones. A number in their range with no
// section of its own must not pick up a stale section the file still has.
void writeSurplus(IniProfile &profile, qint64 openSessions, const SurplusSessions &surplus)
{
    const QStringList names = profile.sectionNames();
    for (const QString &name : names) {
        const qint64 offset = sessionNumber(name) - openSessions;
        if (offset >= 1 && offset <= surplus.count && !surplus.sections.contains(offset))
            profile.removeSection(name);
    }
    for (auto it = surplus.sections.cbegin(); it != surplus.sections.cend(); ++it)
        profile.pasteSection(QStringLiteral("Session%1").arg(openSessions + it.key()), it.value());
}

bool isAsciiDigit(QChar c)
{
    return c >= QLatin1Char('0') && c <= QLatin1Char('9');
}

} // namespace

QString ConfigurationKeys::sessionSection(int number)
{
    return QStringLiteral("Session%1").arg(number);
}

Configuration readConfiguration(const IniProfile &profile)
{
    const QString &g = kGlobalSection;
    Configuration config;
    config.NumSessions = profile.readInt(g, QStringLiteral("NumSessions"), 0);

    MainWindowPlacement &p = config.placement;
    p.left = profile.readInt(g, QStringLiteral("MainLeft"), 1000);
    p.top = profile.readInt(g, QStringLiteral("MainTop"), 1000);
    p.width = profile.readInt(g, QStringLiteral("MainWidth"), 7000);
    p.height = profile.readInt(g, QStringLiteral("MainHeight"), 7000);
    p.windowState = profile.readInt(g, QStringLiteral("WindowState"), 0);

    GlobalOptions &o = config.options;
    o.OnErrorRunApp = profile.readString(g, QStringLiteral("OnErrorRunApp"), QString());
    o.Password = profile.readString(g, QStringLiteral("Password"), QString());
    o.LogErrors = profile.readInt(g, QStringLiteral("LogErrors"), 0);
    o.PingEnabled = profile.readInt(g, QStringLiteral("PingEnabled"), 0);
    o.PingFrequency = profile.readInt(g, QStringLiteral("PingFrequency"), 3);
    o.PingTimeout = profile.readInt(g, QStringLiteral("PingTimeout"), 9);
    o.PacketSize = boundedPacketSize(profile.readInt(g, QStringLiteral("PacketSize"), kDefaultPacketSize));
    o.LoadWithWindows = profile.readInt(g, QStringLiteral("LoadWithWindows"), 0);

    const int sessionCount = std::min(config.NumSessions, kMaxSessionsRead);
    if (sessionCount > 0)
        config.sessions.reserve(sessionCount);
    for (int n = 1; n <= sessionCount; ++n)
        config.sessions.append(readSession(profile, ConfigurationKeys::sessionSection(n)));
    config.surplus = readSurplus(profile, config.NumSessions);

    config.ports = readPorts(profile);
    config.devices.portsSection = profile.copySection(kPortsSection);
    config.devices.virtualPortFolder = profile.readString(g, QStringLiteral("VirtualPortFolder"), QString());
    return config;
}

void writeConfiguration(IniProfile &profile, const Configuration &config, bool writePlacement)
{
    const QString &g = kGlobalSection;
    const MainWindowPlacement &p = config.placement;
    if (writePlacement) {
        profile.writeInt(g, QStringLiteral("MainLeft"), p.left);
        profile.writeInt(g, QStringLiteral("MainTop"), p.top);
        profile.writeInt(g, QStringLiteral("MainWidth"), p.width);
        profile.writeInt(g, QStringLiteral("MainHeight"), p.height);
    }

    const GlobalOptions &o = config.options;
    const qint64 sessionCount = config.sessions.size() + config.surplus.count;
    profile.writeInt(g, QStringLiteral("NumSessions"), int(std::min<qint64>(sessionCount, INT_MAX)));
    profile.writeInt(g, QStringLiteral("WindowState"), p.windowState);
    profile.writeString(g, QStringLiteral("OnErrorRunApp"), o.OnErrorRunApp);
    profile.writeInt(g, QStringLiteral("LogErrors"), o.LogErrors);
    profile.writeInt(g, QStringLiteral("LoadWithWindows"), o.LoadWithWindows);
    profile.writeInt(g, QStringLiteral("PingEnabled"), o.PingEnabled);
    profile.writeInt(g, QStringLiteral("PingFrequency"), o.PingFrequency);
    profile.writeInt(g, QStringLiteral("PingTimeout"), o.PingTimeout);
    profile.writeInt(g, QStringLiteral("PacketSize"), o.PacketSize);
    profile.writeString(g, QStringLiteral("Password"), o.Password);

    for (qsizetype i = 0; i < config.sessions.size(); ++i)
        writeSession(profile, ConfigurationKeys::sessionSection(int(i + 1)), config.sessions[i]);
    writeSurplus(profile, config.sessions.size(), config.surplus);

    if (config.writeDevices) {
        profile.pasteSection(kPortsSection, config.devices.portsSection);
        if (config.devices.virtualPortFolder.isEmpty())
            profile.removeKey(g, QStringLiteral("VirtualPortFolder"));
        else
            profile.writeString(g, QStringLiteral("VirtualPortFolder"), config.devices.virtualPortFolder);
    }
}

QString numericText(const QString &text)
{
    qsizetype at = 0;
    while (at < text.size() && text[at].isSpace())
        ++at;
    bool negative = false;
    if (at < text.size() && (text[at] == QLatin1Char('-') || text[at] == QLatin1Char('+'))) {
        negative = text[at] == QLatin1Char('-');
        ++at;
    }
    const qsizetype wholeStart = at;
    while (at < text.size() && isAsciiDigit(text[at]))
        ++at;
    QString whole = text.mid(wholeStart, at - wholeStart);
    QString fraction;
    if (at < text.size() && text[at] == QLatin1Char('.')) {
        const qsizetype fractionStart = ++at;
        while (at < text.size() && isAsciiDigit(text[at]))
            ++at;
        fraction = text.mid(fractionStart, at - fractionStart);
    }

    // The value, not the spelling: no leading zeros, no trailing zeros in
    // the fraction, no sign on zero.
    qsizetype significant = 0;
    while (significant < whole.size() - 1 && whole[significant] == QLatin1Char('0'))
        ++significant;
    whole = whole.mid(significant);
    if (whole.isEmpty())
        whole = QStringLiteral("0");
    while (fraction.endsWith(QLatin1Char('0')))
        fraction.chop(1);
    QString result = whole;
    if (!fraction.isEmpty())
        result += QLatin1Char('.') + fraction;
    if (negative && result != QLatin1String("0"))
        result.prepend(QLatin1Char('-'));
    return result;
}

QString defaultConfigurationPath()
{
    return programFolderFile(QStringLiteral("default.vlk"));
}
