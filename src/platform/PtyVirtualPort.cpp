#include "PtyVirtualPort.h"

#include "PtyOpenWatcher.h"
#include "VirtualPortFolder.h"

#include <QFile>
#include <QPointer>
#include <QSocketNotifier>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

namespace {

constexpr int kAttachPollMs = 50;
// How long input left unread waits before it is announced again: often
// enough that a receiver that only reads on notices never stalls, rarely
// enough that an unread queue costs no CPU.
constexpr int kNoticeRetryMs = 50;
constexpr qint64 kReadChunk = 65536;

QString systemError(int error)
{
    return QString::fromLocal8Bit(std::strerror(error));
}

} // namespace

PtyVirtualPort::PtyVirtualPort(QString folder, QObject *parent)
    : VirtualPortControl(parent), m_folder(std::move(folder))
{
    m_attachPoll.setInterval(kAttachPollMs);
    connect(&m_attachPoll, &QTimer::timeout, this, [this] { checkAttachment(false); });
    m_noticeRetry.setSingleShot(true);
    m_noticeRetry.setInterval(kNoticeRetryMs);
    connect(&m_noticeRetry, &QTimer::timeout, this, &PtyVirtualPort::resumeNotices);
}

PtyVirtualPort::~PtyVirtualPort()
{
    removePort();
}

bool PtyVirtualPort::fail(const QString &reason)
{
    m_errorString = reason;
    return false;
}

bool PtyVirtualPort::createPort(const QString &name)
{
    removePort();
    m_errorString.clear();

    QString error;
    if (!makeVirtualPortFolder(m_folder, &error))
        return fail(error);
    if (!openMaster() || !makeSlaveRaw()) {
        const QString reason = m_errorString;
        closeEverything();
        return fail(QStringLiteral("Cannot create the virtual port %1: %2").arg(name, reason));
    }
    // Watch before the link exists, so no application can open the port
    // unseen.
    watchSlave();
    if (!placeVirtualPortLink(m_folder, name, m_slavePath, &error)) {
        closeEverything();
        return fail(error);
    }
    m_linkPath = m_folder + QLatin1Char('/') + name;
    checkAttachment(false);
    return true;
}

bool PtyVirtualPort::openMaster()
{
    m_master = ::posix_openpt(O_RDWR | O_NOCTTY | O_NONBLOCK);
    if (m_master < 0)
        return fail(QStringLiteral("no pseudo-terminal (%1)").arg(systemError(errno)));
    // A program started from here must not keep the pty alive.
    ::fcntl(m_master, F_SETFD, FD_CLOEXEC);
    char slaveName[128];
    if (::grantpt(m_master) != 0 || ::unlockpt(m_master) != 0
        || ::ptsname_r(m_master, slaveName, sizeof slaveName) != 0)
        return fail(QStringLiteral("pseudo-terminal not usable (%1)").arg(systemError(errno)));
    m_slavePath = QFile::decodeName(slaveName);

    m_masterNotifier = new QSocketNotifier(m_master, QSocketNotifier::Read, this);
    m_masterNotifier->setEnabled(false);
    connect(m_masterNotifier, &QSocketNotifier::activated, this, &PtyVirtualPort::handleMasterActivity);
    return true;
}

// The slave keeps its termios while the master stays open, so setting raw
// mode once through a short-lived descriptor holds for every application.
// Closing that descriptor also puts the master into the hang-up state that
// tells "nobody attached" from then on.
bool PtyVirtualPort::makeSlaveRaw()
{
    const int slave = ::open(QFile::encodeName(m_slavePath).constData(),
                             O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
    if (slave < 0)
        return fail(QStringLiteral("cannot open %1 (%2)").arg(m_slavePath, systemError(errno)));
    termios settings {};
    bool ok = ::tcgetattr(slave, &settings) == 0;
    if (ok) {
        ::cfmakeraw(&settings);
        ok = ::tcsetattr(slave, TCSANOW, &settings) == 0;
    }
    const int error = errno;
    ::close(slave);
    if (!ok)
        return fail(QStringLiteral("cannot set raw mode on %1 (%2)").arg(m_slavePath, systemError(error)));
    return true;
}

void PtyVirtualPort::watchSlave()
{
    m_watch = PtyOpenWatcher::instance().watch(m_slavePath, [this](bool sawOpen) { checkAttachment(sawOpen); });
    if (m_watch < 0)
        m_attachPoll.start();
}

bool PtyVirtualPort::removePort()
{
    if (m_master < 0)
        return true;
    if (!m_linkPath.isEmpty())
        removeVirtualPortLink(m_linkPath, m_slavePath);
    closeEverything();
    return true;
}

void PtyVirtualPort::closeEverything()
{
    // Deleted later: this may run inside one of their own signals.
    if (m_masterNotifier) {
        m_masterNotifier->setEnabled(false);
        m_masterNotifier->deleteLater();
    }
    m_masterNotifier = nullptr;
    PtyOpenWatcher::instance().unwatch(m_watch);
    if (m_master >= 0)
        ::close(m_master);
    m_watch = -1;
    m_master = -1;
    m_attachPoll.stop();
    m_noticeRetry.stop();
    m_opened = false;
    m_noticesPaused = false;
    m_leftover.clear();
    m_linkPath.clear();
    m_slavePath.clear();
}

void PtyVirtualPort::setStrictBaudrate(bool on)
{
    Q_UNUSED(on);
}

void PtyVirtualPort::setSignalEvents(bool on)
{
    Q_UNUSED(on);
}

bool PtyVirtualPort::slaveAttached() const
{
    if (m_master < 0)
        return false;
    pollfd state { m_master, POLLIN, 0 };
    if (::poll(&state, 1, 0) < 0)
        return false;
    return !(state.revents & POLLHUP);
}

void PtyVirtualPort::checkAttachment(bool sawOpen)
{
    if (m_master < 0)
        return;
    if (slaveAttached()) {
        if (!m_opened)
            markOpened();
        return;
    }
    if (m_opened) {
        markClosed();
        return;
    }
    if (sawOpen) {
        // Opened and closed again between two looks: still both happened.
        QPointer<PtyVirtualPort> alive(this);
        markOpened();
        if (alive && m_opened)
            markClosed();
    }
}

void PtyVirtualPort::markOpened()
{
    m_opened = true;
    m_noticesPaused = false;
    updateMasterNotifier();
    Q_EMIT openedOrClosed(true);
}

void PtyVirtualPort::markClosed()
{
    keepInputFromClosedSlave();
    m_opened = false;
    m_noticesPaused = false;
    m_noticeRetry.stop();
    // A hung-up master stays readable for ever: watching it now would spin.
    updateMasterNotifier();
    QPointer<PtyVirtualPort> alive(this);
    if (available() > 0)
        Q_EMIT dataReceived();
    if (!alive || m_master < 0)
        return;
    Q_EMIT openedOrClosed(false);
}

// The application's last bytes may still sit in the kernel's flip buffer,
// which FIONREAD does not count; a read of the master pushes them through
// before it reports EIO. Keeping them here makes available() honest.
void PtyVirtualPort::keepInputFromClosedSlave()
{
    char chunk[4096];
    for (;;) {
        const ssize_t length = ::read(m_master, chunk, sizeof chunk);
        if (length > 0)
            m_leftover.append(chunk, length);
        else if (length < 0 && errno == EINTR)
            continue;
        else
            break;
    }
}

void PtyVirtualPort::updateMasterNotifier()
{
    if (m_masterNotifier)
        m_masterNotifier->setEnabled(m_opened && !m_noticesPaused);
}

void PtyVirtualPort::handleMasterActivity()
{
    if (!slaveAttached()) {
        markClosed();
        return;
    }
    if (available() <= 0)
        return;
    m_readDuringNotice = false;
    QPointer<PtyVirtualPort> alive(this);
    Q_EMIT dataReceived();
    if (!alive || !m_opened)
        return;
    // A receiver that cannot take the data now (its buffer is full) leaves
    // it in the pty, which holds the application back; the notice is then
    // repeated at a calm pace instead of on every pass of the event loop.
    if (!m_readDuringNotice && available() > 0) {
        m_noticesPaused = true;
        updateMasterNotifier();
        m_noticeRetry.start();
    }
}

void PtyVirtualPort::resumeNotices()
{
    m_noticeRetry.stop();
    m_noticesPaused = false;
    updateMasterNotifier();
}

qint64 PtyVirtualPort::available() const
{
    qint64 count = m_leftover.size();
    int pending = 0;
    if (m_master >= 0 && ::ioctl(m_master, FIONREAD, &pending) == 0 && pending > 0)
        count += pending;
    return count;
}

QByteArray PtyVirtualPort::read(qint64 maxBytes)
{
    m_readDuringNotice = true;
    QByteArray result;
    if (maxBytes <= 0)
        return result;
    if (!m_leftover.isEmpty()) {
        const qint64 taken = qMin(maxBytes, qint64(m_leftover.size()));
        result = m_leftover.left(taken);
        m_leftover.remove(0, taken);
    }
    while (m_master >= 0 && result.size() < maxBytes) {
        const qint64 have = result.size();
        const qint64 wanted = qMin(maxBytes - have, kReadChunk);
        result.resize(have + wanted);
        const ssize_t length = ::read(m_master, result.data() + have, size_t(wanted));
        result.resize(have + qMax<ssize_t>(length, 0));
        if (length < 0 && errno == EINTR)
            continue;
        // EAGAIN: nothing more now; EIO: the application has closed.
        if (length <= 0)
            break;
    }
    if (m_noticesPaused)
        resumeNotices();
    return result;
}

qint64 PtyVirtualPort::write(const QByteArray &bytes)
{
    if (m_master < 0) {
        m_errorString = QStringLiteral("No virtual port exists to write to");
        return -1;
    }
    // Checked at the moment of writing, not from the last notice, so an
    // application that has just opened gets everything from now on.
    if (!slaveAttached())
        return bytes.size();
    qint64 done = 0;
    while (done < bytes.size()) {
        const ssize_t length = ::write(m_master, bytes.constData() + done, size_t(bytes.size() - done));
        if (length > 0) {
            done += length;
            continue;
        }
        if (length < 0 && errno == EINTR)
            continue;
        if (length < 0 && errno == EIO)
            return bytes.size();
        if (length < 0 && errno != EAGAIN) {
            m_errorString = QStringLiteral("Cannot write to the virtual port %1: %2")
                                .arg(m_linkPath, systemError(errno));
            return done > 0 ? done : -1;
        }
        break;
    }
    return done;
}

void PtyVirtualPort::discardInput()
{
    m_readDuringNotice = true;
    m_leftover.clear();
    if (m_master >= 0)
        ::tcflush(m_master, TCIFLUSH);
    if (m_noticesPaused)
        resumeNotices();
}
