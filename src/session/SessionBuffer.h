#pragma once

#include <QByteArray>
#include <QByteArrayView>

#include <memory>

// A fixed-capacity first-in first-out byte queue: a session's hold buffer
// (serial data bound for the network) and its serial output buffer (network
// data bound for the serial side) are each one of these.
//
// Held as a ring, so a read costs only what it copies out however much stays
// held, and an add never allocates. Storage exists only after resize():
// before that the capacity is 0, an add takes nothing and a read returns
// nothing.
class SessionBuffer
{
public:
    SessionBuffer() = default;
    SessionBuffer(const SessionBuffer &) = delete;
    SessionBuffer &operator=(const SessionBuffer &) = delete;

    // Drops whatever is held and allocates room for capacity bytes, once.
    // False, leaving capacity 0, when capacity is negative or the memory
    // cannot be had (a 64 MiB buffer on a short machine).
    bool resize(qint32 capacity);

    qint32 capacity() const { return m_capacity; }
    qint32 count() const { return m_count; }
    qint32 freeSpace() const { return m_capacity - m_count; }
    bool isEmpty() const { return m_count == 0; }
    bool isFull() const { return m_count == m_capacity; }

    // Appends as much of the n bytes as fits and returns how many were
    // taken; the caller decides what becomes of the rest.
    qint32 add(const char *data, qint32 n);
    qint32 add(QByteArrayView data);

    // Takes bytes from the front. numBytes asks for -1 (all), 0 (nothing)
    // or n (up to what is held; any other negative takes nothing) and is set
    // to the number taken. An empty result means nothing was taken.
    QByteArray read(qint32 &numBytes);

    // Copies up to max of the oldest bytes to dest without taking them;
    // returns how many were copied. With drop() a sender can hand out only
    // what its peer accepted.
    qint32 peek(char *dest, qint32 max) const;

    // The oldest held bytes that lie contiguously in storage, without a
    // copy. Empty only when nothing is held; the rest of the held bytes, if
    // any, follow at the storage start once these are dropped.
    QByteArrayView frontSpan() const;

    // Removes up to n of the oldest bytes; returns how many were removed.
    qint32 drop(qint32 n);

    // Forgets everything held; the storage stays.
    void clear();

private:
    std::unique_ptr<char[]> m_storage;
    qint32 m_capacity = 0;
    qint32 m_head = 0; // index of the oldest byte
    qint32 m_count = 0;
};
