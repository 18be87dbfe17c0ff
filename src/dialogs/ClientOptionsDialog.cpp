#include "ClientOptionsDialog.h"
#include "ui_ClientOptionsDialog.h"

#include "DialogKeys.h"
#include "OptionControls.h"
#include "config/SessionOptions.h"
#include "viewsupport/ApplyResourceStrings.h"

#include <QKeyEvent>

namespace {

OptionGroup ioGroup(const Ui::ClientOptionsDialog &ui)
{
    return { ui.Option1_0, ui.Option1_1, ui.Option1_2 };
}

} // namespace

ClientOptionsDialog::ClientOptionsDialog(const SessionOptions &options, QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::ClientOptionsDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);

    connect(m_ui->Command1, &QPushButton::clicked, this, &ClientOptionsDialog::accept);
    connect(m_ui->Command2, &QPushButton::clicked, this, &ClientOptionsDialog::reject);

    m_options = options;
    selectOption(ioGroup(*m_ui), options.ClientOptions);
    showCheckValue(m_ui->chkConnectOnVirtualPort, options.ConnectOnVirtualOpen);
}

ClientOptionsDialog::~ClientOptionsDialog() = default;

SessionOptions ClientOptionsDialog::options() const
{
    SessionOptions options = m_options;
    storeSelectedOption(ioGroup(*m_ui), options.ClientOptions);
    options.ConnectOnVirtualOpen = checkValue(m_ui->chkConnectOnVirtualPort);
    return options;
}

void ClientOptionsDialog::keyPressEvent(QKeyEvent *event)
{
    // Esc presses OK here, not Cancel: a user leaving with Esc keeps the
    // edits.
    if (!handleDialogKey(this, event, m_ui->Command1))
        QDialog::keyPressEvent(event);
}

std::optional<SessionOptions> showClientOptionsDialog(QWidget *parent, const SessionOptions &options)
{
    ClientOptionsDialog dialog(options, parent);
    if (dialog.exec() != QDialog::Accepted)
        return std::nullopt;
    return dialog.options();
}
