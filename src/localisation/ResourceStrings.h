#pragma once

#include <QList>
#include <QString>

// The program's string table: every caption, menu text, tooltip and message
// that is shown localised, by 16-bit identifier, in English and Japanese.
// Identifiers 20 and 21 describe the font of localised forms (family name and
// character set as decimal text) rather than text.

enum class UiLanguage { English, Japanese };

// Japanese when the user's interface language is Japanese: the first
// non-empty of LC_ALL, LC_MESSAGES and LANG decides (a value starting with
// "ja" means Japanese, anything else English); with none of them set, the
// system locale decides.
UiLanguage systemUiLanguage();

// The language in force. Starts as systemUiLanguage() on first use; nothing in
// the program changes it afterwards, tests switch it.
void setUiLanguage(UiLanguage language);
UiLanguage uiLanguage();

// The text of the identifier in the language in force; an empty string for an
// identifier the table does not hold.
QString LoadResString(int id);

bool hasResString(int id);

// Every identifier of the table, ascending.
QList<int> resStringIds();
