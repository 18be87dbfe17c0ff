#pragma once

#include <linux/capability.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstring>

// True when this process may open an ICMP socket of the given type.
inline bool canOpenIcmpSocket(int type)
{
    const int fd = ::socket(AF_INET, type | SOCK_CLOEXEC, IPPROTO_ICMP);
    if (fd >= 0)
        ::close(fd);
    return fd >= 0;
}

// True when this process may send ICMP echo requests at all.
inline bool canSendIcmp()
{
    return canOpenIcmpSocket(SOCK_DGRAM) || canOpenIcmpSocket(SOCK_RAW);
}

// Takes CAP_NET_RAW out of this thread's effective set, so raw ICMP sockets
// are refused as they would be for an ordinary user.
class WithoutRawSockets
{
public:
    WithoutRawSockets()
    {
        if (syscall(SYS_capget, &m_header, m_saved) != 0)
            return;
        __user_cap_data_struct reduced[2];
        std::memcpy(reduced, m_saved, sizeof reduced);
        reduced[CAP_NET_RAW / 32].effective &= ~(1u << (CAP_NET_RAW % 32));
        m_changed = syscall(SYS_capset, &m_header, reduced) == 0;
    }
    ~WithoutRawSockets()
    {
        if (m_changed)
            syscall(SYS_capset, &m_header, m_saved);
    }
    WithoutRawSockets(const WithoutRawSockets &) = delete;
    WithoutRawSockets &operator=(const WithoutRawSockets &) = delete;
    bool changed() const { return m_changed; }

private:
    __user_cap_header_struct m_header { _LINUX_CAPABILITY_VERSION_3, 0 };
    __user_cap_data_struct m_saved[2] {};
    bool m_changed = false;
};
