#pragma once

class QMdiArea;

// Arrangements of the session windows inside the main window.
namespace MdiArrangement {

// One above the other, each as wide as the area.
void tileHorizontally(QMdiArea *area);
// Side by side, each as high as the area.
void tileVertically(QMdiArea *area);
// Minimized windows in a row along the bottom edge.
void arrangeIcons(QMdiArea *area);

} // namespace MdiArrangement
