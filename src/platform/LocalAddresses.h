#pragma once

#include <QStringList>

// IPv4 addresses of the interfaces that are up: non-loopback ones first,
// in interface order, then 127.0.0.1. Empty when the machine has none.
QStringList localIPv4Addresses();
