#include "UserDialogs.h"

#include <QFileDialog>
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

FileHandler &fileHandler()
{
    static FileHandler handler;
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

std::optional<QString> askFileName(const FileRequest &request)
{
    if (fileHandler())
        return fileHandler()(request);
    QFileDialog dialog(request.parent, request.title, QString(), request.filter);
    dialog.setAcceptMode(request.save ? QFileDialog::AcceptSave : QFileDialog::AcceptOpen);
    dialog.setFileMode(request.save ? QFileDialog::AnyFile : QFileDialog::ExistingFile);
    dialog.setOption(QFileDialog::DontConfirmOverwrite, request.save);
    dialog.setDefaultSuffix(request.defaultSuffix);
    if (dialog.exec() != QDialog::Accepted || dialog.selectedFiles().isEmpty())
        return std::nullopt;
    return dialog.selectedFiles().constFirst();
}

void setFileHandler(FileHandler handler)
{
    fileHandler() = std::move(handler);
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
