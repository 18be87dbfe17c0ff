#pragma once

#include <QHash>
#include <QObject>
#include <QString>

#include <functional>

class QSocketNotifier;

// One inotify instance for all virtual ports of the program: the kernel
// grants only a few instances per user (128 by default), far fewer than
// the ports a program may hold open.
class PtyOpenWatcher : public QObject
{
    Q_OBJECT
public:
    // Called with true when the device node was opened since the last call.
    using Handler = std::function<void(bool sawOpen)>;

    static PtyOpenWatcher &instance();

    // Watches opens and closes of the device node; returns a watch id, or
    // -1 when inotify is not available (the caller then polls instead).
    int watch(const QString &devicePath, Handler handler);
    void unwatch(int watchId);

private:
    PtyOpenWatcher();
    ~PtyOpenWatcher() override;
    void handleEvents();

    int m_inotify = -1;
    QSocketNotifier *m_notifier = nullptr;
    QHash<int, Handler> m_handlers;
};
