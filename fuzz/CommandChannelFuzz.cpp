// Raw bytes from a client of the command channel, through a real local
// socket, the channel's line framing and decoding, into a session's command
// parser. The framing is not a separate function, so the socket is the way
// in; each input is one connection that sends everything and hangs up.
#include "FuzzSupport.h"

#include "platform/CommandChannel.h"
#include "session/SessionEngine.h"
#include "session/SessionPlatform.h"

#include <QDeadlineTimer>
#include <QLocalSocket>
#include <QTemporaryDir>

namespace {

// Far above what one input takes even under the sanitizers: past it the
// channel holds a connection it should have let go.
constexpr int kSettleMs = 20000;

struct Harness
{
    QTemporaryDir folder;
    SessionEngine *engine = nullptr;
    CommandChannel channel { [this](const QString &topic, const QString &command) {
        return engine && topic.compare(engine->commandTopic(), Qt::CaseInsensitive) == 0
            && engine->executeCommand(command);
    } };

    Harness()
    {
        QString error;
        if (!channel.listen(folder.filePath(QStringLiteral("channel")), &error)) {
            std::fprintf(stderr, "cannot listen: %s\n", qPrintable(error));
            std::abort();
        }
    }
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    fuzz::ensureApplication();
    static Harness harness;
    SessionEngine engine(SessionPlatform::real(harness.folder.filePath(QStringLiteral("ports"))));
    engine.settings().Connector = 0;
    engine.settings().IPAddress = QStringLiteral("127.0.0.1");
    harness.engine = &engine;

    {
        QLocalSocket client;
        client.connectToServer(harness.channel.socketPath());
        const QDeadlineTimer deadline(kSettleMs);
        while (client.state() == QLocalSocket::ConnectingState && !deadline.hasExpired())
            QCoreApplication::processEvents(QEventLoop::AllEvents, 10);
        fuzz::require(client.state() == QLocalSocket::ConnectedState, "client connects");
        client.write(fuzz::bytes(data, size));
        client.disconnectFromServer();
        while ((client.state() != QLocalSocket::UnconnectedState || harness.channel.connectionCount() > 0
                || harness.channel.queuedRequestCount() > 0)
               && !deadline.hasExpired()) {
            QCoreApplication::processEvents(QEventLoop::AllEvents, 10);
        }
        fuzz::require(client.state() == QLocalSocket::UnconnectedState, "client gets disconnected");
        fuzz::require(harness.channel.connectionCount() == 0, "channel releases a finished connection");
        fuzz::require(harness.channel.queuedRequestCount() == 0, "no request left queued");
    }
    harness.engine = nullptr;
    // Sockets the channel released are deleted later: let that happen now.
    QCoreApplication::sendPostedEvents(nullptr, QEvent::DeferredDelete);
    fuzz::require(!engine.isActive(), "a session without a connector stays inactive");
    return 0;
}
