#pragma once

#include <QDialog>

#include <memory>

class IcmpEcho;
struct EchoReply;
namespace Ui { class PingDialog; }

// frmPing: sends one ICMP echo request to a host (dotted address or name)
// and shows the reply's status, address, round-trip time, size and data.
// The name lookup and the echo run in the background while the dialog
// stays responsive; Ping is disabled until the result is shown, Cancel
// closes the dialog at any time and drops what is still pending.
class PingDialog : public QDialog
{
    Q_OBJECT
public:
    explicit PingDialog(QWidget *parent = nullptr);
    ~PingDialog() override;

    // True from a Ping click until its result is shown.
    bool isBusy() const;

private:
    void Command1_Click();
    void sendTo(const QString &address, const QString &data);
    void showResults(quint32 requestId, const EchoReply &reply);
    void clearResults();
    void setBusy(bool busy);

    std::unique_ptr<Ui::PingDialog> m_ui;
    IcmpEcho *m_echo = nullptr;
    quint32 m_pendingRequest = 0;
    bool m_busy = false;
};

// Shows the dialog modally and returns once it is closed.
void showPingDialog(QWidget *parent);
