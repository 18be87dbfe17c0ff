#pragma once

#include <QString>

// IP status codes of an ICMP echo request, numbered as the Windows ICMP
// interface numbers them, so logs and the ping dialog read the same on every
// platform. -1 and 0 are also the program's own results.
namespace IpStatus {
constexpr int kBadIpFormat = -1;
constexpr int kSuccess = 0;
constexpr int kBufferTooSmall = 11001;
constexpr int kDestNetUnreachable = 11002;
constexpr int kDestHostUnreachable = 11003;
constexpr int kDestProtocolUnreachable = 11004;
constexpr int kDestPortUnreachable = 11005;
constexpr int kNoResources = 11006;
constexpr int kBadOption = 11007;
constexpr int kHardwareError = 11008;
constexpr int kPacketTooBig = 11009;
constexpr int kRequestTimedOut = 11010;
constexpr int kBadRequest = 11011;
constexpr int kBadRoute = 11012;
constexpr int kTtlExpiredTransit = 11013;
constexpr int kTtlExpiredReassembly = 11014;
constexpr int kParameterProblem = 11015;
constexpr int kSourceQuench = 11016;
constexpr int kOptionTooBig = 11017;
constexpr int kBadDestination = 11018;
constexpr int kAddressDeleted = 11019;
constexpr int kSpecMtuChange = 11020;
constexpr int kMtuChanged = 11021;
constexpr int kUnload = 11022;
constexpr int kAddressAdded = 11023;
constexpr int kGeneralFailure = 11050;
constexpr int kPending = 11255;
} // namespace IpStatus

// The status as display text: the decimal status, three blanks and the
// status name in brackets, e.g. "11010   [IP Request Timed Out]". A status
// equal to currentPingTimeoutMs (the echo time-out last used) reads
// "[Ping Timeout]"; any other unknown value "[Unknown Message Returned]".
// Callers pass the application-wide PingTimeoutMs.
QString GetStatusCode(int status, int currentPingTimeoutMs);

// Echo time-out in milliseconds for an entry of the ping time-out list
// ("100 ms", "200 ms" … "2000 ms"): 100 × (index + 1), and 500 when that is
// below 1 (no entry selected). Larger indexes are not capped.
int PingTimeoutMsFor(int pingTimeoutIndex);

// The status for an ICMP error message (type, code) that came back instead
// of an echo reply.
int statusForIcmpError(int type, int code);

// The status for a local error (errno) of sending an echo request or one
// reported locally for it (e.g. EMSGSIZE, ENETUNREACH).
int statusForLocalError(int error);
