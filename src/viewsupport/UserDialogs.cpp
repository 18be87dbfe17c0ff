#include "UserDialogs.h"

#include <QFileDialog>
#include <QInputDialog>
#include <QMessageBox>
#include <QPointer>

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
    // On the heap and watched: the program may end while the box waits, and
    // the parent window then deletes it from under exec().
    QPointer<QMessageBox> box = new QMessageBox(toQtIcon(request.icon), request.title, request.text,
                                                QMessageBox::Ok, request.parent);
    box->exec();
    delete box.data();
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
    QPointer<QFileDialog> dialog = new QFileDialog(request.parent, request.title, QString(), request.filter);
    dialog->setAcceptMode(request.save ? QFileDialog::AcceptSave : QFileDialog::AcceptOpen);
    dialog->setFileMode(request.save ? QFileDialog::AnyFile : QFileDialog::ExistingFile);
    dialog->setOption(QFileDialog::DontConfirmOverwrite, request.save);
    dialog->setDefaultSuffix(request.defaultSuffix);
    const bool chosen = dialog->exec() == QDialog::Accepted && dialog && !dialog->selectedFiles().isEmpty();
    const QString file = chosen ? dialog->selectedFiles().constFirst() : QString();
    delete dialog.data();
    if (!chosen)
        return std::nullopt;
    return file;
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
