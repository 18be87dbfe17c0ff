#include "PasswordDialogs.h"
#include "ui_EnterPasswordDialog.h"
#include "ui_SetPasswordDialog.h"

#include "config/GlobalOptions.h"
#include "viewsupport/ApplyResourceStrings.h"
#include "localisation/ResourceStrings.h"
#include "viewsupport/UserDialogs.h"

#include <QScreen>

namespace {

// Both password dialogs appear in the middle of the screen rather than over
// their parent: the main window they guard may be hidden or minimized.
// move() marks the position as chosen, so show() keeps it.
void centreOnScreen(QWidget *dialog)
{
    dialog->adjustSize();
    const QScreen *screen = dialog->screen();
    if (!screen)
        return;
    const QRect area = screen->geometry();
    dialog->move(area.x() + (area.width() - dialog->width()) / 2,
                 area.y() + (area.height() - dialog->height()) / 2);
}

} // namespace

SetPasswordDialog::SetPasswordDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::SetPasswordDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);
    centreOnScreen(this);

    connect(m_ui->Command1, &QPushButton::clicked, this, &SetPasswordDialog::accept);
    connect(m_ui->Command2, &QPushButton::clicked, this, &SetPasswordDialog::reject);

    const QString &current = GlobalOptions::global().Password;
    m_ui->Text1->setText(current);
    m_ui->Text2->setText(current);
}

SetPasswordDialog::~SetPasswordDialog() = default;

void SetPasswordDialog::accept()
{
    if (m_ui->Text2->text() != m_ui->Text1->text()) {
        UserDialogs::showMessage({ this, LoadResString(5110), QStringLiteral("Velloca"), UserDialogs::Icon::None });
        return;
    }
    GlobalOptions::global().Password = m_ui->Text1->text();
    QDialog::accept();
}

EnterPasswordDialog::EnterPasswordDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::EnterPasswordDialog>())
{
    m_ui->setupUi(this);
    setModal(true);
    centreOnScreen(this);

    connect(m_ui->Command1, &QPushButton::clicked, this, &EnterPasswordDialog::accept);
    connect(m_ui->Command2, &QPushButton::clicked, this, &EnterPasswordDialog::reject);
}

EnterPasswordDialog::~EnterPasswordDialog() = default;

void EnterPasswordDialog::accept()
{
    m_entered = m_ui->Text1->text();
    QDialog::accept();
}

void showSetPasswordDialog(QWidget *parent)
{
    SetPasswordDialog dialog(parent);
    dialog.exec();
}

std::optional<QString> askForPassword(QWidget *parent)
{
    EnterPasswordDialog dialog(parent);
    dialog.exec();
    return dialog.enteredPassword();
}
