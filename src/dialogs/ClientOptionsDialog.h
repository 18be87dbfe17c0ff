#pragma once

#include <QDialog>

#include <memory>

class QKeyEvent;
namespace Ui { class ClientOptionsDialog; }

// frmClientOptions: edits the routing options of a session in TCP client
// role (which direction is switched off, and whether the network side
// follows the virtual COM port). It takes and returns the values through the
// options transfer variables ClientOptions and ConnectOnVirtualOpen:
// - accept() (OK, Enter on OK, and Esc: OK is this dialog's cancel button)
//   stores the edited values;
// - Cancel stores OptionsTransfer::kCancelled in ClientOptions and leaves
//   ConnectOnVirtualOpen as it was;
// - reject() alone (closing by the window frame) stores nothing, so the
//   values passed in come back unchanged.
class ClientOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit ClientOptionsDialog(QWidget *parent = nullptr);
    ~ClientOptionsDialog() override;

    void accept() override;

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    void loadTransferValues();
    void Command2_Click();

    std::unique_ptr<Ui::ClientOptionsDialog> m_ui;
};

// Shows the dialog modally and returns once it is closed; the session window
// reads the outcome from the transfer variables.
void showClientOptionsDialog(QWidget *parent);
