#pragma once

#include <QDialog>

#include <memory>

namespace Ui { class ResolveDialog; }

// frmResolve: turns a host name into the dotted text of its first IPv4
// address. The lookup runs in the background while the dialog stays
// responsive; Resolve is disabled until it ends, Cancel closes the dialog
// at any time. A name that does not resolve is reported in a message box
// and leaves the address box as it was.
class ResolveDialog : public QDialog
{
    Q_OBJECT
public:
    explicit ResolveDialog(QWidget *parent = nullptr);
    ~ResolveDialog() override;

    // True from a Resolve click until its lookup has ended.
    bool isBusy() const;

private:
    void Command1_Click();
    void showAddress(const QString &hostName, const QString &address);
    void setBusy(bool busy);

    std::unique_ptr<Ui::ResolveDialog> m_ui;
    bool m_busy = false;
};

// Shows the dialog modally and returns once it is closed.
void showResolveDialog(QWidget *parent);
