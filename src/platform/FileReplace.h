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
// (synced, then renamed over path). A new file gets mode; an existing one
// keeps its mode, owner and group. Through a symbolic link the link stays
// and the file it names is replaced. Refused, with the old file untouched:
// a target that is not a regular file, and a file without any write bit
// (also for root). On failure no temporary file is left.
bool replaceFileAtomically(const QString &path, const QByteArray &data, QString *error, mode_t mode = 0644);

// Removes path; a missing file (or folder on the way) counts as removed.
bool removeFileIfPresent(const QString &path, QString *error);
