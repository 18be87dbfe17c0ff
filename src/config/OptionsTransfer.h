#pragma once

#include <QString>

// Application-wide values through which the I/O and login option dialogs
// and the configuration loader and writer exchange one session's routing
// options and login texts. A session copies them in and out with
// UpdateStatus() and Getstatus().
struct OptionsTransfer
{
    // Marks a cancelled I/O options dialog in AllowMultiConnect / ClientOptions.
    static constexpr int kCancelled = -1;

    int AllowMultiConnect = 0;
    int ServerSerialOptions = 0;
    int ServerTCPOptions = 0;
    int ClientOptions = 0;
    int ConnectOnVirtualOpen = 0;
    QString UserPrompt;
    QString UserPromptResponse;
    QString PasswordPrompt;
    QString PasswordPromptResponse;
    int LoginCancel = 0;

    static OptionsTransfer &global();
};
