#pragma once

#include <QString>

class IcmpEcho;

// The ping routines of the network tools on top of IcmpEcho, bound to the
// application-wide echo time-out PingTimeoutMs.

// Sets PingTimeoutMs from the global option PingTimeout, as every ping does
// first, and returns it.
int refreshPingTimeoutMs();

// The status as display text, "11010   [IP Request Timed Out]"; a status
// equal to the current PingTimeoutMs reads "[Ping Timeout]".
QString GetStatusCode(int status);

// Starts one echo request with the data text (in the local 8-bit encoding)
// and the time-out of the global option; returns the request id whose
// IcmpEcho::finished() carries the reply. The address must be dotted
// decimal: a host name, or empty text, ends with -1 and sends nothing.
quint32 Ping(IcmpEcho &echo, const QString &address, const QString &data);
