#pragma once

class QAbstractButton;
class QKeyEvent;
class QWidget;

// Enter and Esc in the I/O options dialogs, which have no default button:
// Enter presses the push button that has the focus and does nothing
// elsewhere, Esc presses escapeButton (the dialog's cancel button, which
// need not be its Cancel). Returns whether the key was one of these two, so
// the dialog's own handling (which would reject on Esc) is skipped.
bool handleDialogKey(QWidget *dialog, QKeyEvent *event, QAbstractButton *escapeButton);
