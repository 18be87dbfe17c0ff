#pragma once

#include <QByteArray>

// Blocking-free reads and writes on a raw descriptor for tests: they run the
// event loop while they wait, so the code under test keeps working, and they
// give up at the deadline.

// Writes all bytes; false on an error or when the deadline passes first.
bool writeToFd(int fd, const QByteArray &bytes, int timeoutMs = 10000);
// Reads until at least `count` bytes have come or the deadline passes.
QByteArray readFromFd(int fd, int count, int timeoutMs = 10000);
