#include "PingCode.h"

#include "config/GlobalOptions.h"
#include "platform/IcmpEcho.h"
#include "platform/IcmpStatus.h"

int refreshPingTimeoutMs()
{
    PingTimeoutMs = PingTimeoutMsFor(GlobalOptions::global().PingTimeout);
    return PingTimeoutMs;
}

QString GetStatusCode(int status)
{
    return GetStatusCode(status, PingTimeoutMs);
}

quint32 Ping(IcmpEcho &echo, const QString &address, const QString &data)
{
    return echo.send(address, data.toLocal8Bit(), refreshPingTimeoutMs());
}
