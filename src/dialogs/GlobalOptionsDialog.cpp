#include "GlobalOptionsDialog.h"
#include "ui_GlobalOptionsDialog.h"

#include "OptionControls.h"
#include "PacketSizeText.h"
#include "config/GlobalOptions.h"
#include "viewsupport/ApplyResourceStrings.h"
#include "viewsupport/UserDialogs.h"

namespace {

// The list texts are not localised; the stored values are the entry indexes,
// which the watchdog and the echo time-out turn into times.
QStringList packetSizeEntries()
{
    return { QStringLiteral("50"), QStringLiteral("100"), QStringLiteral("200"), QStringLiteral("500"),
             QStringLiteral("1000"), QStringLiteral("2000"), QStringLiteral("4000") };
}

QStringList pingFrequencyEntries()
{
    QStringList entries { QStringLiteral(".5 Second"), QStringLiteral("1 Second") };
    for (int seconds = 5; seconds <= 60; seconds += 5)
        entries << QStringLiteral("%1 Seconds").arg(seconds);
    return entries;
}

QStringList pingTimeoutEntries()
{
    QStringList entries;
    for (int ms = 100; ms <= 2000; ms += 100)
        entries << QStringLiteral("%1 ms").arg(ms);
    return entries;
}

// An index the list has no entry for shows as no selection rather than as
// some other entry.
void selectListIndex(QComboBox *list, int index)
{
    list->setCurrentIndex(index >= 0 && index < list->count() ? index : -1);
}

// The list can only lose its "no selection" state by the user picking an
// entry, so an unknown stored index survives an OK that did not touch it.
void storeListIndex(const QComboBox *list, qint32 &target)
{
    if (list->currentIndex() >= 0)
        target = list->currentIndex();
}

// Programs on Linux carry no extension, so a filter by extension would hide
// nearly all of them.
const QString kProgramFilter = QStringLiteral("All Files (*)");

} // namespace

GlobalOptionsDialog::GlobalOptionsDialog(const GlobalOptions &options, QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::GlobalOptionsDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);
    // Inline completion would turn a typed "1" into "100" when OK follows.
    m_ui->Combo1->setCompleter(nullptr);

    connect(m_ui->Command1, &QPushButton::clicked, this, &GlobalOptionsDialog::Command1_Click);
    connect(m_ui->Command2, &QPushButton::clicked, this, &GlobalOptionsDialog::accept);
    connect(m_ui->Command3, &QPushButton::clicked, this, &GlobalOptionsDialog::reject);

    fillLists();
    showOptions(options);
}

GlobalOptionsDialog::~GlobalOptionsDialog() = default;

void GlobalOptionsDialog::fillLists()
{
    m_ui->Combo1->addItems(packetSizeEntries());
    m_ui->Combo2->addItems(pingFrequencyEntries());
    m_ui->Combo3->addItems(pingTimeoutEntries());
}

void GlobalOptionsDialog::showOptions(const GlobalOptions &o)
{
    m_options = o;
    m_ui->Text1->setText(o.OnErrorRunApp);
    showCheckValue(m_ui->Check1, o.LogErrors);
    // As text, so a size that is not in the list shows as it was typed.
    m_ui->Combo1->setEditText(QString::number(o.PacketSize));
    selectListIndex(m_ui->Combo2, o.PingFrequency);
    selectListIndex(m_ui->Combo3, o.PingTimeout);
    showCheckValue(m_ui->Check2, o.PingEnabled);
    showCheckValue(m_ui->chkLoadWithWindows, o.LoadWithWindows);
}

GlobalOptions GlobalOptionsDialog::options() const
{
    GlobalOptions o = m_options;
    o.OnErrorRunApp = m_ui->Text1->text();
    o.LogErrors = checkValue(m_ui->Check1);
    o.PacketSize = packetSizeFromText(m_ui->Combo1->currentText());
    o.PingEnabled = checkValue(m_ui->Check2);
    storeListIndex(m_ui->Combo2, o.PingFrequency);
    storeListIndex(m_ui->Combo3, o.PingTimeout);
    o.LoadWithWindows = checkValue(m_ui->chkLoadWithWindows);
    return o;
}

void GlobalOptionsDialog::Command1_Click()
{
    UserDialogs::FileRequest request;
    request.parent = this;
    request.filter = kProgramFilter;
    const std::optional<QString> file = UserDialogs::askFileName(request);
    // The path goes in as returned: no quotes, even around blanks.
    if (file && !file->isEmpty())
        m_ui->Text1->setText(*file);
}

std::optional<GlobalOptions> showGlobalOptionsDialog(QWidget *parent, const GlobalOptions &options)
{
    GlobalOptionsDialog dialog(options, parent);
    if (dialog.exec() != QDialog::Accepted)
        return std::nullopt;
    return dialog.options();
}
