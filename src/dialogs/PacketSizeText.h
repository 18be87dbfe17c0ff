#pragma once

#include "config/GlobalOptions.h"

#include <QString>
#include <QtGlobal>

// The packet size that the text of the packet-size box stands for, read the
// way the classic numeric reader does:
// - blanks, tabs and line breaks are ignored wherever they stand ("1 500" is
//   1500);
// - "&H" or "&O" (either case) starts a hexadecimal or octal number;
// - otherwise a decimal number with optional sign, fraction and exponent;
// - reading stops at the first character that cannot continue the number,
//   and a text that does not start with a number reads as 0;
// - the value is rounded to the nearest integer, a half to the even one.
// A result outside kMinPacketSize..kMaxPacketSize, or too large to read at
// all, gives kDefaultPacketSize.
qint32 packetSizeFromText(const QString &text);
