#include "IcmpStatus.h"

#include <QtGlobal>

#include <cerrno>
#include <climits>

namespace {

struct StatusName
{
    int status;
    const char *name;
};

constexpr StatusName kStatusNames[] = {
    { IpStatus::kSuccess, "IP Success" },
    { IpStatus::kBadIpFormat, "Bad IP Format" },
    { IpStatus::kBufferTooSmall, "IP Buffer too_small" },
    { IpStatus::kDestNetUnreachable, "IP Dest Net Unreachable" },
    { IpStatus::kDestHostUnreachable, "IP Dest Host Unreachable" },
    { IpStatus::kDestProtocolUnreachable, "IP Dest Prot Unreachable" },
    { IpStatus::kDestPortUnreachable, "IP Dest Port Unreachable" },
    { IpStatus::kNoResources, "IP No Resources" },
    { IpStatus::kBadOption, "IP Bad Option" },
    { IpStatus::kHardwareError, "IP Hardware Error" },
    { IpStatus::kPacketTooBig, "IP Packet Too Big" },
    { IpStatus::kRequestTimedOut, "IP Request Timed Out" },
    { IpStatus::kBadRequest, "IP Bad Request" },
    { IpStatus::kBadRoute, "IP Bad Route" },
    { IpStatus::kTtlExpiredTransit, "IP TTL Expired Transit" },
    { IpStatus::kTtlExpiredReassembly, "IP TTL Expired Reassembly" },
    { IpStatus::kParameterProblem, "IP Parameter Problem" },
    { IpStatus::kSourceQuench, "IP Source Quench" },
    { IpStatus::kOptionTooBig, "IP Option Too Big" },
    { IpStatus::kBadDestination, "IP Bad Destination" },
    { IpStatus::kAddressDeleted, "IP Address Deleted" },
    { IpStatus::kSpecMtuChange, "IP Spec MTU Change" },
    { IpStatus::kMtuChanged, "IP MTU Changed" },
    { IpStatus::kUnload, "IP Unload" },
    { IpStatus::kAddressAdded, "IP Address Added" },
    { IpStatus::kGeneralFailure, "IP General Failure" },
    { IpStatus::kPending, "IP Pending" },
};

// ICMP message types and the codes of "destination unreachable" we tell apart.
constexpr int kIcmpDestUnreachable = 3;
constexpr int kIcmpSourceQuench = 4;
constexpr int kIcmpTimeExceeded = 11;
constexpr int kIcmpParameterProblem = 12;

} // namespace

QString GetStatusCode(int status, int currentPingTimeoutMs)
{
    QString name;
    for (const StatusName &entry : kStatusNames) {
        if (entry.status == status) {
            name = QLatin1String(entry.name);
            break;
        }
    }
    if (name.isEmpty())
        name = status == currentPingTimeoutMs ? QStringLiteral("Ping Timeout")
                                              : QStringLiteral("Unknown Message Returned");
    return QString::number(status) + QLatin1String("   [") + name + QLatin1Char(']');
}

int PingTimeoutMsFor(int pingTimeoutIndex)
{
    const qint64 timeoutMs = 100 * (qint64(pingTimeoutIndex) + 1);
    if (timeoutMs < 1)
        return 500;
    return int(qMin<qint64>(timeoutMs, INT_MAX));
}

int statusForIcmpError(int type, int code)
{
    switch (type) {
    case kIcmpDestUnreachable:
        switch (code) {
        case 0: // network
        case 6: // network unknown
        case 9: // network administratively prohibited
        case 11: // network unreachable for the type of service
            return IpStatus::kDestNetUnreachable;
        case 2: return IpStatus::kDestProtocolUnreachable;
        case 3: return IpStatus::kDestPortUnreachable;
        case 4: return IpStatus::kPacketTooBig; // fragmentation needed
        case 5: return IpStatus::kBadRoute; // source route failed
        default: return IpStatus::kDestHostUnreachable;
        }
    case kIcmpSourceQuench: return IpStatus::kSourceQuench;
    case kIcmpTimeExceeded:
        return code == 1 ? IpStatus::kTtlExpiredReassembly : IpStatus::kTtlExpiredTransit;
    case kIcmpParameterProblem: return IpStatus::kParameterProblem;
    default: return IpStatus::kGeneralFailure;
    }
}

int statusForLocalError(int error)
{
    switch (error) {
    case ENETUNREACH:
    case ENETDOWN:
        return IpStatus::kDestNetUnreachable;
    case EHOSTUNREACH:
    case EHOSTDOWN:
        return IpStatus::kDestHostUnreachable;
    case EMSGSIZE: return IpStatus::kPacketTooBig;
    case ENOBUFS:
    case ENOMEM:
        return IpStatus::kNoResources;
    case EPROTO: return IpStatus::kParameterProblem;
    default: return IpStatus::kGeneralFailure;
    }
}
