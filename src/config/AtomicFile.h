#pragma once

#include <QByteArray>
#include <QString>

// Replaces the file at path with data so that a reader sees either the old
// contents or the new ones, never a mix: the bytes go to a temporary file in
// the same folder, are synced to disk and then renamed over path. The result
// has mode 0600 whether it is new or replaces a file, because configuration
// files hold a password. A symbolic link at path is followed, so the link
// stays and its target is replaced.
//
// On failure the old file is untouched, no temporary file is left behind and
// error (when given) receives a text naming the path and the cause.
bool writeFileAtomically(const QString &path, const QByteArray &data, QString *error = nullptr);
