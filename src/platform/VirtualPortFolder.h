#pragma once

#include <QString>

// The folder that holds the virtual ports: one symbolic link per port,
// named like the port (COM5) and pointing at the pty slave applications
// open. Nothing here ever writes through or follows an existing path.

// $XDG_RUNTIME_DIR/velloca, or /tmp/velloca-<uid> without a runtime folder.
QString defaultVirtualPortFolder();

// Removes the links the program leaves when it ends without removing its
// ports: named COM<n>, pointing into /dev/pts/ at a terminal that no longer
// exists, in a folder of this user's with mode 0700. Anything else stays.
// Returns how many were removed.
int ResetBus(const QString &folder);

// Creates the folder (mode 0700) when it is missing. False, with the reason
// naming the folder, when it cannot be made, is no folder or belongs to
// another user.
bool makeVirtualPortFolder(const QString &folder, QString *error);

// Makes <folder>/<name> a link to target. An existing entry is replaced only
// when it is a link that is stale or already points at target; anything
// else is refused and left untouched.
bool placeVirtualPortLink(const QString &folder, const QString &name,
                          const QString &target, QString *error);

// Removes the link only while it still points at target, so a port that
// someone else has made under the same name survives. True when removed.
bool removeVirtualPortLink(const QString &linkPath, const QString &target);
