#pragma once

#include <QString>

// Start with the desktop session: an XDG autostart entry that desktop
// environments run at login. Every configuration save renews it from
// LoadWithWindows, so it always reflects the saved option.

// $XDG_CONFIG_HOME/autostart/velloca.desktop (normally
// ~/.config/autostart/velloca.desktop).
QString autostartEntryPath();

// Enable: writes the entry with Exec naming programPath (absolute), quoted
// so that blanks and shell characters survive. Disable: deletes the entry;
// no entry is no error. False, with error naming the path and the reason,
// when the folder or the file cannot be written or removed, or when
// programPath cannot be started from an entry.
bool SetAutoStart(bool enable, const QString &programPath, QString *error = nullptr);
