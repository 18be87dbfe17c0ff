#pragma once

#include <QDialog>

#include <memory>

namespace Ui { class GlobalOptionsDialog; }

// frmOptions: edits the application-wide options in GlobalOptions::global()
// (packet size, start with the desktop session, error log, error program,
// ping watchdog). It reads them when it is created and writes them only on
// accept() (OK, or Enter: OK is the default button); Cancel, Esc and closing
// by the window frame change nothing. It writes nothing to disk: the values
// reach the configuration file, and the autostart entry, with the next
// configuration save.
//
// A ping frequency or time-out index outside its list (a hand-edited
// configuration file) shows as no selection and is kept on OK unless the
// user picks an entry.
class GlobalOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit GlobalOptionsDialog(QWidget *parent = nullptr);
    ~GlobalOptionsDialog() override;

    // Stores the edited values, then closes; QDialog::accepted() is emitted
    // after the options hold their new values.
    void accept() override;

private:
    void fillLists();
    void loadGlobalOptions();
    void Command1_Click();

    std::unique_ptr<Ui::GlobalOptionsDialog> m_ui;
};

// Shows the dialog modally and returns once it is closed.
void showGlobalOptionsDialog(QWidget *parent);
