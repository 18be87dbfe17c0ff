#pragma once

#include "config/GlobalOptions.h"

#include <QDialog>

#include <memory>
#include <optional>

namespace Ui { class GlobalOptionsDialog; }

// frmOptions: edits the application-wide options (packet size, start at
// login, error log, error program, ping watchdog), given as a value. OK (or
// Enter: OK is the default button) accepts; Cancel, Esc and closing by the
// window frame reject. It writes nothing to disk: the values reach the
// configuration file, and the autostart entry, with the next save.
//
// A ping frequency or time-out index outside its list (a hand-edited
// configuration file) shows as no selection and is kept on OK unless the
// user picks an entry.
class GlobalOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit GlobalOptionsDialog(const GlobalOptions &options, QWidget *parent = nullptr);
    ~GlobalOptionsDialog() override;

    // The options as edited (the password as given).
    GlobalOptions options() const;

private:
    void fillLists();
    void showOptions(const GlobalOptions &options);
    void Command1_Click();

    std::unique_ptr<Ui::GlobalOptionsDialog> m_ui;
    GlobalOptions m_options;
};

// Shows the dialog modally; the edited options, or nothing when cancelled.
std::optional<GlobalOptions> showGlobalOptionsDialog(QWidget *parent, const GlobalOptions &options);
