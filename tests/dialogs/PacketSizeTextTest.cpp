#include "dialogs/PacketSizeText.h"

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

TEST(PacketSizeTextTest, ReadsTheLeadingNumberAndFallsBackTo2000OutsideOneTo10000)
{
    struct Row
    {
        const char16_t *text;
        qint32 expected;
    };
    const Row rows[] = {
        // List entries and typed sizes the list does not hold.
        { u"50", 50 },
        { u"4000", 4000 },
        { u"1500", 1500 },
        { u"1", 1 },
        { u"10000", 10000 },
        // Out of range, and texts that read as 0.
        { u"10001", 2000 },
        { u"12000", 2000 },
        { u"0", 2000 },
        { u"-5", 2000 },
        { u"abc", 2000 },
        { u"", 2000 },
        { u"   ", 2000 },
        { u"+", 2000 },
        { u".", 2000 },
        { u"x1500", 2000 },
        // Blanks count nowhere; reading stops at what cannot continue.
        { u"  1500  ", 1500 },
        { u"\t1500", 1500 },
        { u"1 500", 1500 },
        { u"+ 1500", 1500 },
        { u"1500 bytes", 1500 },
        { u"1,500", 1 },
        { u"15-00", 15 },
        { u"1500.", 1500 },
        { u"1.2.3", 1 },
        // Fractions round to the nearest integer, halves to the even one.
        { u"1499.4", 1499 },
        { u"1499.6", 1500 },
        { u"1500.5", 1500 },
        { u"1501.5", 1502 },
        { u"2.5", 2 },
        { u"0.6", 1 },
        { u"0.5", 2000 },
        { u".5", 2000 },
        { u"10000.5", 10000 },
        { u"10001.5", 2000 },
        { u"-0.4", 2000 },
        // Exponents, only when digits follow the marker.
        { u"1e3", 1000 },
        { u"1.5E3", 1500 },
        { u"15e+2", 1500 },
        { u"15000e-1", 1500 },
        { u"1e-1", 2000 },
        { u"1e5", 2000 },
        { u"15e", 15 },
        { u"15e+", 15 },
        { u"15ex", 15 },
        { u"1e400", 2000 },
        { u"1e-400", 2000 },
        // Hexadecimal and octal prefixes, either case.
        { u"&H5DC", 1500 },
        { u"&h5dc", 1500 },
        { u" & H 5DC", 1500 },
        { u"&H5DCG", 1500 },
        { u"&O2734", 1500 },
        { u"&o2734", 1500 },
        { u"&O27349", 1500 },
        { u"&H", 2000 },
        { u"&O8", 2000 },
        { u"&H2711", 2000 },
        { u"&HFFFFFFFFFFFFFFFFFFFF", 2000 },
        { u"&X10", 2000 },
        { u"-&H10", 2000 },
        // Digits of other scripts are not digits here.
        { u"\uff11\uff15\uff10\uff10", 2000 },
        { u"12\uff13", 12 },
        // Far too many digits is out of range, not a crash.
        { u"1000000000000000000000000000000000000000000000000000000000000000000000000", 2000 },
    };
    for (const Row &row : rows) {
        const QString text = QString::fromUtf16(row.text);
        SCOPED_TRACE(qPrintable(u'"' + text + u'"'));
        EXPECT_EQ(packetSizeFromText(text), row.expected);
    }
    // Far more digits than a double can hold.
    EXPECT_EQ(packetSizeFromText(QString(5000, u'9')), 2000);
    EXPECT_EQ(packetSizeFromText(u"1500."_s + QString(5000, u'4')), 1500);
    EXPECT_EQ(packetSizeFromText(u"&H"_s + QString(5000, u'F')), 2000);
}

} // namespace
