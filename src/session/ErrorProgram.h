#pragma once

#include <QString>

// The error program runs for every logged event, and events come in floods
// (two status changes for every TCP connection), so only a few copies run
// at once; starts beyond that are skipped and counted.
inline constexpr int kMaxRunningErrorPrograms = 4;

// Whether a copy may start now.
bool errorProgramHasRoom();

// Starts the program named by the command line, without a shell and without
// waiting for it, when a copy may start; otherwise counts a skipped start.
// When the whole text names an executable file (a path with blanks, as a
// file dialog gives it) that file runs without arguments; otherwise the text
// is split into words, honouring quotes.
void startErrorProgram(const QString &commandLine);

// The starts skipped since the last call; the count starts again at 0.
qint64 takeSkippedErrorProgramStarts();
