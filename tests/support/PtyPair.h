#pragma once

#include <QByteArray>
#include <QString>

#include <termios.h>

// A pseudo-terminal made for a test: the slave path plays a serial device for
// the code under test, the master end is the test's side of the "cable".
class PtyPair
{
public:
    PtyPair();
    ~PtyPair();
    PtyPair(const PtyPair &) = delete;
    PtyPair &operator=(const PtyPair &) = delete;

    bool isValid() const { return m_master >= 0; }
    QString slavePath() const { return m_slavePath; }
    int masterFd() const { return m_master; }

    // Writes all bytes to the master end (the device "sends" them).
    bool write(const QByteArray &bytes);
    // Reads what has arrived at the master end within the time-out, until at
    // least `count` bytes are there; returns what it got.
    QByteArray read(int count, int timeoutMs = 5000);
    // termios of the slave side as the code under test has set it.
    termios slaveTermios() const;
    // Closes the master end, as if the device were unplugged.
    void closeMaster();

private:
    int m_master = -1;
    int m_slaveKeepAlive = -1;
    QString m_slavePath;
};
