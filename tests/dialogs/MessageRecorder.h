#pragma once

#include "viewsupport/UserDialogs.h"

#include <QList>

// Records the message boxes a form shows instead of showing them, so no
// modal box waits for a click.
class MessageRecorder
{
public:
    MessageRecorder()
    {
        UserDialogs::setMessageHandler([this](const UserDialogs::MessageRequest &request) { m_messages.append(request); });
    }
    ~MessageRecorder() { UserDialogs::setMessageHandler({}); }
    MessageRecorder(const MessageRecorder &) = delete;
    MessageRecorder &operator=(const MessageRecorder &) = delete;

    const QList<UserDialogs::MessageRequest> &messages() const { return m_messages; }

private:
    QList<UserDialogs::MessageRequest> m_messages;
};
