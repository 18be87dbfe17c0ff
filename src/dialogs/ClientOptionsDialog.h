#pragma once

#include "config/SessionOptions.h"

#include <QDialog>

#include <memory>
#include <optional>

class QKeyEvent;
namespace Ui { class ClientOptionsDialog; }

// frmClientOptions: edits the routing options of a session in TCP client
// role (inbound serial data, connect when the virtual port opens). OK and
// Esc accept; Cancel and closing by the window frame reject.
class ClientOptionsDialog : public QDialog
{
    Q_OBJECT
public:
    explicit ClientOptionsDialog(const SessionOptions &options, QWidget *parent = nullptr);
    ~ClientOptionsDialog() override;

    // The options as edited (those the dialog does not edit as given).
    SessionOptions options() const;

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    std::unique_ptr<Ui::ClientOptionsDialog> m_ui;
    SessionOptions m_options;
};

// Shows the dialog modally; the edited options, or nothing when cancelled.
std::optional<SessionOptions> showClientOptionsDialog(QWidget *parent, const SessionOptions &options);
