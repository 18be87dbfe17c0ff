#pragma once

// Tells systemd how the service is doing (the unit has Type=notify). Without
// systemd ($NOTIFY_SOCKET unset) nothing happens, so both are safe to call
// in every run. Each returns true when the message was delivered.

// Once the start-up sequence is done: systemd counts the service as started
// only from here, and gives up on it if this never comes.
bool notifyServiceReady();

// When shutdown begins (after SIGTERM or any other exit), so that systemd
// knows the program is leaving on purpose while it saves its configuration.
bool notifyServiceStopping();
