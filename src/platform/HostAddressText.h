#pragma once

#include <QHostAddress>
#include <QString>

// Checks and conversions of the address texts a socket member is given.

// Dotted form of an IPv4 address, also of one mapped into IPv6 (::ffff:);
// other IPv6 addresses in their usual form; empty for a null address.
QString dottedAddress(const QHostAddress &address);

// True for the wildcard addresses, loopback and the addresses of this
// machine's interfaces.
bool isLocalAddress(const QHostAddress &address);

bool isValidPort(int port);

// True when the text could be a DNS name, so it is worth a lookup; false for
// text such as "1.2.3.999" or "my host", which fails at once instead of as a
// later "host not found".
bool isPlausibleHostName(const QString &host);
