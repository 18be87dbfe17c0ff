#pragma once

#include <QDialog>

#include <memory>

namespace Ui { class AboutDialog; }

// frmAbout: what the program is and which version runs, a button that starts
// the desktop's system information tool, and the project's web address.
// Localised from the string table; the version line and the description
// stay English. OK, Enter and Esc close it.
class AboutDialog : public QDialog
{
    Q_OBJECT
public:
    explicit AboutDialog(QWidget *parent = nullptr);
    ~AboutDialog() override;

    // Starts the system information tool, or shows message 5073 when none
    // is installed or it fails to start; the About box stays open.
    void StartSysInfo();

    // "Velloca  Version <major>.<minor>.<patch>" for the version built in.
    static QString versionLine();

protected:
    bool eventFilter(QObject *watched, QEvent *event) override;

private:
    void Label4_Click();

    std::unique_ptr<Ui::AboutDialog> m_ui;
};

// Shows the About box modally and returns once it is closed.
void showAboutDialog(QWidget *parent);
