#pragma once

#include "SessionBuffer.h"
#include "SessionPlatform.h"
#include "SessionRecord.h"
#include "config/SessionSettings.h"

#include <QHash>
#include <QObject>
#include <QSet>
#include <QStringList>
#include <QTimer>

#include <functional>
#include <vector>

class SerialPortControl;
struct SessionConfig;
class SocketMember;
class VirtualPortControl;

// One bridge between a serial connector and a network endpoint: its
// settings, run-time record, platform controls and the texts its window
// shows. It holds no widget, so it runs the same with or without a display.
class SessionEngine : public QObject
{
    Q_OBJECT
public:
    enum StatusLine { ComLine = 0, NetworkLine = 1 };

    explicit SessionEngine(SessionPlatform platform, QObject *parent = nullptr);
    ~SessionEngine() override;

    SessionSettings &settings() { return m_settings; }
    const SessionSettings &settings() const { return m_settings; }
    SessionRecord &record() { return m_record; }
    const SessionRecord &record() const { return m_record; }

    SerialPortControl *serialPort() const { return m_serialPort; }
    VirtualPortControl *virtualPort() const { return m_virtualPort; }
    // Member i of the socket array; nullptr beyond the members created.
    SocketMember *socket(int index) const;
    int socketCount() const { return int(m_sockets.size()); }
    // Creates members up to `index` (a closed member with default
    // properties), keeps existing ones, returns member `index`.
    SocketMember *createSocketMember(int index);

    QString statusLine(StatusLine line) const { return m_statusLines[line]; }
    // Changes a status line; statusLineChanged is raised only when the text
    // really changes, so every visible change is reported exactly once.
    void setStatusLine(StatusLine line, const QString &text);

    QString caption() const { return m_caption; }
    void setCaption(const QString &caption);
    // The name under which the command channel reaches this session.
    QString commandTopic() const { return m_commandTopic; }
    void setCommandTopic(const QString &topic);

    enum class Activity { Inactive, Active };
    enum class Role { Client, Server };
    // The role the settings ask for; the running role is fixed at activation.
    Role configuredRole() const { return m_settings.TCPOption == 0 ? Role::Client : Role::Server; }
    Activity activity() const { return m_activity; }
    bool isActive() const { return m_activity == Activity::Active; }
    // The Activate button's caption, which follows the activity: "Activate"
    // while inactive, "De-Activate" while active.
    QString activateCaption() const;
    bool settingsLocked() const { return m_settingsLocked; }
    void setSettingsLocked(bool locked);

    // The session's settings as one value. Applying takes each value the
    // way the window's controls would (a list index beyond its list is left
    // alone) and raises configurationChanged.
    void applyConfiguration(const SessionConfig &config);
    // The settings to save, with AutoActivate set while the session runs.
    SessionConfig currentConfiguration() const;

    // Indexes of the connected members, in order: the one walk over them.
    QList<int> connectedMembers() const;
    // Remote addresses of the connected members, in index order.
    QStringList connectedClientAddresses() const;

    // Activate / De-Activate: a toggle decided by the button's caption.
    void Command1_Click();
    // Runs a command from another program; true when it was accepted.
    bool executeCommand(const QString &command);
    // "baud,parity,data,stop" from the selected list entries, e.g. 9600,N,8,1.
    QString serialSettingsText() const;

    // The two data buffers (hold buffer: serial to network; serial output
    // buffer: network to serial). Adds take what fits and return how much.
    qint32 Add2MyBuffer(QByteArrayView data) { return m_myBuffer.add(data); }
    QByteArray ReadFromMyBuffer(qint32 &numBytes) { return m_myBuffer.read(numBytes); }
    qint32 Add2SerialOutBuffer(QByteArrayView data) { return m_serialOutBuffer.add(data); }
    QByteArray ReadFromSerialOutBuffer(qint32 &numBytes) { return m_serialOutBuffer.read(numBytes); }
    const SessionBuffer &myBuffer() const { return m_myBuffer; }
    const SessionBuffer &serialOutBuffer() const { return m_serialOutBuffer; }

    // Sends one block to the connected members by the routing options.
    void SendToClients(const QByteArray &block);
    // Sends one block on one member; a failed send shows on the TCP/IP line.
    void sendBlock(SocketMember *member, const QByteArray &block);
    // Writes one line to the error log and starts the error program.
    void LogErrors(const QString &message);

    // Activity lamps: 0 serial side, 1 network side; true while lit red.
    bool lampLit(int lamp) const { return m_lampLit[lamp]; }
    bool isReconnecting() const { return m_timer1.isActive(); }

    // Timer handlers, public so tests can drive them tick by tick.
    void Timer2_Tick();
    // Timer2 rests while the session has nothing to do (no traffic, empty
    // buffers, lamps out, no watchdog): an idle session costs no wake-ups.
    bool isTicking() const { return m_timer2.isActive(); }
    void wakeTicks();
    void ConnectAttempt();

    // Watchdog period in Timer2 ticks for a ping-frequency list index.
    static int pingPeriodTicks(int pingFrequency);
    // Watchdog echo requests sent and not yet answered or timed out.
    int pingsInFlight() const { return m_pingsInFlight; }

    static constexpr int kTimer1IntervalMs = 5000;
    static constexpr int kTimer2IntervalMs = 50;

Q_SIGNALS:
    void configurationChanged();
    void statusLineChanged(int line, const QString &text);
    void captionChanged(const QString &caption);
    void commandTopicChanged(const QString &topic);
    void activateCaptionChanged(const QString &caption);
    void settingsLockChanged(bool locked);
    void lampChanged(int lamp, bool lit);
    // A command changed the serial list settings; the window shows them anew.
    void serialSettingsChanged();

private:
    // Takes the machine's address as the local one; without any, the
    // session can only be a client.
    void takeLocalAddress();

    // Activation and deactivation.
    void setActivity(Activity activity);
    void activate();
    void deactivate();
    bool openPhysicalPort();
    bool applyComSettings(QString fields);
    void failSerialOpen(const QString &description);
    void failSocketStart(const QString &description);
    void closeSerialSide();
    bool sizeBuffers();
    QString composeStatus(int captionId, int stateId, const QString &detail = {}) const;

    // Serial to network.
    void SerialReceive();
    void VirtualReceive();
    void VirtualOpenClose(bool opened);
    QList<int> serialReceivers() const;
    int firstClientToServe() const;
    qint32 serialReadRoom();
    bool serialInputIgnored() const;
    void moveSerialInput(const std::function<qint64()> &pending,
                         const std::function<QByteArray(qint32)> &read, bool mayHold);
    void sendHeldData(bool packetMode, bool mayHold);
    void flushOnTimeout();
    void resumeSerialReading();
    void setLamp(int lamp, bool lit);
    bool tickHasWork() const;

    // Network to serial.
    void DataArrival(int index);
    void drainSerialOutput();
    void resumeNetworkReading();
    int firstConnectedIndex() const;

    // Connections.
    void handleConnect(int index);
    void ConnectionRequest(int index, qintptr requestId);
    bool makeRoomForNewClient();
    void handleClose(int index);
    void handlePeerClose(int index);
    void finishCloseIfDrained(int index);
    void handleSocketError(int index, int number, const QString &description);
    void dropClientNotReading(int index);
    void wireSocket(SocketMember *member);
    bool anyConnected() const;
    bool isServer() const { return m_record.TCPOption == 1; }
    ClientRouting serialRouting() const { return routingOption<ClientRouting>(m_record.ServerSerialOptions); }
    ClientRouting networkRouting() const { return routingOption<ClientRouting>(m_record.ServerTCPOptions); }
    ClientDirection clientDirection() const { return routingOption<ClientDirection>(m_record.ClientOptions); }
    int portNumberValue() const;
    void showClientCount();

    void wirePlatform();

    // Watchdog.
    void pingWatchdogStep();
    void noteNewConnection(int index);

    SessionPlatform m_platform;
    SessionSettings m_settings;
    SessionRecord m_record;
    SerialPortControl *m_serialPort = nullptr;
    VirtualPortControl *m_virtualPort = nullptr;
    std::vector<SocketMember *> m_sockets;
    QString m_statusLines[2];
    QString m_caption;
    QString m_commandTopic;
    Activity m_activity = Activity::Inactive;
    bool m_settingsLocked = false;

    SessionBuffer m_myBuffer;
    SessionBuffer m_serialOutBuffer;
    QTimer m_timer1;
    QTimer m_timer2;
    bool m_lampLit[2] = { false, false };
    int m_ledTicks = 0;
    bool m_closingNow = false;
    bool m_inSerialReceive = false;
    // Serial input waits for room: a client's queue or the hold buffer is full.
    bool m_serialInputHeld = false;
    bool m_resumeQueued = false;
    bool m_draining = false;
    int m_pingsInFlight = 0;
    // Counts the connections each member has carried, so a late answer can
    // tell whether its connection is still the same one.
    QHash<int, quint64> m_connectionSerial;
    // Members closed by their peer whose last bytes are still being read.
    QSet<int> m_closeAfterDrain;
};
