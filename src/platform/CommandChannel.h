#pragma once

#include "VirtualPortFolder.h"

#include <QHash>
#include <QList>
#include <QObject>
#include <QString>

#include <functional>

class CommandConnection;
class ConnectionAcceptor;

// Other programs of the same user remote-control Velloca through a local
// socket, <folder>/control (mode 0600 in a 0700 folder). One request per
// line: topic, a tab, the command text in UTF-8, ended by LF (a CR before
// it is dropped). One reply line per request, in order: "accepted" or
// "refused". A client may shut down its sending side after its requests:
// every complete line is still answered, then the connection is closed.

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

    // When accepting fails (no descriptors left), waiting clients are
    // turned away, the channel rests for a moment and then listens on; the
    // socket file stays. One warning per episode goes to stderr.

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
        bool closing = false;
    };
    struct Request
    {
        CommandConnection *socket = nullptr;
        QString topic;
        QString command;
    };

    bool fail(QString *error, const QString &reason);
    bool listenAt(const QString &path, QString *error);
    void acceptConnection(qintptr descriptor);
    void serviceClient(CommandConnection *socket);
    void processQueue();
    void reply(CommandConnection *socket, bool accepted);
    void refuseAndClose(CommandConnection *socket);
    void closeClient(CommandConnection *socket);
    void release(CommandConnection *socket);
    void stopListening();

    Handler m_handler;
    int m_listener = -1;
    ConnectionAcceptor *m_acceptor = nullptr;
    QString m_socketPath;
    QHash<CommandConnection *, Client> m_clients;
    QList<Request> m_queue;
    bool m_handling = false;
};
