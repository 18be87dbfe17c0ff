#pragma once

#include <QDialog>

#include <memory>

class QKeyEvent;
namespace Ui { class ServerOptionsDialog; }

// frmServerOptions: edits the routing options of a session in TCP server
// role (multiple clients, inbound network data, inbound serial data). It
// takes and returns the values through the options transfer variables
// AllowMultiConnect, ServerTCPOptions and ServerSerialOptions:
// - accept() (OK, Enter on OK) stores the edited values;
// - Cancel (also Esc) stores OptionsTransfer::kCancelled in AllowMultiConnect
//   and leaves the other two as they were;
// - reject() alone (closing by the window frame) stores nothing, so the
//   values passed in come back unchanged.
class ServerOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit ServerOptionsDialog(QWidget *parent = nullptr);
    ~ServerOptionsDialog() override;

    void accept() override;

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    void loadTransferValues();
    void Command2_Click();

    std::unique_ptr<Ui::ServerOptionsDialog> m_ui;
};

// Shows the dialog modally and returns once it is closed; the session window
// reads the outcome from the transfer variables.
void showServerOptionsDialog(QWidget *parent);
