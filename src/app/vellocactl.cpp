// Command-line client of Velloca's command channel: sends one command and
// reports the answer through the exit status. Blocking waits are fine here:
// this program has no event loop to keep alive.
#include "platform/CommandChannel.h"

#include <QCoreApplication>
#include <QDeadlineTimer>
#include <QLocalSocket>
#include <QStringList>
#include <QTextStream>

#include <optional>

namespace {

constexpr int kExitAccepted = 0;
constexpr int kExitRefused = 1;
constexpr int kExitUnreachable = 2;
constexpr int kReplyTimeoutMs = 10000;

struct Invocation
{
    QString socketPath;
    QString topic;
    QString command;
};

void printUsage(QTextStream &out)
{
    out << "usage: vellocactl [--socket PATH] TOPIC COMMAND...\n"
           "  --socket PATH  the command channel to use (default: "
        << commandChannelPath()
        << ")\n"
           "  TOPIC          System, a connector such as COM3, or Session<n>\n"
           "  COMMAND        [ACTIVATE], [DEACTIVATE], [COMSETTINGS=9600,N,8,1] or [APPEXIT];\n"
           "                 several arguments are joined by blanks\n"
           "exit status: 0 accepted, 1 refused, 2 unreachable or no reply\n";
}

bool hasLineBreak(const QString &text)
{
    return text.contains(QLatin1Char('\n')) || text.contains(QLatin1Char('\r'));
}

// Empty with a reason in *problem when the arguments make no request.
std::optional<Invocation> parseArguments(QStringList arguments, QString *problem)
{
    Invocation invocation;
    invocation.socketPath = commandChannelPath();
    if (!arguments.isEmpty() && arguments.first() == QLatin1String("--socket")) {
        if (arguments.size() < 2 || arguments.at(1).isEmpty()) {
            *problem = QStringLiteral("--socket needs a path");
            return std::nullopt;
        }
        invocation.socketPath = arguments.at(1);
        arguments.remove(0, 2);
    } else if (!arguments.isEmpty() && arguments.first().startsWith(QLatin1String("--socket="))) {
        invocation.socketPath = arguments.first().mid(int(qstrlen("--socket=")));
        arguments.removeFirst();
    }
    if (!arguments.isEmpty() && arguments.first() == QLatin1String("--"))
        arguments.removeFirst();
    else if (!arguments.isEmpty() && arguments.first().startsWith(QLatin1String("--"))) {
        *problem = QStringLiteral("unknown option %1").arg(arguments.first());
        return std::nullopt;
    }
    if (arguments.size() < 2) {
        *problem = QStringLiteral("a topic and a command are needed");
        return std::nullopt;
    }
    invocation.topic = arguments.takeFirst();
    invocation.command = arguments.join(QLatin1Char(' '));
    // The tab ends the topic and a line break ends the request.
    if (invocation.topic.isEmpty() || invocation.topic.contains(QLatin1Char('\t'))
        || hasLineBreak(invocation.topic)) {
        *problem = QStringLiteral("the topic must be a non-empty name without tabs or line breaks");
        return std::nullopt;
    }
    if (hasLineBreak(invocation.command)) {
        *problem = QStringLiteral("the command must not contain line breaks");
        return std::nullopt;
    }
    return invocation;
}

QString connectFailure(const QLocalSocket &socket)
{
    switch (socket.error()) {
    case QLocalSocket::ServerNotFoundError:
        return QStringLiteral("no such socket (is Velloca running?)");
    case QLocalSocket::ConnectionRefusedError:
        return QStringLiteral("nobody is listening (left over from a program that ended?)");
    case QLocalSocket::SocketAccessError:
        return QStringLiteral("permission denied");
    case QLocalSocket::SocketTimeoutError:
        return QStringLiteral("timed out");
    default:
        return socket.errorString();
    }
}

int unreachable(QTextStream &err, const QString &message)
{
    err << "vellocactl: " << message << '\n';
    return kExitUnreachable;
}

int send(const Invocation &invocation, QTextStream &err)
{
    const QString &path = invocation.socketPath;
    QLocalSocket socket;
    const QDeadlineTimer deadline(kReplyTimeoutMs);
    socket.connectToServer(path);
    if (!socket.waitForConnected(int(deadline.remainingTime())))
        return unreachable(err, QStringLiteral("cannot reach the command channel at %1: %2")
                                    .arg(path, connectFailure(socket)));

    const QByteArray request = invocation.topic.toUtf8() + '\t' + invocation.command.toUtf8() + '\n';
    if (request.size() > kCommandLineMaxLength + 1)
        err << "vellocactl: the command is longer than " << kCommandLineMaxLength
            << " bytes; it will be refused\n";
    socket.write(request);
    while (socket.bytesToWrite() > 0) {
        if (!socket.waitForBytesWritten(int(deadline.remainingTime())))
            return unreachable(err, QStringLiteral("cannot send to the command channel at %1: %2")
                                        .arg(path, socket.errorString()));
    }
    while (!socket.canReadLine()) {
        if (deadline.hasExpired() || socket.state() != QLocalSocket::ConnectedState)
            break;
        socket.waitForReadyRead(int(deadline.remainingTime()));
    }
    if (!socket.canReadLine()) {
        if (deadline.hasExpired())
            return unreachable(err, QStringLiteral("no reply from the command channel at %1 within %2 s")
                                        .arg(path)
                                        .arg(kReplyTimeoutMs / 1000));
        return unreachable(err, QStringLiteral("the command channel at %1 closed without a reply").arg(path));
    }
    const QByteArray reply = socket.readLine().trimmed();
    if (reply == kCommandAccepted)
        return kExitAccepted;
    if (reply == kCommandRefused)
        return kExitRefused;
    return unreachable(err, QStringLiteral("unexpected reply \"%1\" from the command channel at %2")
                                .arg(QString::fromUtf8(reply.left(80)), path));
}

} // namespace

int main(int argc, char **argv)
{
    QCoreApplication app(argc, argv);
    QTextStream out(stdout);
    QTextStream err(stderr);
    QStringList arguments = QCoreApplication::arguments();
    arguments.removeFirst();
    const QStringList options = arguments.mid(0, arguments.indexOf(QLatin1String("--")));
    if (options.contains(QLatin1String("--help")) || options.contains(QLatin1String("-h"))) {
        printUsage(out);
        return kExitAccepted;
    }
    QString problem;
    const std::optional<Invocation> invocation = parseArguments(arguments, &problem);
    if (!invocation) {
        err << "vellocactl: " << problem << '\n';
        printUsage(err);
        return kExitUnreachable;
    }
    return send(*invocation, err);
}
