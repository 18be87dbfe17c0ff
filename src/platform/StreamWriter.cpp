#include "StreamWriter.h"

#include <QCoreApplication>

#include <cerrno>
#include <cstring>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

// A connection whose peer has stopped sending is looked at this often;
// keep-alive probes meanwhile turn a peer that vanished into an error.
constexpr int kEndCheckMs = 2000;
constexpr int kKeepAliveIdleSeconds = 10;
constexpr int kKeepAliveIntervalSeconds = 5;
constexpr int kKeepAliveProbes = 3;

} // namespace

StreamWriter::StreamWriter(int descriptor, QObject *parent)
    : QObject(parent), m_fd(descriptor), m_writable(qintptr(descriptor), QSocketNotifier::Write)
{
    m_writable.setEnabled(false);
    connect(&m_writable, &QSocketNotifier::activated, this, &StreamWriter::sendOnWritable);
    m_endCheck.setInterval(kEndCheckMs);
    connect(&m_endCheck, &QTimer::timeout, this, [this] {
        if (m_failed || !isBroken())
            return;
        int error = 0;
        socklen_t length = sizeof error;
        ::getsockopt(m_fd, SOL_SOCKET, SO_ERROR, &error, &length);
        fail(error != 0 ? error : ECONNRESET);
        Q_EMIT broken();
    });
}

StreamWriter::~StreamWriter()
{
    m_writable.setEnabled(false);
    ::close(m_fd);
}

qint64 StreamWriter::bytesHeldBack() const
{
    if (m_queued == 0)
        return 0;
    pollfd writable { m_fd, POLLOUT, 0 };
    if (::poll(&writable, 1, 0) > 0 && (writable.revents & POLLOUT))
        return 0;
    return m_queued;
}

bool StreamWriter::write(const QByteArray &bytes)
{
    if (m_failed)
        return false;
    if (bytes.isEmpty())
        return true;
    const bool wasIdle = m_queue.empty();
    m_queue.push_back(bytes);
    m_queued += bytes.size();
    if (wasIdle)
        sendQueued();
    if (!m_failed)
        return true;
    // The caller learns it from the result now, its owner once the caller
    // is done.
    QMetaObject::invokeMethod(this, &StreamWriter::broken, Qt::QueuedConnection);
    return false;
}

bool StreamWriter::isBroken() const
{
    if (m_failed)
        return true;
    pollfd state { m_fd, POLLOUT, 0 };
    return ::poll(&state, 1, 0) > 0 && (state.revents & (POLLERR | POLLHUP));
}

void StreamWriter::watchForEnd()
{
    const int on = 1;
    ::setsockopt(m_fd, SOL_SOCKET, SO_KEEPALIVE, &on, sizeof on);
    ::setsockopt(m_fd, IPPROTO_TCP, TCP_KEEPIDLE, &kKeepAliveIdleSeconds, sizeof kKeepAliveIdleSeconds);
    ::setsockopt(m_fd, IPPROTO_TCP, TCP_KEEPINTVL, &kKeepAliveIntervalSeconds, sizeof kKeepAliveIntervalSeconds);
    ::setsockopt(m_fd, IPPROTO_TCP, TCP_KEEPCNT, &kKeepAliveProbes, sizeof kKeepAliveProbes);
    m_endCheck.start();
}

void StreamWriter::finish(int lingerMs)
{
    m_endCheck.stop();
    setParent(QCoreApplication::instance());
    if (m_queue.empty() || isBroken()) {
        deleteLater();
        return;
    }
    m_finishing = true;
    QTimer::singleShot(lingerMs, this, &QObject::deleteLater);
}

qint64 StreamWriter::sendQueued()
{
    qint64 sent = 0;
    while (!m_queue.empty()) {
        const QByteArray &front = m_queue.front();
        const ssize_t n = ::send(m_fd, front.constData() + m_frontOffset, size_t(front.size() - m_frontOffset),
                                 MSG_NOSIGNAL);
        if (n < 0) {
            if (errno == EINTR)
                continue;
            if (errno != EAGAIN && errno != EWOULDBLOCK)
                fail(errno);
            break;
        }
        sent += n;
        m_queued -= n;
        m_frontOffset += n;
        if (m_frontOffset == front.size()) {
            m_queue.pop_front();
            m_frontOffset = 0;
        }
    }
    m_writable.setEnabled(!m_failed && !m_queue.empty());
    return sent;
}

void StreamWriter::sendOnWritable()
{
    const qint64 sent = sendQueued();
    if (m_failed)
        Q_EMIT broken();
    else if (sent > 0)
        Q_EMIT bytesWritten(sent);
    if (m_finishing && m_queue.empty())
        deleteLater();
}

void StreamWriter::fail(int errorNumber)
{
    m_failed = true;
    m_errorString = QString::fromLocal8Bit(std::strerror(errorNumber));
    m_queue.clear();
    m_queued = 0;
    m_frontOffset = 0;
    m_writable.setEnabled(false);
    m_endCheck.stop();
}
