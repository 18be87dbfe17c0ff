#pragma once

#include <QByteArray>
#include <QtGlobal>

// Plain descriptors for the load and fault tests: they need what Qt's
// sockets hide (a reset instead of a close, a half-close, both directions
// driven from one loop without an event loop in between).
namespace e2e {

// A non-blocking TCP connection to 127.0.0.1:port; -1 when refused. A
// receive buffer size caps how much the kernel takes in for the test.
int connectTcp(quint16 port, int receiveBufferSize = 0);
// Closes with SO_LINGER 0, so the peer gets a reset instead of a FIN.
void resetConnection(int fd);

// What came out of each end of a two-way exchange.
struct Exchange
{
    QByteArray atFirst;
    QByteArray atSecond;
};

// Writes toFirst into `first` and toSecond into `second` (non-blocking
// descriptors) at the same time, and reads what arrives at the other end
// until `first` has expectAtFirst bytes and `second` expectAtSecond, or
// the time is up.
Exchange exchange(int first, const QByteArray &toFirst, qsizetype expectAtFirst,
                  int second, const QByteArray &toSecond, qsizetype expectAtSecond,
                  int timeoutMs = 20000);

// Reads and discards what is waiting on a non-blocking descriptor.
void discardInput(int fd);

// SHA-256 in hex, for failure messages that stay short.
QByteArray sha256(const QByteArray &bytes);

} // namespace e2e
