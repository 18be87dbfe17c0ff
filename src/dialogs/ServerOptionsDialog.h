#pragma once

#include "config/SessionOptions.h"

#include <QDialog>

#include <memory>
#include <optional>

class QKeyEvent;
namespace Ui { class ServerOptionsDialog; }

// frmServerOptions: edits the routing options of a session in TCP server
// role (multiple clients, inbound network data, inbound serial data). OK
// (and Enter on OK) accepts; Cancel, Esc and closing by the window frame
// reject.
class ServerOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit ServerOptionsDialog(const SessionOptions &options, QWidget *parent = nullptr);
    ~ServerOptionsDialog() override;

    // The options as edited (those the dialog does not edit as given).
    SessionOptions options() const;

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    std::unique_ptr<Ui::ServerOptionsDialog> m_ui;
    SessionOptions m_options;
};

// Shows the dialog modally; the edited options, or nothing when cancelled.
std::optional<SessionOptions> showServerOptionsDialog(QWidget *parent, const SessionOptions &options);
