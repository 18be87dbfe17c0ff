#pragma once

#include "GlobalOptions.h"
#include "IniProfile.h"
#include "SessionOptions.h"
#include "SessionSettings.h"

#include <QHash>
#include <QList>
#include <QMap>
#include <QString>

#include <optional>

// What a configuration file (".vlk") holds, as plain values. The main window
// fills its windows from a Configuration after a load and builds one from
// them before a save; the file itself is an IniProfile.

struct SessionConfig
{
    SessionSettings settings; // ConnectorText is neither read nor written
    SessionOptions options;
    int AutoActivate = 0;     // as stored; only 1 activates after start-up
};

// Main window placement in twips (1/1440 inch).
struct MainWindowPlacement
{
    int left = 1000;
    int top = 1000;
    int width = 7000;
    int height = 7000;
    int windowState = 0; // 0 normal, 1 minimized, 2 maximized
};

// The sessions of a file beyond those the program opens, kept so that a
// save passes them on instead of dropping them.
struct SurplusSessions
{
    qint64 count = 0; // NumSessions beyond the sessions read
    QMap<qint64, IniProfile::SectionCopy> sections; // 1 = the first session not read
};

// What a file holds that belongs to its sessions and not to the file: the
// device map and the virtual port folder. A save into another file writes
// them as they were loaded, so the sessions keep driving the same devices.
struct DeviceSettings
{
    std::optional<IniProfile::SectionCopy> portsSection; // [Ports] as the file holds it
    QString virtualPortFolder; // empty: the default folder
};

struct Configuration
{
    int NumSessions = 0; // as read, negative allowed; a save writes the sessions it holds
    MainWindowPlacement placement;
    GlobalOptions options;
    QList<SessionConfig> sessions; // Session1, Session2, ... in order
    SurplusSessions surplus;
    QHash<int, QString> ports; // [Ports] COMn=device, n from 1 to 256
    DeviceSettings devices;
    // Write devices into the file (a save into a file other than the one loaded).
    bool writeDevices = false;
};

namespace ConfigurationKeys {
inline const QString kGlobalSection = QStringLiteral("Velloca");
inline const QString kPortsSection = QStringLiteral("Ports");
QString sessionSection(int number); // "Session" + number
} // namespace ConfigurationKeys

// A file may claim any NumSessions; at most this many sessions are opened,
// so a damaged or hostile value cannot make the load take unbounded time or
// memory (each session is a window). The sections beyond are kept as
// surplus and saved again behind the open sessions.
constexpr int kMaxSessionsRead = 256;

// Reads every key with the defaults of a load, which differ from a new
// window's defaults: list indexes 0 except BufferSize 2, empty PortNumber,
// AllowMultiConnect and ConnectOnVirtualOpen 1, prompts "Username:" and
// "Password:", TimeoutValue "150". Sessions come from "Session1" up to
// NumSessions (none when it is 0 or negative, at most kMaxSessionsRead);
// a missing section gives a session with the load defaults. Values are
// passed on as read: range checks are the windows' business. TCPOption is
// 1 for any non-zero value; TimeoutValue is read as a number and held as
// its decimal text.
Configuration readConfiguration(const IniProfile &profile);

// Writes the global section and one section per entry of config.sessions,
// in the order the program has always written them, then the surplus
// sessions numbered on from there; NumSessions counts both. With
// writePlacement false (main window minimized) the four geometry keys keep
// their old values; WindowState is always written. [Ports] and
// VirtualPortFolder are written only with config.writeDevices. Sections of
// sessions past NumSessions and unknown keys stay as they are.
void writeConfiguration(IniProfile &profile, const Configuration &config, bool writePlacement);

// The numeric value of a timeout text as it is saved: its leading number,
// blanks skipped, with sign and fraction ("200xyz" -> "200",
// " 150.50" -> "150.5", "abc" -> "0").
QString numericText(const QString &text);

// programFolder() + "/default.vlk".
QString defaultConfigurationPath();
