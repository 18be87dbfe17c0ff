#include "DialogKeys.h"

#include <QKeyEvent>
#include <QPushButton>
#include <QWidget>

bool handleDialogKey(QWidget *dialog, QKeyEvent *event, QAbstractButton *escapeButton)
{
    // Modifiers are not checked: a dialog button answers Shift+Enter as well.
    switch (event->key()) {
    case Qt::Key_Escape:
        if (escapeButton->isVisible() && escapeButton->isEnabled())
            escapeButton->click();
        return true;
    case Qt::Key_Enter:
    case Qt::Key_Return:
        if (auto *focused = qobject_cast<QPushButton *>(dialog->focusWidget());
            focused && focused->isEnabled()) {
            focused->click();
        }
        return true;
    default:
        return false;
    }
}
