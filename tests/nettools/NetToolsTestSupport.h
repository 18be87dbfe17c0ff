#pragma once

#include "viewsupport/UserDialogs.h"
#include "support/IcmpPermissions.h"

#include <QAbstractButton>
#include <QLineEdit>
#include <QTest>
#include <QWidget>

#include <gtest/gtest.h>

#include <linux/capability.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstring>
#include <vector>

// Answers every message box for the duration of a test and records it.
class MessageRecorder
{
public:
    MessageRecorder()
    {
        UserDialogs::setMessageHandler([this](const UserDialogs::MessageRequest &request) {
            messages.push_back(request);
        });
    }
    ~MessageRecorder() { UserDialogs::setMessageHandler({}); }
    MessageRecorder(const MessageRecorder &) = delete;
    MessageRecorder &operator=(const MessageRecorder &) = delete;

    std::vector<UserDialogs::MessageRequest> messages;
};

template <typename T> T *control(const QWidget &form, const char *name)
{
    T *widget = form.findChild<T *>(QString::fromLatin1(name));
    EXPECT_NE(widget, nullptr) << name;
    return widget;
}

inline QString textOf(const QWidget &form, const char *name)
{
    auto *box = control<QLineEdit>(form, name);
    return box ? box->text() : QString();
}

inline void setText(const QWidget &form, const char *name, const QString &text)
{
    if (auto *box = control<QLineEdit>(form, name))
        box->setText(text);
}

inline void click(const QWidget &form, const char *name)
{
    if (auto *button = control<QAbstractButton>(form, name))
        QTest::mouseClick(button, Qt::LeftButton);
}


