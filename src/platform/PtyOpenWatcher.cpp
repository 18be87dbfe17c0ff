#include "PtyOpenWatcher.h"

#include <QFile>
#include <QSet>
#include <QSocketNotifier>

#include <sys/inotify.h>
#include <unistd.h>

PtyOpenWatcher &PtyOpenWatcher::instance()
{
    static PtyOpenWatcher watcher;
    return watcher;
}

PtyOpenWatcher::PtyOpenWatcher()
{
    m_inotify = ::inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
    if (m_inotify < 0)
        return;
    m_notifier = new QSocketNotifier(m_inotify, QSocketNotifier::Read, this);
    connect(m_notifier, &QSocketNotifier::activated, this, &PtyOpenWatcher::handleEvents);
}

PtyOpenWatcher::~PtyOpenWatcher()
{
    if (m_inotify >= 0)
        ::close(m_inotify);
}

int PtyOpenWatcher::watch(const QString &devicePath, Handler handler)
{
    if (m_inotify < 0)
        return -1;
    const int id = ::inotify_add_watch(m_inotify, QFile::encodeName(devicePath).constData(),
                                       IN_OPEN | IN_CLOSE_WRITE | IN_CLOSE_NOWRITE);
    if (id >= 0)
        m_handlers.insert(id, std::move(handler));
    return id;
}

void PtyOpenWatcher::unwatch(int watchId)
{
    if (watchId < 0 || !m_handlers.remove(watchId))
        return;
    ::inotify_rm_watch(m_inotify, watchId);
}

void PtyOpenWatcher::handleEvents()
{
    alignas(inotify_event) char buffer[4096];
    QHash<int, bool> touched; // watch id -> an open was among its events
    for (;;) {
        const ssize_t length = ::read(m_inotify, buffer, sizeof buffer);
        if (length <= 0)
            break;
        for (ssize_t offset = 0; offset < length;) {
            const auto *event = reinterpret_cast<const inotify_event *>(buffer + offset);
            touched[event->wd] = touched.value(event->wd) || (event->mask & IN_OPEN);
            offset += ssize_t(sizeof(inotify_event) + event->len);
        }
    }
    // A handler may unwatch itself or others: look each one up anew.
    for (auto it = touched.cbegin(); it != touched.cend(); ++it) {
        const auto handler = m_handlers.constFind(it.key());
        if (handler != m_handlers.cend())
            (*handler)(it.value());
    }
}
