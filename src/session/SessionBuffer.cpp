#include "SessionBuffer.h"

#include <algorithm>
#include <cstring>
#include <new>

bool SessionBuffer::resize(qint32 capacity)
{
    // Let go of the old storage first: two 64 MiB buffers need not coexist.
    m_storage.reset();
    m_capacity = 0;
    clear();
    if (capacity < 0)
        return false;
    if (capacity == 0)
        return true;
    try {
        // Left uninitialised: pages of a large buffer are touched only once
        // data reaches them.
        m_storage = std::make_unique_for_overwrite<char[]>(size_t(capacity));
    } catch (const std::bad_alloc &) {
        return false;
    }
    m_capacity = capacity;
    return true;
}

qint32 SessionBuffer::add(const char *data, qint32 n)
{
    if (!data || n <= 0)
        return 0;
    const qint32 taken = std::min(n, freeSpace());
    if (taken == 0)
        return 0;
    const qint32 tail = (m_head + m_count) % m_capacity;
    const qint32 untilEnd = std::min(taken, m_capacity - tail);
    std::memcpy(m_storage.get() + tail, data, size_t(untilEnd));
    std::memcpy(m_storage.get(), data + untilEnd, size_t(taken - untilEnd));
    m_count += taken;
    return taken;
}

qint32 SessionBuffer::add(QByteArrayView data)
{
    // Arrays beyond 2 GiB cannot fit anyway; offer only what could.
    const qint32 offered = qint32(std::min<qsizetype>(data.size(), freeSpace()));
    return add(data.data(), offered);
}

QByteArray SessionBuffer::read(qint32 &numBytes)
{
    if (numBytes == 0)
        return {};
    if (m_count == 0 || numBytes < -1) {
        numBytes = 0;
        return {};
    }
    const qint32 wanted = numBytes == -1 ? m_count : std::min(numBytes, m_count);
    QByteArray result(wanted, Qt::Uninitialized);
    peek(result.data(), wanted);
    drop(wanted);
    numBytes = wanted;
    return result;
}

qint32 SessionBuffer::peek(char *dest, qint32 max) const
{
    if (!dest || max <= 0)
        return 0;
    const qint32 copied = std::min(max, m_count);
    if (copied == 0)
        return 0;
    const qint32 untilEnd = std::min(copied, m_capacity - m_head);
    std::memcpy(dest, m_storage.get() + m_head, size_t(untilEnd));
    std::memcpy(dest + untilEnd, m_storage.get(), size_t(copied - untilEnd));
    return copied;
}

QByteArrayView SessionBuffer::frontSpan() const
{
    if (m_count == 0)
        return {};
    return QByteArrayView(m_storage.get() + m_head, std::min(m_count, m_capacity - m_head));
}

qint32 SessionBuffer::drop(qint32 n)
{
    if (n <= 0)
        return 0;
    const qint32 dropped = std::min(n, m_count);
    m_count -= dropped;
    // An emptied ring starts over at 0, so the next data stays in one span.
    m_head = m_count == 0 ? 0 : (m_head + dropped) % m_capacity;
    return dropped;
}

void SessionBuffer::clear()
{
    m_head = 0;
    m_count = 0;
}
