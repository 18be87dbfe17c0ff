#include "LoginOptionsDialog.h"
#include "ui_LoginOptionsDialog.h"

#include "config/SessionOptions.h"

#include <QKeyEvent>
#include <QPushButton>

LoginOptionsDialog::LoginOptionsDialog(const SessionOptions &options, QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::LoginOptionsDialog>())
{
    m_ui->setupUi(this);
    setModal(true);

    connect(m_ui->btnOK, &QPushButton::clicked, this, &LoginOptionsDialog::accept);
    connect(m_ui->btnCancel, &QPushButton::clicked, this, &LoginOptionsDialog::reject);

    m_options = options;
    m_ui->txtUserPrompt->setText(options.UserPrompt);
    m_ui->txtUserPromptResponse->setText(options.UserPromptResponse);
    m_ui->txtPasswordPrompt->setText(options.PasswordPrompt);
    m_ui->txtPasswordPromptResponse->setText(options.PasswordPromptResponse);
}

LoginOptionsDialog::~LoginOptionsDialog() = default;

SessionOptions LoginOptionsDialog::options() const
{
    SessionOptions options = m_options;
    options.UserPrompt = m_ui->txtUserPrompt->text();
    options.UserPromptResponse = m_ui->txtUserPromptResponse->text();
    options.PasswordPrompt = m_ui->txtPasswordPrompt->text();
    options.PasswordPromptResponse = m_ui->txtPasswordPromptResponse->text();
    return options;
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

std::optional<SessionOptions> showLoginOptionsDialog(QWidget *parent, const SessionOptions &options)
{
    LoginOptionsDialog dialog(options, parent);
    if (dialog.exec() != QDialog::Accepted)
        return std::nullopt;
    return dialog.options();
}
