#pragma once

#include <QByteArray>
#include <QString>

#include <sys/types.h>

// Files the program places for other software to read (the systemd unit,
// the autostart entry): readable by everyone, written so that a reader
// never sees half a file. Every error text names the path and the cause.

// Creates folder and its missing parents (mode 0755 before the umask).
bool makeFolderPath(const QString &folder, QString *error);

// Replaces path with data through a temporary file in the same folder
// (synced, then renamed over path), mode 0644. On failure the old file is
// untouched and no temporary file is left.
bool replaceFileAtomically(const QString &path, const QByteArray &data, QString *error, mode_t mode = 0644);

// Removes path; a missing file (or folder on the way) counts as removed.
bool removeFileIfPresent(const QString &path, QString *error);
