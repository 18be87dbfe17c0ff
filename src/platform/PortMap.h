#pragma once

#include <QHash>
#include <QString>

// Maps connector numbers (COMn) to device paths: the [Ports] section of the
// loaded configuration, e.g. COM5=/dev/ttyUSB0. Without an entry, COMn is
// the n-th built-in UART, /dev/ttyS<n-1>.
class PortMap
{
public:
    void setDevice(int portNumber, const QString &devicePath);
    void clear();
    QString devicePath(int portNumber) const;

    // The one map of the running program, filled by the configuration loader.
    static PortMap &global();

private:
    QHash<int, QString> m_devices;
};
