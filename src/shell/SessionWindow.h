#pragma once

#include "config/SessionOptions.h"

#include <QWidget>

#include <functional>
#include <memory>
#include <optional>

class QComboBox;
class SessionEngine;
namespace Ui { class SessionWindow; }

// The window of one session: shows and edits the engine's settings, shows
// its status lines and lamps, and locks its settings while it runs. All
// behaviour lives in the engine; this class only binds controls to it.
class SessionWindow : public QWidget
{
    Q_OBJECT
public:
    explicit SessionWindow(SessionEngine *engine, QWidget *parent = nullptr);
    ~SessionWindow() override;

    SessionEngine *engine() const { return m_engine; }


    // The option dialogs are shown through these hooks: they take the
    // session's options and return them edited, or nothing when cancelled.
    std::function<std::optional<SessionOptions>(bool server, const SessionOptions &options)> showIOOptionsDialog;
    std::function<std::optional<SessionOptions>(const SessionOptions &options)> showLoginOptionsDialog;

    // Handlers of the window's buttons, public so that other windows and
    // tests can invoke them like a click.
    void Command2_Click();
    void Command3_Click();
    void btnLogin_Click();
    void Frame2_DblClick();

protected:
    bool eventFilter(QObject *watched, QEvent *event) override;

private:
    void fillLists();
    void showConfiguration();
    void bindSettings();
    void bindEngine();
    void TCPOption_Click(int index);
    void PortNumber_Change(const QString &text);
    void Combo2_Click(int index);
    void Combo2_EditTextChanged(const QString &text);
    void applyLock(bool locked);

    std::unique_ptr<Ui::SessionWindow> m_ui;
    SessionEngine *m_engine;
};
