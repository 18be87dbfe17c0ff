#pragma once

#include <QByteArray>
#include <QObject>
#include <QSocketNotifier>
#include <QTimer>

#include <deque>

// The sending side of a TCP connection, on a descriptor of its own.
// QTcpSocket ends the whole connection once the peer has stopped sending,
// but a peer that only shut down its sending side (a request followed by
// shutdown(SHUT_WR)) still waits for the answer: with its own descriptor
// the sending side outlives Qt's socket and keeps the connection open.
class StreamWriter : public QObject
{
    Q_OBJECT
public:
    // Takes over the descriptor.
    explicit StreamWriter(int descriptor, QObject *parent = nullptr);
    ~StreamWriter() override;

    // Queues the bytes and hands the kernel what it takes at once; false
    // once the connection has failed (errorString() says why).
    bool write(const QByteArray &bytes);
    qint64 bytesToWrite() const { return m_queued; }
    // The queued bytes while the kernel takes no more of them (the peer is
    // not reading); 0 while it would.
    qint64 bytesHeldBack() const;
    QString errorString() const { return m_errorString; }
    // True when the connection is gone: reset, timed out, or a send failed.
    bool isBroken() const;

    // For a peer that no longer sends: probes the connection now and then,
    // so that its end is noticed even while there is nothing to send.
    void watchForEnd();
    // Sends what is queued (for at most lingerMs), closes the connection
    // and deletes itself; the caller no longer owns it.
    void finish(int lingerMs);

Q_SIGNALS:
    // Queued bytes have been handed to the kernel.
    void bytesWritten(qint64 bytes);
    // The connection failed; raised once, never from inside write().
    void broken();

private:
    qint64 sendQueued();
    void sendOnWritable();
    void fail(int errorNumber);

    int m_fd;
    QSocketNotifier m_writable;
    QTimer m_endCheck;
    std::deque<QByteArray> m_queue;
    qsizetype m_frontOffset = 0;
    qint64 m_queued = 0;
    bool m_failed = false;
    bool m_finishing = false;
    QString m_errorString;
};
