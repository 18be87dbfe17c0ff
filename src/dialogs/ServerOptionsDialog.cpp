#include "ServerOptionsDialog.h"
#include "ui_ServerOptionsDialog.h"

#include "DialogKeys.h"
#include "OptionControls.h"
#include "config/SessionOptions.h"
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

ServerOptionsDialog::ServerOptionsDialog(const SessionOptions &options, QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::ServerOptionsDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);

    connect(m_ui->Command1, &QPushButton::clicked, this, &ServerOptionsDialog::accept);
    connect(m_ui->Command2, &QPushButton::clicked, this, &ServerOptionsDialog::reject);

    m_options = options;
    showCheckValue(m_ui->chkMultiClients, options.AllowMultiConnect);
    selectOption(serialGroup(*m_ui), options.ServerSerialOptions);
    selectOption(tcpGroup(*m_ui), options.ServerTCPOptions);
}

ServerOptionsDialog::~ServerOptionsDialog() = default;

SessionOptions ServerOptionsDialog::options() const
{
    SessionOptions options = m_options;
    options.AllowMultiConnect = checkValue(m_ui->chkMultiClients);
    storeSelectedOption(tcpGroup(*m_ui), options.ServerTCPOptions);
    storeSelectedOption(serialGroup(*m_ui), options.ServerSerialOptions);
    return options;
}

void ServerOptionsDialog::keyPressEvent(QKeyEvent *event)
{
    if (!handleDialogKey(this, event, m_ui->Command2))
        QDialog::keyPressEvent(event);
}

std::optional<SessionOptions> showServerOptionsDialog(QWidget *parent, const SessionOptions &options)
{
    ServerOptionsDialog dialog(options, parent);
    if (dialog.exec() != QDialog::Accepted)
        return std::nullopt;
    return dialog.options();
}
