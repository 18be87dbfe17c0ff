#pragma once

#include <QString>

#include <functional>
#include <optional>

class QWidget;

// Message and input boxes shown by the windows. Tests replace the handlers
// so that no modal box waits for a click.
namespace UserDialogs {

enum class Icon { None, Information, Warning, Critical };

struct MessageRequest
{
    QWidget *parent = nullptr;
    QString text;
    QString title;
    Icon icon = Icon::None;
};

struct InputRequest
{
    QWidget *parent = nullptr;
    QString prompt;
    QString title;
    QString defaultText;
};

struct FileRequest
{
    QWidget *parent = nullptr;
    QString title;
    QString filter;        // Qt syntax: "Name (*.ext);;All Files (*)"
    QString defaultSuffix; // appended to a name typed without one
    bool save = false;     // save dialog (no overwrite prompt) or open dialog (file must exist)
};

using MessageHandler = std::function<void(const MessageRequest &)>;
// Returns the answer, or nothing for Cancel.
using InputHandler = std::function<std::optional<QString>(const InputRequest &)>;
// Returns the chosen file, or nothing for Cancel.
using FileHandler = std::function<std::optional<QString>(const FileRequest &)>;

void showMessage(const MessageRequest &request);
std::optional<QString> askText(const InputRequest &request);
std::optional<QString> askFileName(const FileRequest &request);

// Replaces the handlers; an empty function restores the real boxes.
void setMessageHandler(MessageHandler handler);
void setInputHandler(InputHandler handler);
void setFileHandler(FileHandler handler);

} // namespace UserDialogs
