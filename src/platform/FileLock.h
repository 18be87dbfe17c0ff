#pragma once

#include <QString>

#include <memory>

// An exclusive advisory lock (flock) on a small lock file, held while the
// object lives. The kernel drops it when the process ends, also after a
// crash, so a lock is never left behind.
class FileLock
{
public:
    ~FileLock();
    FileLock(const FileLock &) = delete;
    FileLock &operator=(const FileLock &) = delete;

    // The lock, or null when another process holds it (busy set) or the
    // lock file cannot be opened (error names the path and the cause).
    static std::unique_ptr<FileLock> tryLock(const QString &path, bool *busy, QString *error);

private:
    explicit FileLock(int fd) : m_fd(fd) { }
    int m_fd = -1;
};
