#include "OptionsTransfer.h"

int PingTimeoutMs = 500;

OptionsTransfer &OptionsTransfer::global()
{
    static OptionsTransfer transfer;
    return transfer;
}
