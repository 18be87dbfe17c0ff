#pragma once

#include "support/FdIo.h"

#include <QByteArray>
#include <QString>

#include <gtest/gtest.h>

#include <functional>

class QTcpSocket;

// Small tools shared by the whole-program tests.
namespace e2e {

// A TCP port on 127.0.0.1 that was free a moment ago.
quint16 freeTcpPort();

// `size` bytes in which every byte value 0..255 occurs, in an order that
// differs from block to block so that a lost or repeated block shows.
QByteArray allByteValues(int size, int seed = 0);

// A [Session<number>] section: a TCP server on 127.0.0.1:port for COM<connector>,
// sending serial data as it comes and dropping it while no client is there.
QString serverSessionSection(int number, int connector, quint16 port, bool autoActivate);

// The whole content of a file; empty when it cannot be read.
QByteArray fileBytes(const QString &path);
inline QString fileText(const QString &path) { return QString::fromUtf8(fileBytes(path)); }

// The value of a key in INI text, names matched case-insensitively; a null
// string when the section or key is missing.
QString iniValue(const QString &text, const QString &section, const QString &key);

// Reads from the socket until `count` bytes have arrived or the time is up.
QByteArray readFromSocket(QTcpSocket &socket, int count, int timeoutMs = 10000);

// Equal byte arrays; otherwise says the sizes and the first difference
// instead of printing kilobytes of binary.
::testing::AssertionResult sameBytes(const QByteArray &actual, const QByteArray &expected);

// Matches an error log line of a server session on this port whose message
// contains the text ("TCP/IP Status: Listening...").
std::function<bool(const QString &)> serverLogLine(const QString &message, quint16 port);

// True when path itself is a symbolic link (dangling or not).
bool isSymbolicLink(const QString &path);

} // namespace e2e
