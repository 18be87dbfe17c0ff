#pragma once

#include "config/SessionOptions.h"

#include <QDialog>

#include <memory>
#include <optional>

class QKeyEvent;
namespace Ui { class LoginOptionsDialog; }

// frmLogin: edits the four login texts of one session (the prompts a remote
// device sends and the answers to them), exactly as typed. btnOK accepts;
// btnCancel and closing by the window frame reject. The captions are
// English in every language. Neither button answers Enter or Esc; Enter
// presses a push button that has the focus, as a click would.
class LoginOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit LoginOptionsDialog(const SessionOptions &options, QWidget *parent = nullptr);
    ~LoginOptionsDialog() override;

    // The options as edited (those the dialog does not edit as given).
    SessionOptions options() const;

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    std::unique_ptr<Ui::LoginOptionsDialog> m_ui;
    SessionOptions m_options;
};

// Shows the dialog modally; the edited texts, or nothing when cancelled.
std::optional<SessionOptions> showLoginOptionsDialog(QWidget *parent, const SessionOptions &options);
