#include "AboutDialog.h"
#include "ui_AboutDialog.h"

#include "SystemInfoTool.h"
#include "viewsupport/ApplyResourceStrings.h"
#include "localisation/ResourceStrings.h"
#include "viewsupport/UserDialogs.h"

#include <QDesktopServices>
#include <QGuiApplication>
#include <QMouseEvent>
#include <QUrl>
#include <QVersionNumber>

namespace {

const QString kAppTitle = QStringLiteral("Velloca");

// Shown in Label4 and opened on a click. A placeholder until the project
// publishes a home page of its own.
const QString kWebAddress = QStringLiteral("https://velloca.example.org/");

} // namespace

AboutDialog::AboutDialog(QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui::AboutDialog>())
{
    m_ui->setupUi(this);
    ApplyResourceStrings(this);
    setModal(true);

    m_ui->lblTitle->setText(LoadResString(5058));
    m_ui->Label4->setText(kWebAddress);
    // Replaces the caption 5059 that the string table put there.
    m_ui->lblVersion->setText(versionLine());

    m_ui->Label4->installEventFilter(this);
    connect(m_ui->cmdOK, &QPushButton::clicked, this, &AboutDialog::accept);
    connect(m_ui->cmdSysInfo, &QPushButton::clicked, this, &AboutDialog::StartSysInfo);
}

AboutDialog::~AboutDialog() = default;

QString AboutDialog::versionLine()
{
    // Normalised through QVersionNumber so that "01.0.4" reads "1.0.4" and a
    // missing part reads 0.
    const QVersionNumber version = QVersionNumber::fromString(QStringLiteral(VELLOCA_VERSION));
    return QStringLiteral("%1  Version %2.%3.%4")
        .arg(kAppTitle)
        .arg(version.majorVersion())
        .arg(version.minorVersion())
        .arg(version.microVersion());
}

void AboutDialog::StartSysInfo()
{
    if (!startSystemInfoTool())
        UserDialogs::showMessage({ this, LoadResString(5073), kAppTitle, UserDialogs::Icon::None });
}

void AboutDialog::Label4_Click()
{
    // The desktop may take a moment to hand the address to a browser; its
    // answer does not matter to us.
    QGuiApplication::setOverrideCursor(Qt::WaitCursor);
    QDesktopServices::openUrl(QUrl(kWebAddress));
    QGuiApplication::restoreOverrideCursor();
}

bool AboutDialog::eventFilter(QObject *watched, QEvent *event)
{
    if (watched == m_ui->Label4 && event->type() == QEvent::MouseButtonRelease
        && static_cast<QMouseEvent *>(event)->button() == Qt::LeftButton) {
        Label4_Click();
        return true;
    }
    return QDialog::eventFilter(watched, event);
}

void showAboutDialog(QWidget *parent)
{
    AboutDialog dialog(parent);
    dialog.exec();
}
