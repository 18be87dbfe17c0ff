#pragma once

#include <QObject>
#include <QSocketNotifier>
#include <QTimer>

// Takes the connections waiting on a listening socket (TCP or local) and
// hands each out as its descriptor.
//
// Accepting fails when the process runs out of descriptors or the kernel
// out of memory. The waiting connection then stays queued and keeps the
// listening socket readable, so watching on would spin the event loop. So
// the waiting connections are turned away instead (one descriptor is kept
// spare to make room for accepting and closing them: clients learn at once
// rather than hang), and the socket is left unwatched for a short back-off.
// Accepting resumes by itself as soon as descriptors are free again.
class ConnectionAcceptor : public QObject
{
    Q_OBJECT
public:
    static constexpr int kBackOffMs = 250;

    // Does not own the listening descriptor, which must be non-blocking;
    // starts disabled.
    explicit ConnectionAcceptor(int listeningDescriptor, QObject *parent = nullptr);

    void setEnabled(bool enabled);
    bool isEnabled() const { return m_enabled; }

Q_SIGNALS:
    // A new connection, non-blocking and close-on-exec; the receiver owns it.
    void accepted(qintptr descriptor);
    // Accepting failed (errno). Raised once per episode: the episode ends
    // with the next connection accepted. Handlers may use the descriptor
    // freed for it, e.g. to write a log line.
    void acceptFailed(int errorNumber);

private:
    void acceptWaiting();
    void turnAwayWaiting(int errorNumber);

    int m_listener;
    QSocketNotifier m_notifier;
    QTimer m_backOff;
    bool m_enabled = false;
    bool m_failing = false;
};
