#include "LocalAddresses.h"

#include <QNetworkInterface>

QStringList localIPv4Addresses()
{
    QStringList addresses;
    bool loopbackUp = false;
    const QList<QNetworkInterface> interfaces = QNetworkInterface::allInterfaces();
    for (const QNetworkInterface &networkInterface : interfaces) {
        const auto flags = networkInterface.flags();
        if (!flags.testFlag(QNetworkInterface::IsUp))
            continue;
        const bool isLoopback = flags.testFlag(QNetworkInterface::IsLoopBack);
        // Loopback has no carrier to report, so "up" is enough for it.
        if (!isLoopback && !flags.testFlag(QNetworkInterface::IsRunning))
            continue;
        const QList<QNetworkAddressEntry> entries = networkInterface.addressEntries();
        for (const QNetworkAddressEntry &entry : entries) {
            const QHostAddress ip = entry.ip();
            if (ip.protocol() != QAbstractSocket::IPv4Protocol)
                continue;
            if (ip.isLoopback()) {
                loopbackUp = true;
                continue;
            }
            const QString text = ip.toString();
            if (!addresses.contains(text))
                addresses.append(text);
        }
    }
    if (loopbackUp)
        addresses.append(QStringLiteral("127.0.0.1"));
    return addresses;
}
