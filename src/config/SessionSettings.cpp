#include "SessionSettings.h"

#include "localisation/ResourceStrings.h"

QString SessionLists::connectorName(int n)
{
    return n == 0 ? LoadResString(2205) : QStringLiteral("COM%1").arg(n);
}
