#include "HostAddressText.h"

#include <QNetworkInterface>
#include <QRegularExpression>
#include <QStringList>
#include <QUrl>

#include <algorithm>

QString dottedAddress(const QHostAddress &address)
{
    if (address.isNull())
        return {};
    bool isIPv4 = false;
    const quint32 ipv4 = address.toIPv4Address(&isIPv4);
    return isIPv4 ? QHostAddress(ipv4).toString() : address.toString();
}

// Checked here rather than left to the kernel, which may be set to allow
// binding foreign addresses (ip_nonlocal_bind).
bool isLocalAddress(const QHostAddress &address)
{
    if (address == QHostAddress(QHostAddress::AnyIPv4) || address == QHostAddress(QHostAddress::Any)
        || address == QHostAddress(QHostAddress::AnyIPv6) || address.isLoopback())
        return true;
    const QList<QHostAddress> own = QNetworkInterface::allAddresses();
    return std::any_of(own.begin(), own.end(), [&](const QHostAddress &candidate) {
        return candidate.isEqual(address, QHostAddress::TolerantConversion);
    });
}

bool isValidPort(int port)
{
    return port >= 1 && port <= 65535;
}

bool isPlausibleHostName(const QString &host)
{
    static const QRegularExpression numeric(QStringLiteral("^[0-9.]+$"));
    static const QRegularExpression label(
        QStringLiteral("^[A-Za-z0-9_]([A-Za-z0-9_-]{0,61}[A-Za-z0-9_])?$"));
    if (host.isEmpty() || numeric.match(host).hasMatch())
        return false;
    QString ace = QString::fromLatin1(QUrl::toAce(host));
    if (ace.endsWith(QLatin1Char('.')))
        ace.chop(1);
    if (ace.isEmpty() || ace.size() > 253)
        return false;
    const QStringList labels = ace.split(QLatin1Char('.'));
    return std::all_of(labels.begin(), labels.end(),
                       [](const QString &part) { return label.match(part).hasMatch(); });
}
