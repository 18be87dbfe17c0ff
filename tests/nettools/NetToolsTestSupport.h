#pragma once

#include "session/UserDialogs.h"

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

// True when this process may send ICMP echo requests at all.
inline bool canSendIcmp()
{
    for (int type : { SOCK_DGRAM, SOCK_RAW }) {
        const int fd = ::socket(AF_INET, type | SOCK_CLOEXEC, IPPROTO_ICMP);
        if (fd >= 0) {
            ::close(fd);
            return true;
        }
    }
    return false;
}

// Takes CAP_NET_RAW out of this thread's effective set, so raw ICMP sockets
// are refused as they would be for an ordinary user.
class WithoutRawSockets
{
public:
    WithoutRawSockets()
    {
        if (syscall(SYS_capget, &m_header, m_saved) != 0)
            return;
        __user_cap_data_struct reduced[2];
        std::memcpy(reduced, m_saved, sizeof reduced);
        reduced[CAP_NET_RAW / 32].effective &= ~(1u << (CAP_NET_RAW % 32));
        m_changed = syscall(SYS_capset, &m_header, reduced) == 0;
    }
    ~WithoutRawSockets()
    {
        if (m_changed)
            syscall(SYS_capset, &m_header, m_saved);
    }
    WithoutRawSockets(const WithoutRawSockets &) = delete;
    WithoutRawSockets &operator=(const WithoutRawSockets &) = delete;

private:
    __user_cap_header_struct m_header { _LINUX_CAPABILITY_VERSION_3, 0 };
    __user_cap_data_struct m_saved[2] {};
    bool m_changed = false;
};
