#pragma once

#include <QString>

// One session's routing options and login texts, as a value: what the I/O
// and login option dialogs edit and what the configuration holds.
struct SessionOptions
{
    int AllowMultiConnect = 0;
    int ServerSerialOptions = 0;
    int ServerTCPOptions = 0;
    int ClientOptions = 0;
    int ConnectOnVirtualOpen = 0;
    QString UserPrompt;
    QString UserPromptResponse;
    QString PasswordPrompt;
    QString PasswordPromptResponse;
};
