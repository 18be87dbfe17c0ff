#include "ClientOptionsDialog.h"
#include "ui_ClientOptionsDialog.h"

#include "DialogKeys.h"
#include "OptionControls.h"
#include "config/OptionsTransfer.h"
#include "viewsupport/ApplyResourceStrings.h"

#include <QKeyEvent>

namespace {

OptionGroup ioGroup(const Ui::ClientOptionsDialog &ui)
{
    return { ui.Option1_0, ui.Option1_1, ui.Option1_2 };
}

} // namespace

ClientOptionsDialog::ClientOptionsDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::ClientOptionsDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);

    connect(m_ui->Command1, &QPushButton::clicked, this, &ClientOptionsDialog::accept);
    connect(m_ui->Command2, &QPushButton::clicked, this, &ClientOptionsDialog::Command2_Click);

    loadTransferValues();
}

ClientOptionsDialog::~ClientOptionsDialog() = default;

void ClientOptionsDialog::loadTransferValues()
{
    const OptionsTransfer &t = OptionsTransfer::global();
    selectOption(ioGroup(*m_ui), t.ClientOptions);
    showCheckValue(m_ui->chkConnectOnVirtualPort, t.ConnectOnVirtualOpen);
}

void ClientOptionsDialog::accept()
{
    OptionsTransfer &t = OptionsTransfer::global();
    storeSelectedOption(ioGroup(*m_ui), t.ClientOptions);
    t.ConnectOnVirtualOpen = checkValue(m_ui->chkConnectOnVirtualPort);
    QDialog::accept();
}

void ClientOptionsDialog::Command2_Click()
{
    OptionsTransfer::global().ClientOptions = OptionsTransfer::kCancelled;
    reject();
}

void ClientOptionsDialog::keyPressEvent(QKeyEvent *event)
{
    // Esc presses OK here, not Cancel: a user leaving with Esc keeps the
    // edits.
    if (!handleDialogKey(this, event, m_ui->Command1))
        QDialog::keyPressEvent(event);
}

void showClientOptionsDialog(QWidget *parent)
{
    ClientOptionsDialog dialog(parent);
    dialog.exec();
}
