#include "ApplyResourceStrings.h"

#include "localisation/ResourceStrings.h"

#include <QAbstractButton>
#include <QAbstractItemModel>
#include <QAbstractSlider>
#include <QAbstractSpinBox>
#include <QAction>
#include <QCalendarWidget>
#include <QComboBox>
#include <QDockWidget>
#include <QGroupBox>
#include <QHeaderView>
#include <QLabel>
#include <QLineEdit>
#include <QMdiSubWindow>
#include <QMenu>
#include <QMenuBar>
#include <QPlainTextEdit>
#include <QSet>
#include <QTabBar>
#include <QTableView>
#include <QTextEdit>
#include <QToolBar>
#include <QToolButton>
#include <QTreeView>

#include <algorithm>
#include <optional>

namespace {

constexpr int kFontFamilyId = 20;
constexpr int kFontPointSize = 8;
// Any number past the 16-bit identifiers; keeps long digit runs from
// overflowing while still naming no string.
constexpr int kBeyondAnyId = 1'000'000;

bool isAsciiDigit(QChar c)
{
    return c >= u'0' && c <= u'9';
}

int clampedDecimal(QStringView digits)
{
    int value = 0;
    for (QChar c : digits)
        value = std::min(value * 10 + (c.unicode() - u'0'), kBeyondAnyId);
    return value;
}

// The number a text starts with, blanks skipped, sign allowed; 0 for none.
int leadingNumber(const QString &text)
{
    qsizetype pos = 0;
    while (pos < text.size() && text.at(pos).isSpace())
        ++pos;
    bool negative = false;
    if (pos < text.size() && (text.at(pos) == u'+' || text.at(pos) == u'-')) {
        negative = text.at(pos) == u'-';
        ++pos;
    }
    const qsizetype start = pos;
    while (pos < text.size() && isAsciiDigit(text.at(pos)))
        ++pos;
    const int value = clampedDecimal(QStringView(text).sliced(start, pos - start));
    return negative ? -value : value;
}

// The number when the trimmed text is nothing but decimal digits; 0 otherwise.
int numberAlone(const QString &text)
{
    const QString trimmed = text.trimmed();
    if (trimmed.isEmpty() || !std::all_of(trimmed.begin(), trimmed.end(), isAsciiDigit))
        return 0;
    return clampedDecimal(trimmed);
}

std::optional<QString> resourceText(int id)
{
    if (id <= 0 || !hasResString(id))
        return std::nullopt;
    return LoadResString(id);
}

QString tagOf(const QObject *object)
{
    return object->property("tag").toString();
}

// Widgets whose child widgets are parts of them (a combo box's line edit, a
// view's viewport and header) rather than controls of the form.
bool isCompoundControl(const QWidget *widget)
{
    return qobject_cast<const QComboBox *>(widget) || qobject_cast<const QAbstractSpinBox *>(widget)
        || qobject_cast<const QAbstractItemView *>(widget) || qobject_cast<const QTextEdit *>(widget)
        || qobject_cast<const QPlainTextEdit *>(widget) || qobject_cast<const QTabBar *>(widget)
        || qobject_cast<const QToolBar *>(widget) || qobject_cast<const QMenuBar *>(widget)
        || qobject_cast<const QLineEdit *>(widget) || qobject_cast<const QAbstractButton *>(widget)
        || qobject_cast<const QCalendarWidget *>(widget) || qobject_cast<const QAbstractSlider *>(widget);
}

class FormLocaliser
{
public:
    explicit FormLocaliser(QWidget *form) : m_form(form) { collect(form); }

    void run()
    {
        if (const std::optional<QString> title = resourceText(numberAlone(tagOf(m_form))))
            m_form->setWindowTitle(*title);

        m_font = localisedFont(m_form->font());
        m_form->setFont(m_font);

        for (const Pinned &control : std::as_const(m_controls))
            localise(control.widget);
        for (QMenu *menu : std::as_const(m_menus))
            localiseMenuActions({ menu->menuAction() });

        keepDesignedFonts();
        giveFonts();
    }

private:
    struct Pinned
    {
        QWidget *widget;
        QFont designedFont;
    };

    void collect(QWidget *parent)
    {
        for (QObject *child : parent->children()) {
            auto *widget = qobject_cast<QWidget *>(child);
            if (!widget)
                continue;
            if (auto *menu = qobject_cast<QMenu *>(widget)) {
                m_menus.append(menu);
                continue;
            }
            if (widget->isWindow())
                continue;
            if (qobject_cast<QMdiSubWindow *>(widget)) {
                m_otherForms.append({ widget, widget->font() });
                continue;
            }
            m_controls.append({ widget, widget->font() });
            if (!isCompoundControl(widget))
                collect(widget);
        }
    }

    void giveFont(QWidget *widget)
    {
        m_givenFont.insert(widget);
    }

    // Runs after keepDesignedFonts, so nothing changes a font after this. A
    // control that already shows the font is left alone: setting it again
    // would still send a font change, and a combo box answers that by
    // building its pop-up list.
    void giveFonts()
    {
        for (const Pinned &control : std::as_const(m_controls)) {
            if (m_givenFont.contains(control.widget) && control.widget->font() != m_font)
                control.widget->setFont(m_font);
        }
    }

    void localise(QWidget *widget)
    {
        if (auto *label = qobject_cast<QLabel *>(widget))
            localiseLabel(label);
        else if (auto *menuBar = qobject_cast<QMenuBar *>(widget))
            localiseMenuActions(menuBar->actions());
        else if (auto *tabBar = qobject_cast<QTabBar *>(widget))
            localiseTabBar(tabBar);
        else if (auto *toolBar = qobject_cast<QToolBar *>(widget))
            localiseToolBar(toolBar);
        else if (auto *header = qobject_cast<QHeaderView *>(widget))
            localiseListView(header, header->model(), header->orientation());
        else if (qobject_cast<QTreeView *>(widget) || qobject_cast<QTableView *>(widget))
            localiseListView(widget, static_cast<QAbstractItemView *>(widget)->model(), Qt::Horizontal);
        else if (qobject_cast<QComboBox *>(widget))
            giveFont(widget);
        else
            localiseOtherControl(widget);
    }

    void localiseLabel(QLabel *label)
    {
        const int id = leadingNumber(tagOf(label));
        if (id <= 0)
            return;
        giveFont(label);
        if (const std::optional<QString> text = resourceText(id))
            label->setText(*text);
    }

    // An action can sit in several menus; each is localised once, so a text
    // that itself starts with a number is never taken for an identifier.
    void localiseMenuActions(const QList<QAction *> &actions)
    {
        for (QAction *action : actions) {
            if (m_doneActions.contains(action))
                continue;
            m_doneActions.insert(action);
            if (const std::optional<QString> text = resourceText(leadingNumber(action->text())))
                action->setText(*text);
            if (QMenu *submenu = action->menu())
                localiseMenuActions(submenu->actions());
        }
    }

    void localiseTabBar(QTabBar *tabBar)
    {
        giveFont(tabBar);
        for (int index = 0; index < tabBar->count(); ++index) {
            if (const std::optional<QString> text = resourceText(numberAlone(tabBar->tabData(index).toString())))
                tabBar->setTabText(index, *text);
            if (const std::optional<QString> tip = resourceText(numberAlone(tabBar->tabToolTip(index))))
                tabBar->setTabToolTip(index, *tip);
        }
    }

    void localiseToolBar(QToolBar *toolBar)
    {
        giveFont(toolBar);
        // Buttons made for actions follow their action's tooltip.
        for (QAction *action : toolBar->actions()) {
            if (const std::optional<QString> tip = resourceText(numberAlone(action->toolTip())))
                action->setToolTip(*tip);
        }
        for (QToolButton *button : toolBar->findChildren<QToolButton *>()) {
            if (button->defaultAction())
                continue;
            if (const std::optional<QString> tip = resourceText(numberAlone(button->toolTip())))
                button->setToolTip(*tip);
        }
    }

    void localiseListView(QWidget *view, QAbstractItemModel *model, Qt::Orientation orientation)
    {
        giveFont(view);
        if (!model)
            return;
        const int sections = orientation == Qt::Horizontal ? model->columnCount() : model->rowCount();
        for (int section = 0; section < sections; ++section) {
            const QString tag = model->headerData(section, orientation, Qt::UserRole).toString();
            if (const std::optional<QString> text = resourceText(numberAlone(tag)))
                model->setHeaderData(section, orientation, *text, Qt::DisplayRole);
        }
    }

    void localiseOtherControl(QWidget *widget)
    {
        if (const int id = leadingNumber(tagOf(widget)); id > 0) {
            giveFont(widget);
            if (const std::optional<QString> caption = resourceText(id))
                setCaption(widget, *caption);
        }
        if (const std::optional<QString> tip = resourceText(leadingNumber(widget->toolTip())))
            widget->setToolTip(*tip);
    }

    static void setCaption(QWidget *widget, const QString &caption)
    {
        if (auto *button = qobject_cast<QAbstractButton *>(widget))
            button->setText(caption);
        else if (auto *groupBox = qobject_cast<QGroupBox *>(widget))
            groupBox->setTitle(caption);
        else if (auto *dock = qobject_cast<QDockWidget *>(widget))
            dock->setWindowTitle(caption);
    }

    // Qt passes a parent's font on to its children; a control that was not
    // localised must look as designed, so it gets its former font back.
    void keepDesignedFonts()
    {
        for (const QList<Pinned> *list : { &m_controls, &m_otherForms }) {
            for (const Pinned &control : *list) {
                if (m_givenFont.contains(control.widget))
                    continue;
                // Safe to leave: a font of its own, or an inherited one that
                // giving the localised font to a parent cannot change.
                const bool ownFont = control.widget->testAttribute(Qt::WA_SetFont);
                if (control.widget->font() == control.designedFont && (ownFont || control.designedFont == m_font))
                    continue;
                // An inherited font carries no resolved properties, and
                // setting it as is would just inherit again.
                QFont designed = control.designedFont;
                designed.setResolveMask(QFont::AllPropertiesResolved);
                control.widget->setFont(designed);
            }
        }
    }

    QWidget *m_form;
    QFont m_font;
    QList<Pinned> m_controls;   // pre-order: parents before their children
    QList<Pinned> m_otherForms;
    QList<QMenu *> m_menus;
    QSet<QWidget *> m_givenFont;
    QSet<QAction *> m_doneActions;
};

} // namespace

QFont localisedFont(const QFont &designed)
{
    QFont font = designed;
    if (const std::optional<QString> family = resourceText(kFontFamilyId))
        font.setFamily(*family);
    // String 21 names a Windows character set. Qt chooses glyphs by writing
    // system through font fallback, so the character set has no counterpart
    // here: Japanese text renders with the family above or its fallback.
    font.setPointSize(kFontPointSize);
    font.setBold(false);
    return font;
}

void ApplyResourceStrings(QWidget *form)
{
    if (!form)
        return;
    FormLocaliser(form).run();
}
