#include "PacketSizeText.h"

#include <cmath>
#include <optional>

namespace {

bool isIgnoredBlank(QChar c)
{
    return c == u' ' || c == u'\t' || c == u'\n' || c == u'\r';
}

// Only ASCII digits count: QChar::isDigit() would also take other scripts'
// digits, which the reader does not know.
int digitValue(QChar c, int radix)
{
    const char16_t u = c.unicode();
    int value = radix;
    if (u >= u'0' && u <= u'9')
        value = u - u'0';
    else if (u >= u'a' && u <= u'f')
        value = u - u'a' + 10;
    else if (u >= u'A' && u <= u'F')
        value = u - u'A' + 10;
    return value < radix ? value : -1;
}

bool isDecimalDigit(const QString &text, qsizetype i)
{
    return i < text.size() && digitValue(text[i], 10) >= 0;
}

double readRadixDigits(const QString &text, qsizetype i, int radix)
{
    // A double holds every value up to 2^53 exactly, far beyond the range
    // that matters; longer digit strings only grow towards infinity.
    double value = 0;
    for (int digit; i < text.size() && (digit = digitValue(text[i], radix)) >= 0; ++i)
        value = value * radix + digit;
    return value;
}

// nothing when the number cannot be represented (an exponent out of range)
std::optional<double> readDecimal(const QString &text)
{
    qsizetype i = 0;
    QString number;
    if (i < text.size() && (text[i] == u'+' || text[i] == u'-'))
        number += text[i++];
    bool anyDigit = false;
    for (; isDecimalDigit(text, i); ++i, anyDigit = true)
        number += text[i];
    if (i < text.size() && text[i] == u'.') {
        number += text[i++];
        for (; isDecimalDigit(text, i); ++i, anyDigit = true)
            number += text[i];
    }
    if (!anyDigit)
        return 0.0;
    // An exponent marker counts only when digits follow it: "15e" is 15.
    if (i < text.size() && (text[i] == u'e' || text[i] == u'E')) {
        qsizetype j = i + 1;
        QString exponent = QStringLiteral("e");
        if (j < text.size() && (text[j] == u'+' || text[j] == u'-'))
            exponent += text[j++];
        if (isDecimalDigit(text, j)) {
            for (; isDecimalDigit(text, j); ++j)
                exponent += text[j];
            number += exponent;
        }
    }
    // toDouble() refuses overflow and underflow alike; either way the value
    // is no packet size, as too large or as rounding to 0.
    bool ok = false;
    const double value = number.toDouble(&ok);
    if (ok && std::isfinite(value))
        return value;
    return std::nullopt;
}

std::optional<double> leadingValue(const QString &typed)
{
    QString text;
    text.reserve(typed.size());
    for (QChar c : typed) {
        if (!isIgnoredBlank(c))
            text += c;
    }
    if (text.size() >= 2 && text[0] == u'&') {
        const QChar prefix = text[1].toUpper();
        if (prefix == u'H')
            return readRadixDigits(text, 2, 16);
        if (prefix == u'O')
            return readRadixDigits(text, 2, 8);
    }
    return readDecimal(text);
}

double roundHalfToEven(double value)
{
    const double lower = std::floor(value);
    const double fraction = value - lower;
    if (fraction > 0.5)
        return lower + 1;
    if (fraction < 0.5)
        return lower;
    return std::fmod(lower, 2.0) == 0 ? lower : lower + 1;
}

} // namespace

qint32 packetSizeFromText(const QString &text)
{
    const std::optional<double> value = leadingValue(text);
    if (!value || !std::isfinite(*value))
        return kDefaultPacketSize;
    const double rounded = roundHalfToEven(*value);
    if (rounded < kMinPacketSize || rounded > kMaxPacketSize)
        return kDefaultPacketSize;
    return qint32(rounded);
}
