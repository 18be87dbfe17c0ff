#include "MdiArrangement.h"

#include <QMdiArea>
#include <QMdiSubWindow>

namespace MdiArrangement {
namespace {

QList<QMdiSubWindow *> openWindows(QMdiArea *area)
{
    QList<QMdiSubWindow *> windows;
    for (QMdiSubWindow *window : area->subWindowList(QMdiArea::CreationOrder)) {
        if (!window->isMinimized() && window->isVisible())
            windows << window;
    }
    return windows;
}

void tile(QMdiArea *area, bool stacked)
{
    const QList<QMdiSubWindow *> windows = openWindows(area);
    if (windows.isEmpty())
        return;
    const QRect space = area->viewport()->rect();
    const int count = int(windows.size());
    for (int i = 0; i < count; ++i) {
        const QRect cell = stacked
            ? QRect(0, space.height() * i / count, space.width(), space.height() / count)
            : QRect(space.width() * i / count, 0, space.width() / count, space.height());
        windows[i]->setGeometry(cell);
    }
}

} // namespace

void tileHorizontally(QMdiArea *area)
{
    tile(area, true);
}

void tileVertically(QMdiArea *area)
{
    tile(area, false);
}

void arrangeIcons(QMdiArea *area)
{
    int x = 0;
    const int bottom = area->viewport()->height();
    for (QMdiSubWindow *window : area->subWindowList(QMdiArea::CreationOrder)) {
        if (!window->isMinimized())
            continue;
        window->move(x, bottom - window->height());
        x += window->width();
    }
}

} // namespace MdiArrangement
