#include "ConnectionAcceptor.h"

#include <QPointer>

#include <cerrno>
#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

// At most this many connections are taken in one go, so a flood of clients
// cannot keep the event loop from everything else.
constexpr int kMaxAcceptsPerWakeUp = 64;

// Shared by every listening socket of the process; -1 while lent out.
int g_spareDescriptor = -1;

void openSpareDescriptor()
{
    if (g_spareDescriptor < 0)
        g_spareDescriptor = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
}

// Failures that concern only the one connection (it was reset while
// waiting, or its network went away): the next may well succeed.
bool concernsOneConnection(int error)
{
    switch (error) {
    case EINTR:
    case ECONNABORTED:
    case EPROTO:
    case EPERM:
    case ENETDOWN:
    case ENETUNREACH:
    case EHOSTDOWN:
    case EHOSTUNREACH:
    case ENONET:
    case ENOPROTOOPT:
    case EOPNOTSUPP:
        return true;
    default:
        return false;
    }
}

} // namespace

ConnectionAcceptor::ConnectionAcceptor(int listeningDescriptor, QObject *parent)
    : QObject(parent)
    , m_listener(listeningDescriptor)
    , m_notifier(listeningDescriptor, QSocketNotifier::Read)
{
    openSpareDescriptor();
    m_notifier.setEnabled(false);
    connect(&m_notifier, &QSocketNotifier::activated, this, &ConnectionAcceptor::acceptWaiting);
    m_backOff.setSingleShot(true);
    m_backOff.setInterval(kBackOffMs);
    connect(&m_backOff, &QTimer::timeout, this, [this] { m_notifier.setEnabled(m_enabled); });
}

void ConnectionAcceptor::setEnabled(bool enabled)
{
    m_enabled = enabled;
    m_notifier.setEnabled(enabled && !m_backOff.isActive());
}

void ConnectionAcceptor::acceptWaiting()
{
    const QPointer<ConnectionAcceptor> alive(this);
    for (int i = 0; i < kMaxAcceptsPerWakeUp && alive && m_enabled; ++i) {
        const int descriptor = ::accept4(m_listener, nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
        if (descriptor >= 0) {
            m_failing = false;
            Q_EMIT accepted(descriptor);
            continue;
        }
        if (errno == EAGAIN || errno == EWOULDBLOCK)
            return;
        if (!concernsOneConnection(errno)) {
            turnAwayWaiting(errno);
            return;
        }
    }
}

void ConnectionAcceptor::turnAwayWaiting(int errorNumber)
{
    m_notifier.setEnabled(false);
    m_backOff.start();
    if (g_spareDescriptor >= 0) {
        ::close(g_spareDescriptor);
        g_spareDescriptor = -1;
        for (int turnedAway = 0; turnedAway < kMaxAcceptsPerWakeUp; ++turnedAway) {
            const int descriptor = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC);
            if (descriptor < 0 && !concernsOneConnection(errno))
                break;
            if (descriptor >= 0)
                ::close(descriptor);
        }
    }
    if (!m_failing) {
        m_failing = true;
        Q_EMIT acceptFailed(errorNumber);
    }
    openSpareDescriptor();
}
