#include "ServerOptionsDialog.h"
#include "ui_ServerOptionsDialog.h"

#include "DialogKeys.h"
#include "OptionControls.h"
#include "config/OptionsTransfer.h"
#include "viewsupport/ApplyResourceStrings.h"

#include <QKeyEvent>

namespace {

OptionGroup tcpGroup(const Ui::ServerOptionsDialog &ui)
{
    return { ui.OptionTCP_0, ui.OptionTCP_1, ui.OptionTCP_2 };
}

OptionGroup serialGroup(const Ui::ServerOptionsDialog &ui)
{
    return { ui.OptionSerial_0, ui.OptionSerial_1, ui.OptionSerial_2 };
}

} // namespace

ServerOptionsDialog::ServerOptionsDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::ServerOptionsDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);

    connect(m_ui->Command1, &QPushButton::clicked, this, &ServerOptionsDialog::accept);
    connect(m_ui->Command2, &QPushButton::clicked, this, &ServerOptionsDialog::Command2_Click);

    loadTransferValues();
}

ServerOptionsDialog::~ServerOptionsDialog() = default;

void ServerOptionsDialog::loadTransferValues()
{
    const OptionsTransfer &t = OptionsTransfer::global();
    showCheckValue(m_ui->chkMultiClients, t.AllowMultiConnect);
    selectOption(serialGroup(*m_ui), t.ServerSerialOptions);
    selectOption(tcpGroup(*m_ui), t.ServerTCPOptions);
}

void ServerOptionsDialog::accept()
{
    OptionsTransfer &t = OptionsTransfer::global();
    t.AllowMultiConnect = checkValue(m_ui->chkMultiClients);
    storeSelectedOption(tcpGroup(*m_ui), t.ServerTCPOptions);
    storeSelectedOption(serialGroup(*m_ui), t.ServerSerialOptions);
    QDialog::accept();
}

void ServerOptionsDialog::Command2_Click()
{
    OptionsTransfer::global().AllowMultiConnect = OptionsTransfer::kCancelled;
    reject();
}

void ServerOptionsDialog::keyPressEvent(QKeyEvent *event)
{
    if (!handleDialogKey(this, event, m_ui->Command2))
        QDialog::keyPressEvent(event);
}

void showServerOptionsDialog(QWidget *parent)
{
    ServerOptionsDialog dialog(parent);
    dialog.exec();
}
