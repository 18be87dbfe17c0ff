#pragma once

#include <QString>

// Which clients of a server session a direction serves: all of them, none
// (the data is dropped on purpose), or only the first connected one.
enum class ClientRouting { AllClients = 0, Ignore = 1, FirstClient = 2 };
// What a client session carries: both ways, or one direction dropped.
enum class ClientDirection { BothWays = 0, NoSerialOutput = 1, NoNetworkOutput = 2 };

// The stored number of a routing option as its meaning; a number no option
// has means the first option, as it always did.
template <typename Option>
Option routingOption(int stored)
{
    return stored == 1 || stored == 2 ? Option(stored) : Option(0);
}

// Run-time state of one session, alive as long as the session.
struct SessionRecord
{
    bool UseUDP = false;
    int TCPOption = 0; // 0 client, 1 server
    QString UserPrompt;
    QString UserPromptResponse;
    QString PasswordPrompt;
    QString PasswordPromptResponse;
    int AllowMultiConnect = 1;
    int ServerSerialOptions = 0; // ClientRouting of serial data
    int ServerTCPOptions = 0;    // ClientRouting of network data
    int ClientOptions = 0;       // ClientDirection
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
