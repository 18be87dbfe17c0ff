#pragma once

#include <QString>

// Where the user manual (manual.html) is, so Help can open it.

// The installed manual, found relative to the program so that a relocated
// installation works (<prefix>/bin/velloca reads
// <prefix>/share/doc/velloca/manual.html); when the program runs from its
// build folder, the manual of the source tree it was built from. Empty when
// neither exists.
QString manualPath();

// The same search with explicit places, for callers that know them:
// applicationDir is the folder of the running program, sourceDir the
// source tree (empty: not looked at). Returns an absolute, clean path or
// an empty text.
QString manualPath(const QString &applicationDir, const QString &sourceDir);
