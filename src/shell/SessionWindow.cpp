#include "SessionWindow.h"
#include "ui_SessionWindow.h"

#include "config/ConfigurationFile.h"
#include "config/GlobalOptions.h"
#include "localisation/ResourceStrings.h"
#include "platform/LocalAddresses.h"
#include "platform/SocketMember.h"
#include "session/NumberText.h"
#include "session/SessionEngine.h"
#include "viewsupport/ApplyResourceStrings.h"
#include "viewsupport/UserDialogs.h"

#include <QCoreApplication>
#include <QEvent>
#include <QStringListModel>

namespace {

constexpr int kHighestPort = 65535;

void fillFromIds(QComboBox *box, const auto &ids)
{
    for (int id : ids)
        box->addItem(LoadResString(id));
}

// The connector list is the same 257 entries in every session, in the one
// language of the program's life, and is never edited (no insertion), so all
// sessions share one model instead of each holding 257 items of its own.
QStringListModel *connectorModel()
{
    static QStringListModel *model = [] {
        QStringList names;
        for (int n = 0; n < SessionLists::kConnectorCount; ++n)
            names << SessionLists::connectorName(n);
        return new QStringListModel(names, QCoreApplication::instance());
    }();
    return model;
}

} // namespace

SessionWindow::SessionWindow(SessionEngine *engine, QWidget *parent)
    : QWidget(parent), m_ui(std::make_unique<Ui::SessionWindow>()), m_engine(engine)
{
    // The controls start with the language's font: a combo box given a font
    // afterwards builds its pop-up list at once, in every session.
    setFont(localisedFont(font()));
    m_ui->setupUi(this);
    layout()->setSizeConstraint(QLayout::SetFixedSize);
    // The editable boxes are sized by a fixed text length, not by measuring
    // every entry: the connector list alone has 257, and programs with
    // hundreds of sessions would spend their start-up measuring them. The
    // short lists keep Qt's sizing by content; a size policy would build
    // their pop-up lists at once, over 10 KiB each in every session.
    for (QComboBox *box : { m_ui->Combo2, m_ui->LocalIP }) {
        box->setSizeAdjustPolicy(QComboBox::AdjustToMinimumContentsLengthWithIcon);
        box->setMinimumContentsLength(box == m_ui->LocalIP ? 15 : 8);
    }

    ApplyResourceStrings(this);
    PingTimeoutMs = 1000;
    fillLists();
    m_ui->LocalIP->addItems(localIPv4Addresses());
    showConfiguration();
    bindSettings();
    bindEngine();
    m_ui->Frame2->installEventFilter(this);
}

SessionWindow::~SessionWindow() = default;

void SessionWindow::fillLists()
{
    m_ui->Combo2->setModel(connectorModel());
    m_ui->Combo2->setCurrentIndex(0);
    m_ui->Combo1_0->addItems(SessionLists::kBaudRates);
    m_ui->Combo1_0->setCurrentIndex(6);
    fillFromIds(m_ui->Combo1_1, SessionLists::kParityIds);
    m_ui->Combo1_1->setCurrentIndex(0);
    m_ui->Combo1_2->addItems(SessionLists::kDataBits);
    m_ui->Combo1_2->setCurrentIndex(3);
    m_ui->Combo1_3->addItems(SessionLists::kStopBits);
    m_ui->Combo1_3->setCurrentIndex(0);
    fillFromIds(m_ui->Combo1_4, SessionLists::kFlowControlIds);
    m_ui->Combo1_4->setCurrentIndex(0);
    m_ui->Combo1_5->addItems(SessionLists::kBufferSizes);
    m_ui->Combo1_5->setCurrentIndex(2);
}

void SessionWindow::showConfiguration()
{
    const SessionSettings &s = m_engine->settings();
    auto select = [](QComboBox *box, int index) {
        if (index >= 0 && index < box->count())
            box->setCurrentIndex(index);
    };
    select(m_ui->Combo2, s.Connector);
    select(m_ui->Combo1_0, s.BaudRate);
    select(m_ui->Combo1_1, s.Parity);
    select(m_ui->Combo1_2, s.Databits);
    select(m_ui->Combo1_3, s.Stopbits);
    select(m_ui->Combo1_4, s.FlowControl);
    select(m_ui->Combo1_5, s.BufferSize);
    m_ui->BufferSerData->setChecked(s.BufferSerialData == 1);
    m_ui->chkVPort->setChecked(s.CreateVirtualPort == 1);
    m_ui->chkUDP->setChecked(s.UseUDP == 1);
    m_ui->WaitForCr->setChecked(s.WaitForCr == 1);
    m_ui->LocalIP->setEditText(s.LocalIP);
    m_ui->IPAddress->setText(s.IPAddress);
    m_ui->PortNumber->setText(s.PortNumber);
    m_ui->txtTimeoutValue->setText(s.TimeoutValue);
    (s.TCPOption == 0 ? m_ui->TCPOption_0 : m_ui->TCPOption_1)->setChecked(true);
    TCPOption_Click(s.TCPOption == 0 ? 0 : 1);
    applyLock(m_engine->settingsLocked());
}

void SessionWindow::bindSettings()
{
    auto bindList = [this](QComboBox *box, int SessionSettings::*field) {
        connect(box, &QComboBox::currentIndexChanged, this,
                [this, field](int index) { m_engine->settings().*field = index; });
    };
    bindList(m_ui->Combo1_0, &SessionSettings::BaudRate);
    bindList(m_ui->Combo1_1, &SessionSettings::Parity);
    bindList(m_ui->Combo1_2, &SessionSettings::Databits);
    bindList(m_ui->Combo1_3, &SessionSettings::Stopbits);
    bindList(m_ui->Combo1_4, &SessionSettings::FlowControl);
    bindList(m_ui->Combo1_5, &SessionSettings::BufferSize);

    connect(m_ui->Combo2, &QComboBox::activated, this, &SessionWindow::Combo2_Click);
    connect(m_ui->Combo2, &QComboBox::editTextChanged, this, &SessionWindow::Combo2_EditTextChanged);

    auto bindCheck = [this](QAbstractButton *box, int SessionSettings::*field) {
        connect(box, &QAbstractButton::toggled, this,
                [this, field](bool on) { m_engine->settings().*field = on ? 1 : 0; });
    };
    bindCheck(m_ui->BufferSerData, &SessionSettings::BufferSerialData);
    bindCheck(m_ui->chkVPort, &SessionSettings::CreateVirtualPort);
    bindCheck(m_ui->chkUDP, &SessionSettings::UseUDP);
    bindCheck(m_ui->WaitForCr, &SessionSettings::WaitForCr);
    bindCheck(m_ui->TCPOption_1, &SessionSettings::TCPOption);
    connect(m_ui->TCPOption_0, &QRadioButton::toggled, this, [this](bool on) {
        if (on)
            TCPOption_Click(0);
    });
    connect(m_ui->TCPOption_1, &QRadioButton::toggled, this, [this](bool on) {
        if (on)
            TCPOption_Click(1);
    });

    auto bindText = [this](QLineEdit *edit, QString SessionSettings::*field) {
        connect(edit, &QLineEdit::textChanged, this,
                [this, field](const QString &text) { m_engine->settings().*field = text; });
    };
    bindText(m_ui->IPAddress, &SessionSettings::IPAddress);
    bindText(m_ui->PortNumber, &SessionSettings::PortNumber);
    bindText(m_ui->txtTimeoutValue, &SessionSettings::TimeoutValue);
    // Only the user's typing is checked: a loaded configuration with a bad
    // port must not stop an unattended start-up on a box nobody can click.
    connect(m_ui->PortNumber, &QLineEdit::textEdited, this, &SessionWindow::PortNumber_Change);
    connect(m_ui->LocalIP, &QComboBox::currentTextChanged, this,
            [this](const QString &text) { m_engine->settings().LocalIP = text; });

    connect(m_ui->Command2, &QPushButton::clicked, this, &SessionWindow::Command2_Click);
    connect(m_ui->Command3, &QPushButton::clicked, this, &SessionWindow::Command3_Click);
    connect(m_ui->btnLogin, &QPushButton::clicked, this, &SessionWindow::btnLogin_Click);
}

void SessionWindow::bindEngine()
{
    auto showStatus = [this](int line, const QString &text) {
        (line == SessionEngine::ComLine ? m_ui->StatusBar1_0 : m_ui->StatusBar1_1)->setText(text);
    };
    showStatus(SessionEngine::ComLine, m_engine->statusLine(SessionEngine::ComLine));
    showStatus(SessionEngine::NetworkLine, m_engine->statusLine(SessionEngine::NetworkLine));
    connect(m_engine, &SessionEngine::statusLineChanged, this, showStatus);

    setWindowTitle(m_engine->caption());
    connect(m_engine, &SessionEngine::captionChanged, this, &QWidget::setWindowTitle);

    m_ui->Command1->setText(m_engine->activateCaption());
    connect(m_engine, &SessionEngine::activateCaptionChanged, m_ui->Command1, &QPushButton::setText);

    auto showLamp = [this](int lamp, bool lit) {
        // Red while traffic was seen in the last ticks, green otherwise.
        (lamp == 0 ? m_ui->Shape1_0 : m_ui->Shape1_1)
            ->setStyleSheet(QStringLiteral("background-color: %1; border: 1px solid #404040; border-radius: 6px;")
                                .arg(lit ? QStringLiteral("#ff0000") : QStringLiteral("#00ff00")));
    };
    showLamp(0, m_engine->lampLit(0));
    showLamp(1, m_engine->lampLit(1));
    connect(m_engine, &SessionEngine::lampChanged, this, showLamp);
    connect(m_ui->Command1, &QPushButton::clicked, m_engine, &SessionEngine::Command1_Click);

    connect(m_engine, &SessionEngine::serialSettingsChanged, this, &SessionWindow::showConfiguration);
    connect(m_engine, &SessionEngine::configurationChanged, this, &SessionWindow::showConfiguration);
    connect(m_engine, &SessionEngine::settingsLockChanged, this, &SessionWindow::applyLock);
}

void SessionWindow::applyLock(bool locked)
{
    const QList<QWidget *> settingControls { m_ui->Combo2, m_ui->Combo1_0, m_ui->Combo1_1,
        m_ui->Combo1_2, m_ui->Combo1_3, m_ui->Combo1_4, m_ui->Combo1_5, m_ui->Command2,
        m_ui->TCPOption_0, m_ui->TCPOption_1, m_ui->IPAddress, m_ui->PortNumber, m_ui->LocalIP,
        m_ui->chkVPort, m_ui->chkUDP };
    for (QWidget *control : settingControls)
        control->setEnabled(!locked);
    // The server role stays unavailable on a machine without an address.
    if (!locked && m_engine->record().LocalIPAddress.isEmpty())
        m_ui->TCPOption_1->setEnabled(false);
}

void SessionWindow::TCPOption_Click(int index)
{
    const bool client = index == 0;
    m_ui->IPAddress->setVisible(client);
    m_ui->LocalIP->setVisible(!client);
    m_ui->Label2->setText(LoadResString(client ? 5104 : 5106));
    m_ui->Label3->setText(LoadResString(client ? 5105 : 5107));
}

void SessionWindow::PortNumber_Change(const QString &text)
{
    if (leadingNumber(text) <= kHighestPort)
        return;
    UserDialogs::showMessage({ this, LoadResString(5102), LoadResString(5103), UserDialogs::Icon::None });
}

void SessionWindow::Combo2_Click(int index)
{
    m_engine->setCommandTopic(m_ui->Combo2->itemText(index));
}

void SessionWindow::Combo2_EditTextChanged(const QString &text)
{
    // Typed text chooses the entry it names, matched as the box itself does
    // when it is left; text that names no entry leaves the session without
    // a connector, like a list whose selection was cleared.
    SessionSettings &s = m_engine->settings();
    s.ConnectorText = text;
    s.Connector = m_ui->Combo2->findText(text, Qt::MatchFixedString);
}

void SessionWindow::Command2_Click()
{
    if (!showIOOptionsDialog)
        return;
    const bool server = m_ui->TCPOption_1->isChecked();
    if (const auto edited = showIOOptionsDialog(server, m_engine->currentConfiguration().options))
        copySessionOptions(*edited, m_engine->record());
}

void SessionWindow::btnLogin_Click()
{
    if (!showLoginOptionsDialog)
        return;
    if (const auto edited = showLoginOptionsDialog(m_engine->currentConfiguration().options))
        copySessionOptions(*edited, m_engine->record());
}

void SessionWindow::Command3_Click()
{
    const auto answer = UserDialogs::askText({ this,
        QStringLiteral("Enter an optional name or description for this session window. The name that "
                       "you enter will appear in the title bar of the current session window and in the "
                       "Window list on the Velloca main menu."),
        QStringLiteral("Set Window Name"), m_engine->caption() });
    if (!answer || answer->isEmpty())
        return;
    m_engine->settings().SessionDescription = *answer;
    m_engine->setCaption(*answer);
}

void SessionWindow::Frame2_DblClick()
{
    if (m_ui->TCPOption_0->isChecked())
        return;
    QString text;
    for (const QString &address : m_engine->connectedClientAddresses())
        text += address + QStringLiteral("\r\n");
    UserDialogs::showMessage({ this, text, LoadResString(5101), UserDialogs::Icon::None });
}

bool SessionWindow::eventFilter(QObject *watched, QEvent *event)
{
    if (watched == m_ui->Frame2 && event->type() == QEvent::MouseButtonDblClick)
        Frame2_DblClick();
    return QWidget::eventFilter(watched, event);
}

