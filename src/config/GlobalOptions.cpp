#include "GlobalOptions.h"

GlobalOptions &GlobalOptions::global()
{
    static GlobalOptions options;
    return options;
}

int PingTimeoutMs = 500;
