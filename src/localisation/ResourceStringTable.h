#pragma once

#include <span>

// One row of the string table: the same identifier in both languages, texts
// in UTF-8.
struct ResourceStringEntry
{
    int id;
    const char *english;
    const char *japanese;
};

// All rows, ascending by identifier, each identifier once.
std::span<const ResourceStringEntry> resourceStringTable();

// The row of the identifier, or nullptr when the table has none.
const ResourceStringEntry *findResourceString(int id);
