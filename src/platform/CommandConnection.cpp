#include "CommandConnection.h"

#include <cerrno>
#include <sys/socket.h>
#include <unistd.h>

CommandConnection::CommandConnection(int descriptor, qsizetype readBufferSize, QObject *parent)
    : QObject(parent)
    , m_descriptor(descriptor)
    , m_readBufferSize(readBufferSize)
    , m_readNotifier(descriptor, QSocketNotifier::Read)
    , m_writeNotifier(descriptor, QSocketNotifier::Write)
{
    m_writeNotifier.setEnabled(false);
    connect(&m_readNotifier, &QSocketNotifier::activated, this, &CommandConnection::receive);
    connect(&m_writeNotifier, &QSocketNotifier::activated, this, [this] {
        send();
        if (m_output.isEmpty())
            Q_EMIT bytesWritten();
        finishIfDone();
    });
}

CommandConnection::~CommandConnection()
{
    m_readNotifier.setEnabled(false);
    m_writeNotifier.setEnabled(false);
    ::close(m_descriptor);
}

void CommandConnection::receive()
{
    char chunk[4096];
    while (!m_inputEnded && m_input.size() < m_readBufferSize) {
        const ssize_t n = ::recv(m_descriptor, chunk, size_t(qMin<qsizetype>(sizeof chunk, m_readBufferSize - m_input.size())), 0);
        if (n > 0) {
            m_input.append(chunk, n);
            continue;
        }
        if (n < 0 && errno == EINTR)
            continue;
        if (n < 0 && (errno == EAGAIN || errno == EWOULDBLOCK))
            break;
        // The end of the input; an error (a reset) also means that nothing
        // can be sent any more.
        m_outputBroken = m_outputBroken || n < 0;
        m_inputEnded = true;
    }
    // A full buffer is read on once read() has made room.
    m_readNotifier.setEnabled(!m_inputEnded && m_input.size() < m_readBufferSize);
    Q_EMIT readyRead();
}

QByteArray CommandConnection::read(qsizetype maxBytes)
{
    const QByteArray taken = m_input.left(maxBytes);
    m_input.remove(0, taken.size());
    if (!m_inputEnded && !m_closing)
        m_readNotifier.setEnabled(m_input.size() < m_readBufferSize);
    return taken;
}

void CommandConnection::write(const QByteArray &bytes)
{
    if (m_outputBroken)
        return;
    m_output += bytes;
    send();
}

void CommandConnection::send()
{
    while (!m_output.isEmpty() && !m_outputBroken) {
        const ssize_t n = ::send(m_descriptor, m_output.constData(), size_t(m_output.size()), MSG_NOSIGNAL);
        if (n > 0)
            m_output.remove(0, n);
        else if (errno == EAGAIN || errno == EWOULDBLOCK)
            break;
        else if (errno != EINTR)
            m_outputBroken = true;
    }
    if (m_outputBroken)
        m_output.clear();
    m_writeNotifier.setEnabled(!m_output.isEmpty());
}

void CommandConnection::closeAfterWriting()
{
    m_closing = true;
    m_readNotifier.setEnabled(false);
    finishIfDone();
}

void CommandConnection::finishIfDone()
{
    if (!m_closing || !m_output.isEmpty() || m_finished)
        return;
    m_finished = true;
    m_writeNotifier.setEnabled(false);
    ::shutdown(m_descriptor, SHUT_RDWR);
    Q_EMIT finished();
}
