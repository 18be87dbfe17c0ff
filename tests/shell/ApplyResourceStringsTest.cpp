#include "support/UiLanguageScope.h"

#include "viewsupport/ApplyResourceStrings.h"

#include <QComboBox>
#include <QGroupBox>
#include <QLabel>
#include <QLineEdit>
#include <QMainWindow>
#include <QMdiArea>
#include <QMdiSubWindow>
#include <QMenu>
#include <QMenuBar>
#include <QPushButton>
#include <QTabWidget>
#include <QToolBar>
#include <QTreeWidget>
#include <QVBoxLayout>

#include <gtest/gtest.h>

#include <memory>

namespace {

// A form the way the designer leaves it: identifiers in tags, menu texts and
// tooltips, designed English captions and a designed font everywhere.
struct TestForm
{
    std::unique_ptr<QMainWindow> window = std::make_unique<QMainWindow>();
    QFont designedFont;
    QLabel *taggedLabel;
    QLabel *plainLabel;
    QLabel *numberFirstLabel;
    QGroupBox *frame;
    QPushButton *button;
    QLineEdit *textBox;
    QComboBox *combo;
    QMenu *fileMenu;
    QAction *newAction;
    QAction *plainAction;
    QMenu *trayMenu;
    QTabWidget *tabs;
    QToolBar *toolBar;
    QAction *toolAction;
    QTreeWidget *listView;

    TestForm()
    {
        designedFont = QFont(QStringLiteral("DejaVu Serif"), 13);
        designedFont.setBold(true);
        window->setFont(designedFont);
        window->setWindowTitle(QStringLiteral("Designed title"));
        window->setProperty("tag", QStringLiteral("5029"));

        fileMenu = window->menuBar()->addMenu(QStringLiteral("2102"));
        newAction = fileMenu->addAction(QStringLiteral("2103"));
        fileMenu->addSeparator();
        plainAction = fileMenu->addAction(QStringLiteral("Plain"));
        QMenu *submenu = fileMenu->addMenu(QStringLiteral("2110"));
        submenu->addAction(QStringLiteral(" 2111"));
        trayMenu = new QMenu(window.get());
        trayMenu->addAction(QStringLiteral("2130"));

        toolBar = window->addToolBar(QStringLiteral("tools"));
        toolAction = toolBar->addAction(QStringLiteral("ping"));
        toolAction->setToolTip(QStringLiteral("5122"));

        auto *central = new QWidget;
        auto *layout = new QVBoxLayout(central);
        taggedLabel = addTagged<QLabel>(layout, QStringLiteral("Designed label"), QStringLiteral("5030"));
        plainLabel = addTagged<QLabel>(layout, QStringLiteral("Untagged label"), QString());
        numberFirstLabel = addTagged<QLabel>(layout, QStringLiteral("x"), QStringLiteral("  5034 trailing"));
        frame = new QGroupBox(QStringLiteral("Designed frame"));
        frame->setProperty("tag", QStringLiteral("5033"));
        auto *frameLayout = new QVBoxLayout(frame);
        button = new QPushButton(QStringLiteral("Designed button"));
        button->setProperty("tag", QStringLiteral("5035"));
        frameLayout->addWidget(button);
        textBox = new QLineEdit(QStringLiteral("typed"));
        textBox->setToolTip(QStringLiteral("5123"));
        frameLayout->addWidget(textBox);
        layout->addWidget(frame);
        combo = new QComboBox;
        combo->addItems({ QStringLiteral("50"), QStringLiteral("100") });
        layout->addWidget(combo);

        tabs = new QTabWidget;
        tabs->addTab(new QWidget, QStringLiteral("Designed tab"));
        tabs->tabBar()->setTabData(0, QStringLiteral("5000"));
        tabs->setTabToolTip(0, QStringLiteral("5001"));
        tabs->addTab(new QWidget, QStringLiteral("Second tab"));
        tabs->tabBar()->setTabData(1, QStringLiteral("5000 x"));
        tabs->setTabToolTip(1, QStringLiteral("5001 x"));
        layout->addWidget(tabs);

        listView = new QTreeWidget;
        listView->setHeaderLabels({ QStringLiteral("Host"), QStringLiteral("Port") });
        listView->headerItem()->setData(0, Qt::UserRole, QStringLiteral("5104"));
        listView->headerItem()->setData(1, Qt::UserRole, QStringLiteral("9999"));
        layout->addWidget(listView);
        window->setCentralWidget(central);
    }

    template<typename Widget>
    static Widget *addTagged(QVBoxLayout *layout, const QString &caption, const QString &tag)
    {
        auto *widget = new Widget(caption);
        if (!tag.isNull())
            widget->setProperty("tag", tag);
        layout->addWidget(widget);
        return widget;
    }
};

void expectLocalisedFont(const QWidget *widget, const QString &family)
{
    SCOPED_TRACE(widget->metaObject()->className());
    EXPECT_EQ(widget->font().family(), family);
    EXPECT_EQ(widget->font().pointSize(), 8);
    EXPECT_FALSE(widget->font().bold());
}

void expectDesignedFont(const QWidget *widget, const QFont &designed)
{
    SCOPED_TRACE(widget->metaObject()->className());
    EXPECT_EQ(widget->font().family(), designed.family());
    EXPECT_EQ(widget->font().pointSize(), designed.pointSize());
    EXPECT_EQ(widget->font().bold(), designed.bold());
}

} // namespace

TEST(ApplyResourceStrings, EnglishFormGetsCaptionsTooltipsAndFont)
{
    UiLanguageScope english(UiLanguage::English);
    TestForm form;
    ApplyResourceStrings(form.window.get());

    const QString family = QStringLiteral("Ms Sans Serif");
    EXPECT_EQ(form.window->windowTitle(), QStringLiteral("Velloca Options"));
    expectLocalisedFont(form.window.get(), family);

    EXPECT_EQ(form.taggedLabel->text(), QStringLiteral("Max bytes per TCP/IP packet:"));
    expectLocalisedFont(form.taggedLabel, family);
    EXPECT_EQ(form.numberFirstLabel->text(), QStringLiteral("Command Line:"));
    EXPECT_EQ(form.plainLabel->text(), QStringLiteral("Untagged label"));
    expectDesignedFont(form.plainLabel, form.designedFont);

    EXPECT_EQ(form.frame->title(), QStringLiteral("Run external program when errors occur:"));
    expectLocalisedFont(form.frame, family);
    EXPECT_EQ(form.button->text(), QStringLiteral("Browse..."));
    expectLocalisedFont(form.button, family);
    // A text box has no caption: it keeps its text and font, only the tooltip is localised.
    EXPECT_EQ(form.textBox->text(), QStringLiteral("typed"));
    expectDesignedFont(form.textBox, form.designedFont);
    EXPECT_EQ(form.textBox->toolTip(),
              QStringLiteral("Enter the data string that you want to ping the computer with."));
    expectLocalisedFont(form.combo, family);
    EXPECT_EQ(form.combo->itemText(0), QStringLiteral("50"));

    EXPECT_EQ(form.fileMenu->title(), QStringLiteral("&File"));
    EXPECT_EQ(form.newAction->text(), QStringLiteral("&New"));
    EXPECT_EQ(form.plainAction->text(), QStringLiteral("Plain"));
    QMenu *submenu = form.fileMenu->actions().last()->menu();
    ASSERT_NE(submenu, nullptr);
    EXPECT_EQ(submenu->title(), QStringLiteral("&Window"));
    EXPECT_EQ(submenu->actions().first()->text(), QStringLiteral("&Cascade"));
    EXPECT_EQ(form.trayMenu->actions().first()->text(), QStringLiteral("&Open Velloca"));
    expectDesignedFont(form.window->menuBar(), form.designedFont);

    // Tab tags and tooltips must hold the number alone.
    QTabBar *tabBar = form.tabs->tabBar();
    EXPECT_EQ(tabBar->tabText(0), QStringLiteral("Serial Port"));
    EXPECT_EQ(tabBar->tabToolTip(0), QStringLiteral("TCP/IP Port"));
    EXPECT_EQ(tabBar->tabText(1), QStringLiteral("Second tab"));
    EXPECT_EQ(tabBar->tabToolTip(1), QStringLiteral("5001 x"));
    expectLocalisedFont(tabBar, family);

    EXPECT_EQ(form.toolAction->toolTip(),
              QStringLiteral("Enter the IP Address of the computer that you want to ping."));
    expectLocalisedFont(form.toolBar, family);

    EXPECT_EQ(form.listView->headerItem()->text(0), QStringLiteral("Remote Host IP Address"));
    EXPECT_EQ(form.listView->headerItem()->text(1), QStringLiteral("Port"));
    expectLocalisedFont(form.listView, family);
}

TEST(ApplyResourceStrings, JapaneseFormGetsJapaneseCaptionsAndGothicFont)
{
    UiLanguageScope japanese(UiLanguage::Japanese);
    TestForm form;
    ApplyResourceStrings(form.window.get());

    const QString family = QStringLiteral("Noto Sans CJK JP");
    EXPECT_EQ(form.window->windowTitle(), QStringLiteral("Velloca オプション"));
    expectLocalisedFont(form.window.get(), family);
    EXPECT_EQ(form.taggedLabel->text(), QStringLiteral("TCP/IP パケットあたりの最大バイト数:"));
    expectLocalisedFont(form.taggedLabel, family);
    EXPECT_EQ(form.button->text(), QStringLiteral("参照..."));
    expectLocalisedFont(form.button, family);
    expectLocalisedFont(form.frame, family);
    expectLocalisedFont(form.combo, family);
    EXPECT_EQ(form.fileMenu->title(), QStringLiteral("ファイル(&F)"));
    EXPECT_EQ(form.tabs->tabBar()->tabText(0), QStringLiteral("シリアル ポート"));
    EXPECT_EQ(form.plainLabel->text(), QStringLiteral("Untagged label"));
    expectDesignedFont(form.plainLabel, form.designedFont);
}

TEST(ApplyResourceStrings, MissingOrMalformedIdentifiersLeaveElementsAsDesigned)
{
    UiLanguageScope english(UiLanguage::English);
    TestForm form;
    // Not in the table; and a form tag must be the number alone.
    form.window->setProperty("tag", QStringLiteral("5060"));
    form.taggedLabel->setProperty("tag", QStringLiteral("abc"));
    form.numberFirstLabel->setProperty("tag", QStringLiteral("-5030"));
    form.button->setProperty("tag", QStringLiteral("4999"));
    form.newAction->setText(QStringLiteral("0"));
    form.textBox->setToolTip(QStringLiteral("Type here"));
    ApplyResourceStrings(form.window.get());

    EXPECT_EQ(form.window->windowTitle(), QStringLiteral("Designed title"));
    EXPECT_EQ(form.taggedLabel->text(), QStringLiteral("Designed label"));
    expectDesignedFont(form.taggedLabel, form.designedFont);
    EXPECT_EQ(form.numberFirstLabel->text(), QStringLiteral("x"));
    EXPECT_EQ(form.button->text(), QStringLiteral("Designed button"));
    EXPECT_EQ(form.newAction->text(), QStringLiteral("0"));
    EXPECT_EQ(form.textBox->toolTip(), QStringLiteral("Type here"));
    // The rest of the form is still localised.
    EXPECT_EQ(form.frame->title(), QStringLiteral("Run external program when errors occur:"));
    EXPECT_EQ(form.fileMenu->title(), QStringLiteral("&File"));

    form.window->setProperty("tag", QStringLiteral("5029 Options"));
    ApplyResourceStrings(form.window.get());
    EXPECT_EQ(form.window->windowTitle(), QStringLiteral("Designed title"));

    ApplyResourceStrings(nullptr);
}

TEST(ApplyResourceStrings, LeavesEmbeddedFormsToThemselves)
{
    UiLanguageScope english(UiLanguage::English);
    QMainWindow mainWindow;
    auto *area = new QMdiArea;
    mainWindow.setCentralWidget(area);
    auto *session = new QWidget;
    session->setProperty("tag", QStringLiteral("5119"));
    session->setWindowTitle(QStringLiteral("Session"));
    auto *sessionLabel = new QLabel(QStringLiteral("Designed"), session);
    sessionLabel->setProperty("tag", QStringLiteral("5090"));
    QMdiSubWindow *subWindow = area->addSubWindow(session);
    const QFont sessionFont = subWindow->font();

    ApplyResourceStrings(&mainWindow);

    EXPECT_EQ(sessionLabel->text(), QStringLiteral("Designed"));
    expectDesignedFont(sessionLabel, sessionFont);
    expectDesignedFont(subWindow, sessionFont);

    ApplyResourceStrings(session);
    EXPECT_EQ(session->windowTitle(), QStringLiteral("New"));
    EXPECT_EQ(sessionLabel->text(), QStringLiteral("COM Status:"));
}
