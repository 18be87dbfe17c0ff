#pragma once

class QFont;
class QWidget;

// Localises a form from the string table, first thing when it loads: the
// form's title, a font suited to the language, and the caption, tooltip or
// column text of every control that names a string identifier. Nothing here
// fails visibly: an identifier the table lacks, or a text that is not a
// number, leaves that element as designed.
//
// Where the identifiers stand:
// - the form: dynamic property "tag", the number alone → window title;
// - QLabel: property "tag", a leading number → font and text;
// - menu items (QAction in a QMenuBar or QMenu of the form, submenus
//   included): the action's text, a leading number → text; menus keep their
//   font;
// - QTabBar (also the one inside a QTabWidget): font; each tab's tabData(),
//   the number alone → tab text; each tab's tooltip, the number alone → tab
//   tooltip;
// - QToolBar: font; each action's tooltip (and that of a QToolButton without
//   an action), the number alone → tooltip;
// - QTreeView, QTableView (QTreeWidget, QTableWidget) and a standalone
//   QHeaderView: font; each header section's data for Qt::UserRole (for
//   QTreeWidget/QTableWidget the header item's data(Qt::UserRole)), the number
//   alone → header text;
// - QComboBox: font only;
// - any other control: property "tag", a leading number → font, then the
//   caption where the kind has one (button text, group box title, dock
//   widget title; a text box keeps its text); then its tooltip, a leading
//   number → tooltip.
// A leading number is read after leading blanks, like a decimal reader does
// ("  5030 Ping" is 5030); "the number alone" is a trimmed text of decimal
// digits only. Only numbers above 0 count.
//
// The form's own font becomes the localised one (family of string 20, 8
// points, not bold); controls that are not localised keep the font they had,
// as do embedded MDI sub-windows, which are forms of their own. Child windows
// (dialogs) are left to localise themselves.
void ApplyResourceStrings(QWidget *form);

// The localised font for a form designed with `designed`. A form that sets
// it before creating its controls lets them start with it, so no control
// has to take a font change later.
QFont localisedFont(const QFont &designed);
