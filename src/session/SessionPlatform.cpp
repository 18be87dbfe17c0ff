#include "SessionPlatform.h"

#include "platform/IcmpEcho.h"
#include "platform/PortMap.h"
#include "platform/PtyVirtualPort.h"
#include "platform/QtSocketMember.h"
#include "platform/TtySerialPort.h"

SessionPlatform SessionPlatform::real(const QString &virtualPortFolder)
{
    SessionPlatform platform;
    platform.makeSerialPort = [](QObject *parent) -> SerialPortControl * {
        return new TtySerialPort(PortMap::global(), parent);
    };
    platform.makeVirtualPort = [virtualPortFolder](QObject *parent) -> VirtualPortControl * {
        return new PtyVirtualPort(virtualPortFolder, parent);
    };
    platform.makeSocketMember = [](int index, QObject *parent) -> SocketMember * {
        return new QtSocketMember(index, parent);
    };
    platform.pingRemoteHost = &PingRemoteHost;
    return platform;
}
