// The read side of IP configurations.
#include "network/ip_config_node.h"

#include <gmock/gmock.h>

#include "network/ip_facts.h"
#include "network/ip_origin.h"
#include "tests/network/one_node.h"
#include "tests/support/command_lines.h"
#include "tests/support/log_capture.h"
#include "tests/support/shell_stub.h"
#include "tests/support/texts_are.h"

namespace {

using IC::PropertyValue;

PropertyValue live(const IC::MutableNode& node, unsigned int id) {
    return PortHost::live(node, id);
}

HOST_TEST(IPConfigNode, HoldsEverythingAtCreation) {
    OneNode interface(host, "suse-two-nics");
    host.file("/var/lib/dhcpv6/client6.leases", "lease SDUID: 00:01:00:01;\n");
    const auto config = interface.config("eth0");
    ASSERT_NE(config, nullptr);
    EXPECT_EQ(config->getStatus(), 1U);
    const std::map<unsigned int, PropertyValue> expected = {
        {24, enumeration(3)},
        {25, text("192.0.2.10")},
        {26, text("255.255.255.0")},
        {27, text("2001:db8::10")},
        {28, enumeration(7)},
        {29, text("10")},
        {47, number(4098)},
        {93, texts({"00:01:00:01"})},
        {94, texts({"192.0.2.53", "192.0.2.54"})},
        {95, numbers({1U, 3U})},
        {96, enumeration(3)},
        {97, text("linux-a")},
        {98, text("example.com")},
        {99, texts({"example.com"})},
        {100, text("192.0.2.1")},
        {101, text("2001:db8::1")},
        {102, number(64)},
        {108, text("eth0")},
        {121, text("eth0")},
        {123, number(1)},
        {125, numbers({0U, 1U, 12U})},
        {186, flag(false)},
    };
    std::map<unsigned int, PropertyValue> all;
    config->getProperties(all);
    for (const auto& [id, value] : expected) {
        EXPECT_EQ(all[id], value) << "property " << id;
    }
    EXPECT_EQ(all.size(), expected.size());
}

HOST_TEST(IPConfigNode, OfALeaseSaysSo) {
    OneNode interface(host, "suse-two-nics");
    const auto config = interface.config("eth1");
    EXPECT_EQ(PortHost::stored(*config, 24), enumeration(1));
    EXPECT_EQ(PortHost::stored(*config, 93), texts({"198.51.100.1"}));
    EXPECT_EQ(PortHost::stored(*config, 96), enumeration(1));
    EXPECT_EQ(PortHost::stored(*config, 186), flag(true));
    EXPECT_EQ(PortHost::stored(*config, 25), text("0.0.0.0"));
    EXPECT_EQ(PortHost::stored(*config, 26), text("0.0.0.0"));
}

HOST_TEST(IPConfigNode, ListsTheLeasesServerBeforeTheDHCPv6Server) {
    host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", "IPADDR='192.0.2.9'\nDHCPSID='192.0.2.1'\n");
    host.file("/var/lib/dhcpv6/client6.leases", "lease SDUID: 00:01:00:01;\n");
    EXPECT_THAT(IC::dhcpServersOf("eth0"), TextsAre("192.0.2.1", "00:01:00:01"));
    EXPECT_THAT(IC::dhcpServersOf("eth1"), TextsAre("00:01:00:01"));
    host.remove("/var/lib/dhcpv6");
    EXPECT_THAT(IC::dhcpServersOf("eth1"), testing::IsEmpty());
}

HOST_TEST(IPConfigNode, HasTheFourthGroupOfItsAddressForAnInterfaceId) {
    EXPECT_EQ(IC::ipv6InterfaceIdOf("2001:db8:1:2:3:4:5:6"), "2");
    EXPECT_EQ(IC::ipv6InterfaceIdOf("2001:db8::10"), "10");
    EXPECT_EQ(IC::ipv6InterfaceIdOf("2001:db8:1:2 x:3"), "") << "no blank enters the command";
    EXPECT_EQ(IC::ipv6InterfaceIdOf("2001:db8:1:2 "), "2") << "cut at the blank";
    EXPECT_EQ(IC::ipv6InterfaceIdOf("fe80::1"), "");
    EXPECT_EQ(IC::ipv6InterfaceIdOf(""), "");
}

HOST_TEST(IPConfigNode, PrefersTheFirstStaticIPv6GatewayToAnAdvertisedOne) {
    host.tool("route -A inet6 -n",
              "::/0 fe80::9 UGDA 1024 0 0 eth0\n::/0 2001:db8::1 UG 1024 0 0 eth0\n"
              "::/0 2001:db8::2 UG 1024 0 0 eth0\n");
    EXPECT_EQ(IC::preferredIPv6Gateway("eth0"), "2001:db8::1");
}

HOST_TEST(IPConfigNode, AnswersWhatTheHostSaysNow) {
    OneNode interface(host, "suse-two-nics");
    const auto config = interface.config("eth0");
    host.tool("ifconfig eth0",
              "eth0 Link encap:Ethernet  HWaddr 02:00:5E:00:00:01\n  inet addr:203.0.113.5  Bcast:x  "
              "Mask:255.0.0.0\n");
    host.tool("ip -6 address show dev eth0", "    inet6 2001:db8:9::1/56 scope global \n");
    host.tool("route -n", "0.0.0.0 203.0.113.1 0.0.0.0 UG 0 0 0 eth0\n");
    host.tool("route -A inet6 -n", "::/0 fe80::9 UGDA 1024 0 0 eth0\n");
    host.tool("hostname -s", "renamed\n");
    host.tool("hostname -d", "example.net\n");
    host.tool("ethtool eth0", "\tLink detected: no\n");
    host.file("/etc/resolv.conf", "nameserver 203.0.113.53\nsearch a.example b.example\n");
    host.file("/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:01", "BOOTPROTO=bootp\n");
    host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", "IPADDR='203.0.113.5'\n");
    const std::map<unsigned int, PropertyValue> expected = {
        {24, enumeration(2)},
        {25, text("203.0.113.5")},
        {26, text("255.0.0.0")},
        {27, text("2001:db8:9::1")},
        {28, enumeration(7)},
        {47, number(4098)},
        {94, texts({"203.0.113.53"})},
        {97, text("renamed")},
        {98, text("example.net")},
        {99, texts({"a.example", "b.example"})},
        {100, text("203.0.113.1")},
        {101, text("fe80::9")},
        {102, number(56)},
        {123, number(12)},
        {186, flag(true)},
        // from the store
        {29, text("10")},
        {93, texts({})},
        {96, enumeration(3)},
        {108, text("eth0")},
    };
    for (const auto& [id, value] : expected) {
        EXPECT_EQ(live(*config, id), value) << "property " << id;
    }
}

HOST_TEST(IPConfigNode, PrefersAGatewaySetByHandToAnAdvertisedOne) {
    OneNode interface(host, "ipv6-only");
    EXPECT_EQ(live(*interface.emptyConfig("eth0"), 101), text("2001:db8:6::1"));
}

HOST_TEST(IPConfigNode, OnAHostWithoutADefaultRouteShowsTheOnLinkMarkAsItsGateway) {
    OneNode interface(host, "suse-two-nics");
    host.tool("route -n", "192.0.2.0 0.0.0.0 255.255.255.0 U 0 0 0 eth0\n");
    EXPECT_EQ(live(*interface.emptyConfig("eth0"), 100), text("0.0.0.0"));
}

HOST_TEST(IPConfigNode, WithoutAnyAddressReadsZerosAndIPv6AloneReadsEmpty) {
    OneNode interface(host, "ipv6-only");
    const auto config = interface.emptyConfig("eth0");
    EXPECT_EQ(live(*config, 25), text(""));
    EXPECT_EQ(live(*config, 26), text(""));
    EXPECT_EQ(live(*config, 28), enumeration(5));
    host.tool("ip -6 address show dev eth0", "");
    EXPECT_EQ(live(*config, 25), text("0.0.0.0"));
    EXPECT_EQ(live(*config, 26), text("0.0.0.0"));
    EXPECT_EQ(live(*config, 28), enumeration(2));
}

HOST_TEST(IPConfigNode, KeepsAnAddressWhoseMaskCannotBeRead) {
    OneNode interface(host, "suse-two-nics");
    const auto config = interface.emptyConfig("eth0");
    shell_stub::answerWith([](const std::string& command) -> std::optional<std::string> {
        const bool isNone = command.find("cut -d: -f4") != command.npos || command.starts_with("ip -6");
        return isNone ? std::optional<std::string>("") : std::nullopt;
    });
    const CommandLines commands;
    EXPECT_EQ(live(*config, 25), text("192.0.2.10"));
    EXPECT_THAT(commands.all(), testing::Contains("ip -6 address show dev eth0 | grep \"global\""))
        << "what it carries is asked whenever one of the two is missing";
    EXPECT_EQ(live(*config, 26), text("0.0.0.0"));
    shell_stub::answerWith({});
}

HOST_TEST(IPConfigNode, AsksWithTheseCommands) {
    OneNode interface(host, "suse-two-nics");
    const auto config = interface.emptyConfig("eth0");
    const IC::IPConfigNode bond(900, 1, {1}, 29, 1, "bond0");
    const CommandLines commands;
    live(*config, 97);
    live(*config, 98);
    live(*config, 123);
    live(bond, 123);
    live(*config, 186);
    EXPECT_THAT(commands.all(), TextsAre("hostname -s 2> /dev/null", "hostname -d 2> /dev/null",
                                         "ethtool eth0 2> /dev/null | grep \"Link detected\"",
                                         "ifconfig | grep bond0 2> /dev/null",
                                         "cat /var/lib/dhcpcd/dhcpcd-eth0.info 2> /dev/null"));
}

HOST_TEST(IPConfigNode, LeavesTheAddressTypeAloneWhenThereIsNone) {
    OneNode interface(host, "ipv6-only");
    host.tool("ifconfig eth0", "eth0 Link encap:Ethernet\n");
    const auto config = interface.config("eth0");
    EXPECT_EQ(PortHost::stored(*config, 28), enumeration(0)) << "so that the agent lists it";
    PropertyValue value("untouched", true);
    EXPECT_EQ(config->getProperty(28, value).getStatus(), 0);
    EXPECT_EQ(value, text("untouched"));
}

HOST_TEST(IPConfigNode, IsDownWithTheCableOutAndUpWithALink) {
    OneNode interface(host, "suse-two-nics");
    EXPECT_EQ(live(*interface.emptyConfig("eth0"), 123), number(1));
    EXPECT_EQ(live(*interface.emptyConfig("eth1"), 123), number(12));
}

HOST_TEST(IPConfigNode, OfABondIsUpWhenIfconfigListsIt) {
    OneNode interface(host, "bond-two-members");
    const auto config = interface.emptyConfig("bond0");
    EXPECT_EQ(live(*config, 123), number(1));
    host.tool("ifconfig", "lo Link encap:Local Loopback\n");
    EXPECT_EQ(live(*config, 123), number(12));
    host.tool("ifconfig", "bond0 Link encap:Ethernet\n");
    config->setProperty(123, number(32));
    EXPECT_EQ(live(*config, 123), number(1)) << "what the monitor noted gives way to what the host shows";
}

HOST_TEST(IPConfigNode, HasAnEmptyNameWhenHostnamePrintsNothing) {
    OneNode interface(host, "suse-two-nics");
    const auto config = interface.emptyConfig("eth0");
    host.tool("hostname -s", "");
    host.tool("hostname -d", "");
    EXPECT_EQ(live(*config, 97), text(""));
    EXPECT_EQ(live(*config, 98), text(""));
    host.tool("hostname -d", "hostname: Unknown host\n");
    EXPECT_TRUE(live(*config, 98).empty());
}

HOST_TEST(IPConfigNode, AnswersAnUnknownIdAsTheFrameworkDoes) {
    OneNode interface(host, "suse-two-nics");
    PropertyValue value("untouched", true);
    const IC::Error error = interface.emptyConfig("eth0")->getProperty(999, value);
    EXPECT_NE(error.getStatus(), 0);
    EXPECT_EQ(value, text("untouched"));
}

HOST_TEST(IPConfigNode, SaysWhenItIsRead) {
    OneNode interface(host, "suse-two-nics");
    const auto config = interface.config("eth0");
    LogCapture capture;
    live(*config, 108);
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("IPConfigNode::getProperty: entry", "IPConfigNode::getProperty: exit"));
}

TEST(Origin, OfEveryKeyword) {
    EXPECT_EQ(IC::originOfKeyword("dhcp"), 1U);
    EXPECT_EQ(IC::originOfKeyword("dhcp4"), 1U);
    EXPECT_EQ(IC::originOfKeyword("static"), 3U);
    EXPECT_EQ(IC::originOfKeyword("none"), 3U);
    EXPECT_EQ(IC::originOfKeyword("bootp"), 2U);
    for (const char* other : {"", "dhcp6", "DHCP", "static ", "auto4"}) {
        EXPECT_EQ(IC::originOfKeyword(other), 0U) << other;
    }
}

}  // namespace
