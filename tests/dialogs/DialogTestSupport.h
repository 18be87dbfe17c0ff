#pragma once

#include "config/SessionOptions.h"

#include <QAbstractButton>
#include <QCheckBox>
#include <QGroupBox>
#include <QRadioButton>
#include <QTest>
#include <QWidget>


#include <gtest/gtest.h>

#include <optional>

// A control of a form, found by its control name as tools and tests do.
template <typename T> T *control(const QWidget &form, const QString &name)
{
    T *widget = form.findChild<T *>(name);
    EXPECT_NE(widget, nullptr) << qPrintable(name);
    return widget;
}

// The index of the checked button of the option group "<name>_0" … "_2";
// nothing when none is checked.
inline std::optional<int> checkedOption(const QWidget &form, const QString &name)
{
    std::optional<int> checked;
    for (int index = 0; index < 3; ++index) {
        auto *button = control<QRadioButton>(form, name + u'_' + QString::number(index));
        if (button && button->isChecked()) {
            EXPECT_FALSE(checked.has_value()) << "two options checked in " << qPrintable(name);
            checked = index;
        }
    }
    return checked;
}

// Clicks a control where a user would: an option button or check box only
// answers clicks on its indicator and text, not on the rest of its width.
inline void clickControl(const QWidget &form, const char *name)
{
    auto *button = control<QAbstractButton>(form, QString::fromLatin1(name));
    ASSERT_NE(button, nullptr);
    QTest::mouseClick(button, Qt::LeftButton, {}, QPoint(4, button->height() / 2));
}
