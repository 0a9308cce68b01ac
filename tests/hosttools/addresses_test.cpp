#include "hosttools/addresses.h"

#include <gtest/gtest.h>

#include <arpa/inet.h>

namespace hosttools {
namespace {

TEST(Addresses, PlainInet6) {
    in6_addr address{};
    ASSERT_TRUE(parsePlainInet6("fe80000000000000f07f6cfffe040148", address));
    EXPECT_EQ(textOf(address), "fe80::f07f:6cff:fe04:148");
    ASSERT_TRUE(parsePlainInet6("00000000000000000000000000000001", address));
    EXPECT_EQ(textOf(address), "::1");
    ASSERT_TRUE(parsePlainInet6("0000000000000000000000000a010101", address));
    EXPECT_EQ(textOf(address), "::10.1.1.1");
}

TEST(Addresses, NoPlainInet6) {
    in6_addr address{};
    EXPECT_FALSE(parsePlainInet6("", address));
    EXPECT_FALSE(parsePlainInet6("fe80::1", address));
    EXPECT_FALSE(parsePlainInet6("fe80000000000000f07f6cfffe04014", address));
    EXPECT_FALSE(parsePlainInet6("fe80000000000000f07f6cfffe0401480", address));
    EXPECT_FALSE(parsePlainInet6("fe80000000000000f07f6cfffe04014g", address));
    EXPECT_FALSE(parsePlainInet6("fe80000000000000f07f6cfffe0401+8", address));
}

TEST(Addresses, Inet) {
    in_addr address{};
    ASSERT_TRUE(parseInet("192.0.2.7", address));
    EXPECT_EQ(textOf(address), "192.0.2.7");
    ASSERT_TRUE(parseInet("default", address));
    EXPECT_EQ(textOf(address), "0.0.0.0");
    EXPECT_FALSE(parseInet("192.0.2.256", address));
    EXPECT_FALSE(parseInet("host.example", address));
    EXPECT_FALSE(parseInet("", address));
}

}  // namespace
}  // namespace hosttools
