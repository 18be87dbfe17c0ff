#pragma once

#include <QDeadlineTimer>
#include <QTest>

#include <functional>

// Runs the event loop until the condition holds or the deadline passes.
// Returns the condition's last value; never sleeps blindly.
inline bool waitUntil(const std::function<bool()> &condition, int timeoutMs = 10000)
{
    return QTest::qWaitFor(condition, timeoutMs);
}
