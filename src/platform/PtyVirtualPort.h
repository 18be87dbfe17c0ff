#pragma once

#include "VirtualPortControl.h"

#include <QTimer>

class QSocketNotifier;

// VirtualPortControl over a pseudo-terminal. createPort("COM5") opens a pty
// master, sets the slave to raw mode and links <folder>/COM5 to the slave;
// applications open that link like a serial device.
//
// An application opening the slave is seen through inotify on the slave's
// device node (or, where inotify is missing, a 50 ms check); its closing
// shows as a hang-up on the master. Nothing is watched in a loop while no
// application is attached.
//
// Bytes written while no application holds the port are dropped, as on a
// line with nobody listening: the next application must not find old data.
// Bytes the application wrote before closing stay readable until read.
class PtyVirtualPort : public VirtualPortControl
{
    Q_OBJECT
public:
    explicit PtyVirtualPort(QString folder, QObject *parent = nullptr);
    ~PtyVirtualPort() override;

    // An existing port of this object is removed first.
    bool createPort(const QString &name) override;
    // Does not raise openedOrClosed(false): the session is going away.
    bool removePort() override;
    // A pty moves bytes at memory speed and has no modem lines, so there is
    // no baud rate to hold the application to and no line signal to report:
    // both set-up calls are accepted and change nothing.
    void setStrictBaudrate(bool on) override;
    void setSignalEvents(bool on) override;

    bool isOpenedByApplication() const override { return m_opened; }
    qint64 available() const override;
    QByteArray read(qint64 maxBytes) override;
    // Takes what the pty accepts now without waiting and returns the count;
    // the caller keeps the rest and offers it again later. -1 on a failure
    // (errorString() says which).
    qint64 write(const QByteArray &bytes) override;
    void discardInput() override;
    QString errorString() const override { return m_errorString; }

    QString folder() const { return m_folder; }
    // <folder>/<name> of the current port, empty without one.
    QString linkPath() const { return m_linkPath; }
    // The /dev/pts path the link points to, empty without a port.
    QString slavePath() const { return m_slavePath; }

private:
    bool fail(const QString &reason);
    bool openMaster();
    bool makeSlaveRaw();
    void watchSlave();
    void closeEverything();

    bool slaveAttached() const;
    void handleMasterActivity();
    void checkAttachment(bool sawOpen);
    void markOpened();
    void markClosed();
    void keepInputFromClosedSlave();
    void updateMasterNotifier();
    void resumeNotices();

    QString m_folder;
    QString m_linkPath;
    QString m_slavePath;
    QString m_errorString;
    int m_master = -1;
    int m_watch = -1; // id in the shared open watcher
    QSocketNotifier *m_masterNotifier = nullptr;
    // Stands in for inotify where it is not available.
    QTimer m_attachPoll;
    // Re-raises dataReceived for input that a receiver left unread.
    QTimer m_noticeRetry;
    bool m_opened = false;
    bool m_noticesPaused = false;
    bool m_readDuringNotice = false;
    // What the application wrote before it closed the slave.
    QByteArray m_leftover;
};
