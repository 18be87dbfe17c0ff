#pragma once

#include <QString>

// The application-wide options, alive for the whole run. Texts are empty
// and numbers 0 until a configuration is loaded; the loader supplies its
// own defaults for keys a file lacks.
struct GlobalOptions
{
    QString OnErrorRunApp; // command line of the error program, empty for none
    QString Password;      // empty for none
    qint32 LogErrors = 0;  // 1: write errorlog.txt
    qint32 PacketSize = 0; // bytes per packet
    qint32 PingEnabled = 0;
    qint32 PingFrequency = 0; // index into the ping frequency list
    qint32 PingTimeout = 0;   // index into the ping time-out list
    qint32 LoadWithWindows = 0; // 1: start with the desktop session

    // The one instance the program uses.
    static GlobalOptions &global();
};

// Bounds of PacketSize, as the options dialog enforces them: one packet must
// fit into one UDP datagram. Anything outside them becomes the default.
constexpr qint32 kMinPacketSize = 1;
constexpr qint32 kMaxPacketSize = 10000;
constexpr qint32 kDefaultPacketSize = 2000;

constexpr qint32 boundedPacketSize(qint32 size)
{
    return size >= kMinPacketSize && size <= kMaxPacketSize ? size : kDefaultPacketSize;
}

// Echo time-out in milliseconds used by the ping tools and the watchdog.
extern int PingTimeoutMs;
