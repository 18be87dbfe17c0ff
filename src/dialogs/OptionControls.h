#pragma once

#include <array>

class QCheckBox;
class QRadioButton;

// The option buttons of one group in index order, top to bottom; the stored
// value of the group is the index of the selected button.
using OptionGroup = std::array<QRadioButton *, 3>;

// Selects the button at the stored index. A value no button stands for (only
// a hand-edited configuration file produces one) selects the first button,
// so the group never shows without a selection.
void selectOption(const OptionGroup &group, int index);

// Writes the index of the selected button to target; with no button selected
// target keeps its value.
void storeSelectedOption(const OptionGroup &group, int &target);

// Check box values are 0 (unchecked) and 1 (checked); any other value shows
// unchecked.
void showCheckValue(QCheckBox *box, int value);
int checkValue(const QCheckBox *box);
