#pragma once

#include <QByteArray>
#include <QObject>
#include <QString>

// One member of a session's socket array: a TCP client, a TCP server's
// listening socket, an accepted connection, or a UDP endpoint.
// States and error numbers follow the classic socket-control conventions
// that the session logic compares against.
class SocketMember : public QObject
{
    Q_OBJECT
public:
    enum Protocol { Tcp = 0, Udp = 1 };
    enum State {
        StateClosed = 0, StateOpen = 1, StateListening = 2, StatePending = 3,
        StateResolvingHost = 4, StateHostResolved = 5, StateConnecting = 6,
        StateConnected = 7, StateClosing = 8, StateError = 9
    };
    // Error numbers passed with errorOccurred().
    enum ErrorNumber {
        ErrAddressInUse = 10048, ErrAddressNotAvailable = 10049,
        ErrConnectionAborted = 10053, ErrConnectionReset = 10054,
        ErrTimedOut = 10060, ErrConnectionRefused = 10061,
        ErrHostUnreachable = 10065, ErrHostNotFound = 11001
    };

    explicit SocketMember(int index, QObject *parent = nullptr)
        : QObject(parent), m_index(index) {}
    ~SocketMember() override = default;

    int index() const { return m_index; }

    virtual void setProtocol(int protocol) = 0;
    virtual int protocol() const = 0;
    virtual void setRemoteHost(const QString &host) = 0;
    virtual QString remoteHost() const = 0;
    virtual void setRemotePort(int port) = 0;
    virtual int remotePort() const = 0;
    virtual void setLocalPort(int port) = 0;
    virtual int localPort() const = 0;
    // The machine's own address; empty when it has none.
    virtual QString localIP() const = 0;
    // Dotted address of the connected peer (or of the last datagram's sender).
    virtual QString remoteHostIP() const = 0;
    virtual int state() const = 0;
    // The peer has shut down its sending side but still receives: the
    // member stays connected and sends until the connection ends.
    virtual bool isHalfClosed() const = 0;

    // Bind / Connect / Listen return false on an immediate failure, with
    // lastError()/errorString() describing it; Connect's later outcome comes
    // as connected() or errorOccurred().
    virtual bool bind(int localPort, const QString &localAddress = {}) = 0;
    virtual bool connectToRemote() = 0;
    virtual bool listen() = 0;
    // Takes over the connection announced by connectionRequested(requestId).
    virtual bool accept(qintptr requestId) = 0;
    // Sends the bytes (TCP) or one datagram (UDP); returns false on failure.
    virtual bool sendData(const QByteArray &bytes) = 0;
    // Takes up to maxBytes received bytes (UDP: the next datagram).
    virtual QByteArray getData(qint64 maxBytes = -1) = 0;
    virtual qint64 bytesAvailable() const = 0;
    // Bytes queued for sending that the kernel has not taken yet.
    virtual qint64 bytesToWrite() const = 0;
    // The part of bytesToWrite() that waits because the peer takes nothing
    // more (TCP: the kernel's send buffer is full); 0 while it keeps up.
    virtual qint64 bytesHeldBack() const = 0;
    // Caps how much the member reads from the kernel ahead of getData(), so
    // unread data stays in the kernel and TCP flow control holds the sender.
    virtual void setReadBufferSize(qint64 bytes) = 0;
    // Closes locally; raises no closed() signal.
    virtual void close() = 0;
    // Closes at once and drops what is still queued for the peer; raises no
    // closed() signal.
    virtual void abort() = 0;

    virtual int lastError() const = 0;
    virtual QString errorString() const = 0;

Q_SIGNALS:
    void errorOccurred(int index, int number, const QString &description);
    void dataArrived(int index, qint64 bytes);
    void connected(int index);
    // A client wants to connect to this listening member. If no member
    // accept()s requestId before the handler returns, it is closed at once.
    void connectionRequested(int index, qintptr requestId);
    // The peer closed the connection.
    void closed(int index);
    // Queued bytes have been handed to the kernel (drives backpressure).
    void bytesWritten(int index, qint64 bytes);

private:
    int m_index;
};
