// A configuration file as the program meets it: parsed from text, read into
// a Configuration, written back and turned into text again.
#include "FuzzSupport.h"

#include "config/ConfigurationFile.h"
#include "config/IniProfile.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    fuzz::ensureApplication();
    IniProfile profile = IniProfile::fromText(QString::fromUtf8(fuzz::bytes(data, size)));
    const Configuration config = readConfiguration(profile);
    fuzz::require(config.sessions.size() <= kMaxSessionsRead, "at most kMaxSessionsRead sessions read");
    writeConfiguration(profile, config, true);
    const QString written = profile.toText();

    // What was saved must load back to the same text, or every save of an
    // unchanged configuration would drift.
    const IniProfile reloaded = IniProfile::fromText(written);
    fuzz::require(reloaded.toText() == written, "fromText(toText()) keeps the text");
    const Configuration again = readConfiguration(reloaded);
    fuzz::require(again.sessions.size() == config.sessions.size(), "saved sessions load back");
    return 0;
}
