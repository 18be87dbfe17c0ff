#pragma once

#include <QString>

// Run-time state of one session, alive as long as its window.
struct SessionRecord
{
    bool UseUDP = false;
    int TCPOption = 0; // 0 client, 1 server
    QString UserPrompt;
    QString UserPromptResponse;
    QString PasswordPrompt;
    QString PasswordPromptResponse;
    int AllowMultiConnect = 1;
    int ServerSerialOptions = 0; // 0 all clients, 1 none, 2 first client
    int ServerTCPOptions = 0;    // 0 all, 1 none, 2 first client
    int ClientOptions = 0;       // 0 two-way, 1 no serial output, 2 no network output
    int ConnectOnVirtualOpen = 1;
    int ComPortNumber = 0;
    QString LocalIPAddress;
    int MaxSocketIndex = 0;
    int ClientCount = 0;
    int PingTicks = 0;
    int FlushTicks = 0;
};

// The session record, the transfer values and a saved configuration name
// the nine routing and login options alike.
template <typename From, typename To>
void copySessionOptions(const From &from, To &to)
{
    to.AllowMultiConnect = from.AllowMultiConnect;
    to.ServerSerialOptions = from.ServerSerialOptions;
    to.ServerTCPOptions = from.ServerTCPOptions;
    to.ClientOptions = from.ClientOptions;
    to.ConnectOnVirtualOpen = from.ConnectOnVirtualOpen;
    to.UserPrompt = from.UserPrompt;
    to.UserPromptResponse = from.UserPromptResponse;
    to.PasswordPrompt = from.PasswordPrompt;
    to.PasswordPromptResponse = from.PasswordPromptResponse;
}
