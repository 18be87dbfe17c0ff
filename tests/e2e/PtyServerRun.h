#pragma once

#include "VellocaProcess.h"

#include "support/PtyPair.h"

#include <QString>

#include <gtest/gtest.h>

namespace e2e {

// The [Velloca] section the fault tests start with: errors logged.
QString loggingGlobalSection(int sessions);

// The program running one auto-activated TCP server session (Session1,
// COM3 mapped to a pty, 8 data bits) on a free port of 127.0.0.1.
class PtyServerRun
{
public:
    // Starts the program and waits until the session listens and its
    // device is open; extraKeys are appended to [Session1], more to the end
    // of the file. The failure text names what did not happen.
    ::testing::AssertionResult start(const QString &extraKeys = {}, const QString &more = {}, int sessions = 1);

    PtyPair device;
    quint16 port = 0;
    VellocaProcess velloca;
};

} // namespace e2e
