#pragma once

#include "VirtualPortFolder.h"

#include <QHash>
#include <QList>
#include <QObject>
#include <QString>

#include <functional>

class QLocalServer;
class QLocalSocket;

// Other programs of the same user remote-control Velloca through a local
// socket, <folder>/control (mode 0600 in a 0700 folder). One request per
// line: topic, a tab, the command text in UTF-8, ended by LF (a CR before
// it is dropped). One reply line per request, in order: "accepted" or
// "refused".

// The longest request line, terminator excluded. A longer line is refused
// and its connection closed, so a client cannot make the program buffer
// without limit.
inline constexpr int kCommandLineMaxLength = 4096;
inline constexpr char kCommandAccepted[] = "accepted";
inline constexpr char kCommandRefused[] = "refused";

// The socket name the first program in a folder takes; a second program
// takes control.<pid>.
QString commandChannelPath(const QString &folder = defaultVirtualPortFolder());

// Requests reach the handler one at a time, in the order their lines
// arrived over all connections. A connection is read no further while its
// request waits for the handler, so its pipelined lines stay in the socket
// (held back by the kernel) rather than in memory, and replies cannot
// overtake each other.
//
// If the handler runs a nested event loop (a modal dialog), requests that
// arrive meanwhile are queued and handled after it returns: the handler is
// never re-entered.
//
// Lines without a tab, with a NUL byte or with invalid UTF-8 are refused
// without reaching the handler.
class CommandChannel : public QObject
{
    Q_OBJECT
public:
    // Returns true when the command is accepted.
    using Handler = std::function<bool(const QString &topic, const QString &command)>;

    explicit CommandChannel(Handler handler, QObject *parent = nullptr);
    // Closes every connection and removes the socket file.
    ~CommandChannel() override;

    // Creates the folder when missing (it must be the user's own, mode 0700)
    // and listens on <folder>/control. A control socket that still answers
    // belongs to another running program: this one then takes
    // control.<pid>. A socket file nobody answers on is left over from a
    // program that ended and is replaced. Anything else at the path is left
    // untouched. False, with the reason naming the path, on failure.
    bool listen(const QString &folder = defaultVirtualPortFolder(), QString *error = nullptr);
    bool isListening() const;
    // Empty until listen() succeeds.
    QString socketPath() const { return m_socketPath; }

    int connectionCount() const { return int(m_clients.size()); }
    // Requests waiting for the handler, e.g. while it shows a modal dialog.
    int queuedRequestCount() const { return int(m_queue.size()); }

private:
    struct Client
    {
        QByteArray unparsed;
        bool awaitingReply = false;
        bool peerGone = false;
        bool closing = false;
    };
    struct Request
    {
        QLocalSocket *socket = nullptr;
        QString topic;
        QString command;
    };

    bool fail(QString *error, const QString &reason);
    bool listenAt(const QString &path, QString *error);
    void acceptConnections();
    void serviceClient(QLocalSocket *socket);
    void handleDisconnected(QLocalSocket *socket);
    void processQueue();
    void reply(QLocalSocket *socket, bool accepted);
    void refuseAndClose(QLocalSocket *socket);
    void release(QLocalSocket *socket);

    Handler m_handler;
    QLocalServer *m_server = nullptr;
    QString m_socketPath;
    QHash<QLocalSocket *, Client> m_clients;
    QList<Request> m_queue;
    bool m_handling = false;
};
