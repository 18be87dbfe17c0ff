#include "PtyPair.h"

#include "FdIo.h"

#include <QDeadlineTimer>
#include <QCoreApplication>

#include <cerrno>
#include <fcntl.h>
#include <poll.h>
#include <stdlib.h>
#include <unistd.h>

PtyPair::PtyPair()
{
    // Close-on-exec: a program under test started later must not inherit
    // the "cable" end, or closing it here would not unplug anything.
    m_master = posix_openpt(O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
    if (m_master < 0)
        return;
    if (grantpt(m_master) != 0 || unlockpt(m_master) != 0) {
        ::close(m_master);
        m_master = -1;
        return;
    }
    m_slavePath = QString::fromLocal8Bit(ptsname(m_master));
    // Keep one slave descriptor open so the tty keeps its settings and the
    // master never sees a hang-up while the code under test reopens it.
    m_slaveKeepAlive = ::open(ptsname(m_master), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
    termios raw {};
    if (m_slaveKeepAlive >= 0 && tcgetattr(m_slaveKeepAlive, &raw) == 0) {
        cfmakeraw(&raw);
        tcsetattr(m_slaveKeepAlive, TCSANOW, &raw);
    }
}

PtyPair::~PtyPair()
{
    if (m_slaveKeepAlive >= 0)
        ::close(m_slaveKeepAlive);
    closeMaster();
}

bool PtyPair::write(const QByteArray &bytes)
{
    return writeToFd(m_master, bytes);
}

QByteArray PtyPair::read(int count, int timeoutMs)
{
    return readFromFd(m_master, count, timeoutMs);
}

termios PtyPair::slaveTermios() const
{
    termios t {};
    tcgetattr(m_slaveKeepAlive, &t);
    return t;
}

void PtyPair::closeMaster()
{
    if (m_master >= 0)
        ::close(m_master);
    m_master = -1;
}
