#pragma once

#include <QString>
#include <QStringList>

#include <array>

// The settings of one session as its window shows them. List settings are
// 0-based entry indexes (-1: nothing chosen); names equal the configuration
// keys.
struct SessionSettings
{
    int Connector = 0;
    int BaudRate = 6;
    int Parity = 0;
    int Databits = 3;
    int Stopbits = 0;
    int FlowControl = 0;
    int BufferSize = 2;
    int BufferSerialData = 0;
    int CreateVirtualPort = 0;
    int UseUDP = 0;
    QString LocalIP;
    QString IPAddress;
    QString PortNumber = QStringLiteral("1000");
    int TCPOption = 0;
    int WaitForCr = 0;
    QString TimeoutValue = QStringLiteral("150");
    QString SessionDescription;
    // The text shown in the connector box: an entry, or typed text.
    QString ConnectorText;
};

// The fixed entries of the window's lists.
namespace SessionLists {

constexpr int kConnectorCount = 257; // "None", COM1 ... COM256
inline const QStringList kBaudRates { "110", "300", "600", "1200", "2400", "4800", "9600", "14400",
    "19200", "28800", "38400", "57600", "115200", "230400", "460800", "921600" };
// Resource ids of the parity entries: None, Even, Odd, Mark, Space.
constexpr std::array<int, 5> kParityIds { 2205, 2207, 2206, 2208, 2209 };
// Letters of the parity entries in the same order, for the settings text.
constexpr std::array<char, 5> kParityLetters { 'N', 'E', 'O', 'M', 'S' };
inline const QStringList kDataBits { "5", "6", "7", "8" };
inline const QStringList kStopBits { "1", "1.5", "2" };
// Resource ids of the flow-control entries: None, Xon/Xoff, Hardware, Opto-RS.
constexpr std::array<int, 4> kFlowControlIds { 2213, 2214, 2215, 2216 };
inline const QStringList kBufferSizes { "1024", "4096", "8192", "16384", "32768", "65536", "131072",
    "262144", "524288", "1048576", "2097152", "4194304", "8388608", "16777216", "33554432",
    "67108864" };

// "COM1" ... "COM256" for n >= 1; entry 0 is the localised "None".
QString connectorName(int n);

} // namespace SessionLists
