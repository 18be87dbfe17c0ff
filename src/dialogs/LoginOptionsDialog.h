#pragma once

#include <QDialog>

#include <memory>

class QKeyEvent;
namespace Ui { class LoginOptionsDialog; }

// frmLogin: edits the four login texts of one session (the prompts a remote
// device sends and the answers to them). It takes and returns them through
// the options transfer texts UserPrompt, UserPromptResponse, PasswordPrompt
// and PasswordPromptResponse:
// - accept() (btnOK) stores the four texts exactly as typed and sets
//   LoginCancel to 0;
// - btnCancel sets LoginCancel to -1 and stores nothing;
// - closing by the window frame stores nothing and leaves LoginCancel as
//   the last login dialog set it.
// The captions are English in every language. Neither button answers Enter
// or Esc; Enter presses a push button that has the focus, as a click would.
class LoginOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit LoginOptionsDialog(QWidget *parent = nullptr);
    ~LoginOptionsDialog() override;

    void accept() override;

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    void loadTransferTexts();
    void btnCancel_Click();

    std::unique_ptr<Ui::LoginOptionsDialog> m_ui;
};

// Shows the dialog modally and returns once it is closed; the session window
// reads the outcome from the transfer texts and LoginCancel.
void showLoginOptionsDialog(QWidget *parent);
