#include "PingDialog.h"

#include "BusyForm.h"
#include "ui_PingDialog.h"

#include "PingCode.h"
#include "viewsupport/ApplyResourceStrings.h"
#include "localisation/ResourceStrings.h"
#include "platform/IcmpEcho.h"
#include "viewsupport/UserDialogs.h"

#include <QLineEdit>
#include <QPushButton>

PingDialog::PingDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::PingDialog>()), m_echo(new IcmpEcho(this))
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    m_ui->Text1->setToolTip(LoadResString(5122));
    m_ui->Text2->setToolTip(LoadResString(5123));
    setModal(true);

    connect(m_ui->Command1, &QPushButton::clicked, this, &PingDialog::Command1_Click);
    connect(m_ui->Command3, &QPushButton::clicked, this, &PingDialog::reject);
    connect(m_echo, &IcmpEcho::finished, this, &PingDialog::showResults);
}

PingDialog::~PingDialog() = default;

bool PingDialog::isBusy() const
{
    return m_busy;
}

void PingDialog::Command1_Click()
{
    if (m_busy)
        return;
    const QString host = m_ui->Text1->text();
    if (host.isEmpty()) {
        UserDialogs::showMessage({ this, LoadResString(5112), LoadResString(5113), UserDialogs::Icon::None });
        m_ui->Text1->setFocus();
        return;
    }
    clearResults();
    setBusy(true);
    // The data is taken now, so edits made while the name resolves do not
    // change what this click sends.
    const QString data = m_ui->Text2->text();
    // A name that does not resolve gives an empty address, which the echo
    // refuses as "-1   [Bad IP Format]".
    GetIPFromHostName(host, this, [this, data](const QString &address) { sendTo(address, data); });
}

void PingDialog::sendTo(const QString &address, const QString &data)
{
    m_pendingRequest = Ping(*m_echo, address, data);
}

void PingDialog::showResults(quint32 requestId, const EchoReply &reply)
{
    if (requestId != m_pendingRequest)
        return;
    m_pendingRequest = 0;
    m_ui->Text4_0->setText(GetStatusCode(reply.Status));
    m_ui->Text4_1->setText(QString::number(reply.addressDecimal()));
    m_ui->Text4_2->setText(QString::number(reply.RoundTripTime) + QLatin1String(" ms"));
    m_ui->Text4_3->setText(QString::number(reply.DataSize) + QLatin1String(" bytes"));
    if (!reply.Data.isEmpty() && reply.Data.at(0) != '\0')
        m_ui->Text4_4->setText(reply.dataText());
    setBusy(false);
}

void PingDialog::clearResults()
{
    for (QLineEdit *box : { m_ui->Text4_0, m_ui->Text4_1, m_ui->Text4_2, m_ui->Text4_3, m_ui->Text4_4 })
        box->clear();
}

void PingDialog::setBusy(bool busy)
{
    m_busy = busy;
    showBusy(this, m_ui->Command1, busy);
}

void showPingDialog(QWidget *parent)
{
    PingDialog dialog(parent);
    dialog.exec();
}
