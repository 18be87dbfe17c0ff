#pragma once

#include <QObject>

class QSocketNotifier;

// Turns SIGTERM, SIGINT and SIGHUP into a Qt signal on the event loop, so that a
// service stop or Ctrl+C runs the normal shutdown (save, clean up) instead
// of killing the program in the middle of a handler.
class UnixSignalWatcher : public QObject
{
    Q_OBJECT
public:
    explicit UnixSignalWatcher(QObject *parent = nullptr);
    ~UnixSignalWatcher() override;

Q_SIGNALS:
    void terminationRequested(int signalNumber);

private:
    void handleReadable();
    QSocketNotifier *m_notifier = nullptr;
};
