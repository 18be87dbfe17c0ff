#pragma once

#include <QAbstractButton>
#include <QWidget>

// While a look-up runs its form shows the busy cursor and its start button
// is off, so a second request cannot overtake the first.
inline void showBusy(QWidget *form, QAbstractButton *start, bool busy)
{
    start->setEnabled(!busy);
    if (busy)
        form->setCursor(Qt::BusyCursor);
    else
        form->unsetCursor();
}
