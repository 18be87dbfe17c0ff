#include "ResolveDialog.h"

#include "BusyForm.h"
#include "ui_ResolveDialog.h"

#include "viewsupport/ApplyResourceStrings.h"
#include "localisation/ResourceStrings.h"
#include "platform/IcmpEcho.h"
#include "viewsupport/UserDialogs.h"

#include <QPushButton>

ResolveDialog::ResolveDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::ResolveDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    m_ui->txtHostName->setToolTip(LoadResString(5124));
    setModal(true);

    connect(m_ui->Command1, &QPushButton::clicked, this, &ResolveDialog::Command1_Click);
    // Command3 (Help...) is hidden and has no action.
    connect(m_ui->Command4, &QPushButton::clicked, this, &ResolveDialog::reject);
}

ResolveDialog::~ResolveDialog() = default;

bool ResolveDialog::isBusy() const
{
    return m_busy;
}

void ResolveDialog::Command1_Click()
{
    if (m_busy)
        return;
    setBusy(true);
    // An empty name goes to the lookup as well; it simply does not resolve.
    const QString hostName = m_ui->txtHostName->text();
    GetIPFromHostName(hostName, this,
                      [this, hostName](const QString &address) { showAddress(hostName, address); });
}

void ResolveDialog::showAddress(const QString &hostName, const QString &address)
{
    setBusy(false);
    if (!address.isEmpty()) {
        m_ui->txtIPAddress->setText(address);
        return;
    }
    UserDialogs::showMessage({ this, LoadResString(5115) + QLatin1Char(' ') + hostName,
                               QStringLiteral("Velloca"), UserDialogs::Icon::None });
}

void ResolveDialog::setBusy(bool busy)
{
    m_busy = busy;
    showBusy(this, m_ui->Command1, busy);
}

void showResolveDialog(QWidget *parent)
{
    ResolveDialog dialog(parent);
    dialog.exec();
}
