#pragma once

#include <QByteArray>
#include <QObject>
#include <QSocketNotifier>

// One client of the command channel, on its raw descriptor. QLocalSocket
// closes both directions as soon as the peer ends its sending side; this
// keeps sending, so a client that writes its request and shuts down its
// sending side (printf … | socat - UNIX-CONNECT:…) still gets the reply.
class CommandConnection : public QObject
{
    Q_OBJECT
public:
    // Takes over the non-blocking descriptor. At most readBufferSize
    // received bytes are buffered; the kernel holds the rest, and the
    // client's writes wait.
    CommandConnection(int descriptor, qsizetype readBufferSize, QObject *parent = nullptr);
    ~CommandConnection() override;

    qint64 bytesAvailable() const { return m_input.size(); }
    QByteArray read(qsizetype maxBytes);
    // The peer has sent all it will: nothing follows what is buffered.
    bool inputEnded() const { return m_inputEnded; }

    // Queues bytes for the peer; dropped once the peer cannot receive.
    void write(const QByteArray &bytes);
    qint64 bytesToWrite() const { return m_output.size(); }
    // The peer can no longer receive (it closed completely or reset).
    bool outputBroken() const { return m_outputBroken; }

    // Sends what is queued, then closes and raises finished().
    void closeAfterWriting();

Q_SIGNALS:
    // More bytes are buffered, or the input ended.
    void readyRead();
    // Queued bytes that had to wait have gone out.
    void bytesWritten();
    void finished();

private:
    void receive();
    void send();
    void finishIfDone();

    int m_descriptor;
    qsizetype m_readBufferSize;
    QSocketNotifier m_readNotifier;
    QSocketNotifier m_writeNotifier;
    QByteArray m_input;
    QByteArray m_output;
    bool m_inputEnded = false;
    bool m_outputBroken = false;
    bool m_closing = false;
    bool m_finished = false;
};
