#include "LoginOptionsDialog.h"
#include "ui_LoginOptionsDialog.h"

#include "config/OptionsTransfer.h"

#include <QKeyEvent>
#include <QPushButton>

namespace {

constexpr int kLoginCancelled = -1;

} // namespace

LoginOptionsDialog::LoginOptionsDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::LoginOptionsDialog>())
{
    m_ui->setupUi(this);
    setModal(true);

    connect(m_ui->btnOK, &QPushButton::clicked, this, &LoginOptionsDialog::accept);
    connect(m_ui->btnCancel, &QPushButton::clicked, this, &LoginOptionsDialog::btnCancel_Click);

    loadTransferTexts();
}

LoginOptionsDialog::~LoginOptionsDialog() = default;

void LoginOptionsDialog::loadTransferTexts()
{
    const OptionsTransfer &t = OptionsTransfer::global();
    m_ui->txtUserPrompt->setText(t.UserPrompt);
    m_ui->txtUserPromptResponse->setText(t.UserPromptResponse);
    m_ui->txtPasswordPrompt->setText(t.PasswordPrompt);
    m_ui->txtPasswordPromptResponse->setText(t.PasswordPromptResponse);
}

void LoginOptionsDialog::accept()
{
    OptionsTransfer &t = OptionsTransfer::global();
    t.UserPrompt = m_ui->txtUserPrompt->text();
    t.UserPromptResponse = m_ui->txtUserPromptResponse->text();
    t.PasswordPrompt = m_ui->txtPasswordPrompt->text();
    t.PasswordPromptResponse = m_ui->txtPasswordPromptResponse->text();
    t.LoginCancel = 0;
    QDialog::accept();
}

void LoginOptionsDialog::btnCancel_Click()
{
    OptionsTransfer::global().LoginCancel = kLoginCancelled;
    reject();
}

void LoginOptionsDialog::keyPressEvent(QKeyEvent *event)
{
    switch (event->key()) {
    case Qt::Key_Escape:
        // No cancel button: Esc must not close the dialog behind the
        // user's back.
        return;
    case Qt::Key_Enter:
    case Qt::Key_Return:
        // No default button either; only a focused button takes Enter.
        if (auto *focused = qobject_cast<QPushButton *>(focusWidget()); focused && focused->isEnabled())
            focused->click();
        return;
    default:
        QDialog::keyPressEvent(event);
    }
}

void showLoginOptionsDialog(QWidget *parent)
{
    LoginOptionsDialog dialog(parent);
    dialog.exec();
}
