#pragma once

#include <QString>

// The folder that holds default.vlk and errorlog.txt: the per-user
// configuration folder $XDG_CONFIG_HOME/velloca (normally ~/.config/velloca).
// It is created when asked for; a folder that cannot be made is still
// returned, and what is opened in it then fails like any missing file.
QString programFolder();

// The path of a file directly in the program folder.
QString programFolderFile(const QString &fileName);

// Makes programFolder() answer folder instead; an empty text restores the
// normal folder.
void setProgramFolderForTesting(const QString &folder);
