// The commands other programs send a session: each input line is one
// command for the same session, as a client would send them in a row.
#include "FuzzSupport.h"

#include "config/SessionSettings.h"
#include "session/SessionEngine.h"
#include "session/SessionPlatform.h"

#include <QTemporaryDir>

namespace {

void requireSettingsInLists(const SessionSettings &s)
{
    fuzz::require(s.BaudRate >= 0 && s.BaudRate < SessionLists::kBaudRates.size(), "baud rate entry exists");
    fuzz::require(s.Parity >= 0 && s.Parity < int(SessionLists::kParityLetters.size()), "parity entry exists");
    fuzz::require(s.Databits >= 0 && s.Databits < SessionLists::kDataBits.size(), "data bits entry exists");
    fuzz::require(s.Stopbits >= 0 && s.Stopbits < SessionLists::kStopBits.size(), "stop bits entry exists");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    fuzz::ensureApplication();
    static QTemporaryDir portFolder;
    // The real controls: they touch nothing until a session activates, and
    // this one cannot: its connector is "None", so [ACTIVATE] is refused
    // after the address and port checks.
    SessionEngine engine(SessionPlatform::real(portFolder.path()));
    engine.settings().Connector = 0;
    engine.settings().IPAddress = QStringLiteral("127.0.0.1");
    for (const QByteArray &line : fuzz::bytes(data, size).split('\n')) {
        engine.executeCommand(QString::fromUtf8(line));
        requireSettingsInLists(engine.settings());
        fuzz::require(!engine.isActive(), "a session without a connector stays inactive");
    }
    return 0;
}
