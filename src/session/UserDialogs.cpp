#include "UserDialogs.h"

#include <QInputDialog>
#include <QMessageBox>

namespace UserDialogs {
namespace {

MessageHandler &messageHandler()
{
    static MessageHandler handler;
    return handler;
}

InputHandler &inputHandler()
{
    static InputHandler handler;
    return handler;
}

QMessageBox::Icon toQtIcon(Icon icon)
{
    switch (icon) {
    case Icon::Information: return QMessageBox::Information;
    case Icon::Warning: return QMessageBox::Warning;
    case Icon::Critical: return QMessageBox::Critical;
    default: return QMessageBox::NoIcon;
    }
}

} // namespace

void showMessage(const MessageRequest &request)
{
    if (messageHandler()) {
        messageHandler()(request);
        return;
    }
    QMessageBox box(toQtIcon(request.icon), request.title, request.text, QMessageBox::Ok, request.parent);
    box.exec();
}

std::optional<QString> askText(const InputRequest &request)
{
    if (inputHandler())
        return inputHandler()(request);
    bool ok = false;
    const QString answer = QInputDialog::getText(request.parent, request.title, request.prompt,
                                                 QLineEdit::Normal, request.defaultText, &ok);
    if (!ok)
        return std::nullopt;
    return answer;
}

void setMessageHandler(MessageHandler handler)
{
    messageHandler() = std::move(handler);
}

void setInputHandler(InputHandler handler)
{
    inputHandler() = std::move(handler);
}

} // namespace UserDialogs
