#pragma once

#include <QString>

// What /proc says about a running process, for checks that the program
// neither leaks nor spins. Each returns -1 when the process is gone.
namespace e2e {

// Open file descriptors (/proc/<pid>/fd).
int openDescriptorCount(qint64 pid);
// User plus system CPU time used so far, in milliseconds.
qint64 cpuTimeMs(qint64 pid);
// Resident memory (VmRSS) in KiB.
qint64 residentKiB(qint64 pid);
// The most resident memory so far (VmHWM) in KiB.
qint64 peakResidentKiB(qint64 pid);

} // namespace e2e
