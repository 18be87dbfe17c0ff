#include "OptionControls.h"

#include <QCheckBox>
#include <QRadioButton>

void selectOption(const OptionGroup &group, int index)
{
    const bool known = index >= 0 && index < int(group.size());
    group[known ? index : 0]->setChecked(true);
}

void storeSelectedOption(const OptionGroup &group, int &target)
{
    for (int index = 0; index < int(group.size()); ++index) {
        if (group[index]->isChecked())
            target = index;
    }
}

void showCheckValue(QCheckBox *box, int value)
{
    box->setChecked(value == 1);
}

int checkValue(const QCheckBox *box)
{
    return box->isChecked() ? 1 : 0;
}
