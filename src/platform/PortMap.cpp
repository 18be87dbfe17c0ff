#include "PortMap.h"

void PortMap::setDevice(int portNumber, const QString &devicePath)
{
    m_devices.insert(portNumber, devicePath);
}

void PortMap::clear()
{
    m_devices.clear();
}

QString PortMap::devicePath(int portNumber) const
{
    const auto it = m_devices.constFind(portNumber);
    if (it != m_devices.constEnd())
        return *it;
    return QStringLiteral("/dev/ttyS%1").arg(portNumber - 1);
}

PortMap &PortMap::global()
{
    static PortMap map;
    return map;
}
