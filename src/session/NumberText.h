#pragma once

#include <QString>

// Reads a number the way the classic decimal reader does: blanks skipped,
// an optional sign, digits with an optional fraction and exponent; reading
// stops at the first character that does not fit. No number at all is 0.
double leadingNumber(const QString &text);

// The leading number of a text, cut to a whole number, when that lies in
// 1..65535 (the range of resource ids); else 0.
int leadingPositiveId(const QString &text);
