#pragma once

#include <QIcon>

// The program's icon, drawn in code so it needs no image files: a round
// badge with a "V".
QIcon appIcon();
