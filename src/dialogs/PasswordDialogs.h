#pragma once

#include <QDialog>
#include <QString>

#include <memory>
#include <optional>

namespace Ui {
class SetPasswordDialog;
class EnterPasswordDialog;
} // namespace Ui

// The password that guards restoring the main window and the tray menu's
// Exit lives in GlobalOptions::global().Password (empty: no protection).
// Both dialogs open centred on the screen and mask what is typed with "*".

// Form1: sets the password, typed twice. Both boxes start with the current
// password. accept() (OK, Enter) stores the first box when the two agree
// (two empty boxes remove the protection); when they differ it shows message
// 5110 and the dialog stays open with both texts kept. Cancel, Esc and the
// window frame change nothing. Localised from the string table.
class SetPasswordDialog : public QDialog
{
    Q_OBJECT
public:
    explicit SetPasswordDialog(QWidget *parent = nullptr);
    ~SetPasswordDialog() override;

    void accept() override;

private:
    std::unique_ptr<Ui::SetPasswordDialog> m_ui;
};

// Form2: asks for the password. enteredPassword() is the typed text after
// accept() (OK, Enter) and nothing after Cancel, Esc or the window frame.
// It compares nothing itself and shows English captions in every language.
class EnterPasswordDialog : public QDialog
{
    Q_OBJECT
public:
    explicit EnterPasswordDialog(QWidget *parent = nullptr);
    ~EnterPasswordDialog() override;

    void accept() override;
    std::optional<QString> enteredPassword() const { return m_entered; }

private:
    std::unique_ptr<Ui::EnterPasswordDialog> m_ui;
    std::optional<QString> m_entered;
};

// Shows Form1 modally; the new password takes effect in memory at once and
// reaches the configuration file with its next save.
void showSetPasswordDialog(QWidget *parent);

// Shows Form2 modally and returns what was typed, or nothing when the user
// cancelled. The caller compares it with the password.
std::optional<QString> askForPassword(QWidget *parent);
