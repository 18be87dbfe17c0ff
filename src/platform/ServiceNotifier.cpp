#include "ServiceNotifier.h"

#include <systemd/sd-daemon.h>

bool notifyServiceReady()
{
    // The socket stays in the environment for the stopping message.
    return ::sd_notify(0, "READY=1") > 0;
}

bool notifyServiceStopping()
{
    return ::sd_notify(0, "STOPPING=1") > 0;
}
