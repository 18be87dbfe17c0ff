#pragma once

#include <QByteArray>
#include <QString>

// Configuration files edited on other systems are often not UTF-8 but in a
// Windows code page. Such bytes are shown in that code page and written back
// unchanged, so that nothing the user stored turns into U+FFFD.

// The code page assumed for bytes that are not UTF-8: Windows-31J (the
// Shift-JIS of Japanese Windows) when the character-type locale (first of
// LC_ALL, LC_CTYPE, LANG) is Japanese, else Windows-1252.
QByteArray legacyCodecName();

// The text of bytes: UTF-8 when they are valid UTF-8, else the legacy code
// page (wasLegacy tells which).
QString decodeConfigurationBytes(const QByteArray &bytes, bool *wasLegacy);

// text in the legacy code page, or a null array when the code page cannot
// hold every character of it.
QByteArray encodeLegacy(const QString &text);
