// The readers that turn typed or received text into numbers.
#include "FuzzSupport.h"

#include "dialogs/PacketSizeText.h"
#include "session/NumberText.h"

#include <cmath>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    const QByteArray input = fuzz::bytes(data, size);
    // Both the UTF-8 reading and a Latin-1 one, so bytes 0x80..0xFF reach
    // the readers as single characters too.
    for (const QString &text : { QString::fromUtf8(input), QString::fromLatin1(input) }) {
        const qint32 packetSize = packetSizeFromText(text);
        fuzz::require(packetSize >= kMinPacketSize && packetSize <= kMaxPacketSize,
                      "packet size within its bounds");
        const double number = leadingNumber(text);
        fuzz::require(!std::isnan(number), "leadingNumber is never NaN");
        const int id = leadingPositiveId(text);
        fuzz::require(id >= 0, "leadingPositiveId is never negative");
        // Only the whole part counts: "3.7" is id 3.
        fuzz::require(id == 0 || id == int(number), "leadingPositiveId agrees with leadingNumber");
    }
    return 0;
}
