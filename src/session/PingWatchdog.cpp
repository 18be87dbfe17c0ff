// The watchdog: after a period without data from the network, every
// connected peer of an active TCP session is pinged, and a peer that does
// not answer is treated as gone.
#include "SessionEngine.h"

#include "config/GlobalOptions.h"
#include "localisation/ResourceStrings.h"
#include "platform/IcmpStatus.h"
#include "platform/SocketMember.h"

#include <QPointer>

int SessionEngine::pingPeriodTicks(int pingFrequency)
{
    if (pingFrequency <= 0)
        return 9;
    if (pingFrequency == 1)
        return 18;
    return (pingFrequency - 1) * 91;
}

void SessionEngine::pingWatchdogStep()
{
    const GlobalOptions &options = GlobalOptions::global();
    if (!isActive() || m_record.UseUDP || options.PingEnabled == 0)
        return;
    if (++m_record.PingTicks < pingPeriodTicks(options.PingFrequency))
        return;
    m_record.PingTicks = 0;
    // The answers of the last pass are still out: a second pass would only
    // pile requests onto a slow network.
    if (m_pingsInFlight > 0)
        return;
    PingTimeoutMs = PingTimeoutMsFor(options.PingTimeout);
    for (const int i : connectedMembers()) {
        SocketMember *member = socket(i);
        const quint64 connection = m_connectionSerial.value(i);
        const int timeoutMs = PingTimeoutMs;
        ++m_pingsInFlight;
        m_platform.pingRemoteHost(member->remoteHostIP(), timeoutMs, this,
                                  [this, i, connection, timeoutMs](int status) {
            --m_pingsInFlight;
            if (status == 0)
                return;
            // A connection closed or replaced while the ping was out is
            // not the one that failed to answer.
            SocketMember *peer = socket(i);
            if (!peer || peer->state() != SocketMember::StateConnected || m_connectionSerial.value(i) != connection)
                return;
            handleClose(i);
            LogErrors(LoadResString(5108) + u' ' + GetStatusCode(status, timeoutMs));
        });
    }
}

void SessionEngine::noteNewConnection(int index)
{
    ++m_connectionSerial[index];
}
