#pragma once

#include <QString>

#include <functional>

class QObject;
class SerialPortControl;
class SocketMember;
class VirtualPortControl;

// Makes the platform controls a session owns. The real set talks to ttys,
// ptys and sockets; tests may hand in their own.
struct SessionPlatform
{
    std::function<SerialPortControl *(QObject *parent)> makeSerialPort;
    std::function<VirtualPortControl *(QObject *parent)> makeVirtualPort;
    std::function<SocketMember *(int index, QObject *parent)> makeSocketMember;
    // One echo request to a dotted address; done(status) comes later from
    // the event loop (0: the peer answered), never once context is gone.
    std::function<void(const QString &address, int timeoutMs, QObject *context,
                       std::function<void(int status)> done)> pingRemoteHost;

    // Ports mapped by [Ports], virtual ports in the given folder.
    static SessionPlatform real(const QString &virtualPortFolder);
};
