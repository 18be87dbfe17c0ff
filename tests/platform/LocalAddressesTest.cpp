#include "platform/LocalAddresses.h"
#include "platform/QtSocketMember.h"

#include <QHostAddress>
#include <QSet>
#include <gtest/gtest.h>

TEST(LocalAddressesTest, ListsIPv4AddressesOnceWithLoopbackLast)
{
    const QStringList addresses = localIPv4Addresses();
    ASSERT_FALSE(addresses.isEmpty()) << "the loopback interface is up on any test machine";
    EXPECT_EQ(addresses.last(), QStringLiteral("127.0.0.1"));
    EXPECT_EQ(addresses.count(QStringLiteral("127.0.0.1")), 1);
    EXPECT_EQ(QSet<QString>(addresses.begin(), addresses.end()).size(), addresses.size());
    for (const QString &text : addresses) {
        const QHostAddress address(text);
        EXPECT_EQ(address.protocol(), QAbstractSocket::IPv4Protocol) << text.toStdString();
        EXPECT_EQ(address.toString(), text) << "dotted decimal without leading zeros";
    }
    // A member's own address is the first of them.
    EXPECT_EQ(QtSocketMember(0).localIP(), addresses.first());
}
