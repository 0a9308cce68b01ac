#include "hosttools/interfaces.h"

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/if_addr.h>
#include <linux/if_link.h>
#include <linux/rtnetlink.h>

#include "hosttools/addresses.h"
#include "tests/hosttools/netlink_message.h"
#include "tests/support/texts_are.h"

namespace hosttools {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

rtnl_link_stats64 someStatistics() {
    rtnl_link_stats64 stats{};
    stats.rx_packets = 1;
    stats.tx_packets = 2;
    stats.rx_bytes = 0x100000003;
    stats.tx_bytes = 4;
    stats.rx_errors = 5;
    stats.tx_errors = 6;
    stats.rx_dropped = 100;
    stats.rx_missed_errors = 20;
    stats.tx_dropped = 8;
    stats.collisions = 9;
    stats.rx_length_errors = 1000;
    stats.rx_over_errors = 200;
    stats.rx_crc_errors = 30;
    stats.rx_frame_errors = 4;
    stats.rx_fifo_errors = 11;
    stats.tx_fifo_errors = 12;
    stats.tx_aborted_errors = 2000;
    stats.tx_carrier_errors = 300;
    stats.tx_heartbeat_errors = 40;
    stats.tx_window_errors = 5;
    return stats;
}

std::string linkMessage(const std::string& attributes) {
    ifinfomsg header{};
    header.ifi_index = 7;
    header.ifi_type = 1;
    header.ifi_flags = 0x11043;
    return message::bytes(header) + attributes;
}

TEST(Interfaces, ALinkMessage) {
    rtnl_link_ifmap map{};
    map.mem_start = 0xfeb00000;
    map.mem_end = 0xfeb20000;
    map.base_addr = 0x1c000;
    map.irq = 0x110;
    map.dma = 3;
    const Link link = parseLink(
        linkMessage(message::text(IFLA_IFNAME, "eth0") +
                    message::attribute(IFLA_ADDRESS, std::string("\x00\x11\x22\x33\x44\x55", 6)) +
                    message::attribute(IFLA_MTU, 1500u) + message::attribute(IFLA_TXQLEN, 1000u) +
                    message::attribute(IFLA_MAP, map) + message::attribute(IFLA_STATS64, someStatistics())));
    EXPECT_EQ(link.name, "eth0");
    EXPECT_EQ(link.index, 7);
    EXPECT_EQ(link.flags, 0x11043u);
    EXPECT_THAT(link.hardware, ElementsAre(0, 0x11, 0x22, 0x33, 0x44, 0x55, 0, 0));
    EXPECT_EQ(link.mtu, 1500u);
    EXPECT_EQ(link.queueLength, 1000u);
    EXPECT_EQ(link.card.memoryStart, 0xfeb00000u);
    // What the classic call would have cut off is cut off.
    EXPECT_EQ(link.card.baseAddress, 0xc000);
    EXPECT_EQ(link.card.interrupt, 0x10);
}

TEST(Interfaces, CountersAreAddedUpAsInProcNetDev) {
    const Link link = parseLink(linkMessage(message::attribute(IFLA_STATS64, someStatistics())));
    EXPECT_EQ(link.received.packets, 1u);
    EXPECT_EQ(link.received.bytes, 0x100000003u);
    EXPECT_EQ(link.received.errors, 5u);
    EXPECT_EQ(link.received.dropped, 120u);
    EXPECT_EQ(link.received.overruns, 11u);
    EXPECT_EQ(link.received.framing, 1234u);
    EXPECT_EQ(link.sent.packets, 2u);
    EXPECT_EQ(link.sent.dropped, 8u);
    EXPECT_EQ(link.sent.overruns, 12u);
    EXPECT_EQ(link.sent.framing, 2345u);
    EXPECT_EQ(link.collisions, 9u);
}

TEST(Interfaces, ALongHardwareAddressIsCutToWhatIsShown) {
    const Link link = parseLink(linkMessage(message::attribute(IFLA_ADDRESS, std::string(20, '\xab'))));
    EXPECT_THAT(link.hardware, testing::Each(0xab));
}

TEST(Interfaces, MessagesThatAreTooShort) {
    EXPECT_EQ(parseLink("abc").name, "");
    EXPECT_EQ(parseInetAddress("").label, "");
    EXPECT_EQ(parseLink(linkMessage(message::attribute(IFLA_MTU, std::string("\x05")))).mtu, 5u);
}

in_addr inet(const char* text) {
    in_addr address{};
    EXPECT_TRUE(parseInet(text, address));
    return address;
}

TEST(Interfaces, AnAddressMessage) {
    ifaddrmsg header{};
    header.ifa_index = 7;
    header.ifa_prefixlen = 24;
    const InetAddress address = parseInetAddress(message::bytes(header) + message::text(IFA_LABEL, "eth0:1") +
                                                 message::attribute(IFA_LOCAL, inet("10.1.2.3")) +
                                                 message::attribute(IFA_ADDRESS, inet("10.1.2.4")) +
                                                 message::attribute(IFA_BROADCAST, inet("10.1.2.255")));
    EXPECT_EQ(address.link, 7);
    EXPECT_EQ(address.label, "eth0:1");
    EXPECT_EQ(textOf(address.local), "10.1.2.3");
    EXPECT_EQ(textOf(address.peer), "10.1.2.4");
    EXPECT_EQ(textOf(address.broadcast), "10.1.2.255");
    EXPECT_EQ(address.prefix, 24u);
}

TEST(Interfaces, Inet6AddressesAndDamagedLines) {
    const std::vector<Inet6Address> addresses = parseInet6Addresses(
        "fe80000000000000f07f6cfffe040148 02 40 20 80     eth0\n"
        "fe8000000000000 02 40 20 80     eth0\n"
        "\n"
        "20010db8000000000000000000000001 02 xx 00 80     eth0\n"
        "20010db8000000000000000000000001 02 40 00 80\n"
        "20010db8000000000000000000000001 0a 7f 00 80 verylongname012");
    ASSERT_THAT(addresses, SizeIs(2));
    EXPECT_EQ(addresses[0].link, "eth0");
    EXPECT_EQ(addresses[0].prefix, 64u);
    EXPECT_EQ(addresses[0].scope, 0x20u);
    EXPECT_EQ(addresses[1].link, "verylongname012");
    EXPECT_EQ(addresses[1].prefix, 127u);
    EXPECT_EQ(textOf(addresses[1].address), "2001:db8::1");
}

Link link(const char* name, int index) {
    Link made;
    made.name = name;
    made.index = index;
    return made;
}

InetAddress labelled(int index, const char* label, const char* address) {
    InetAddress made;
    made.link = index;
    made.label = label;
    made.local = inet(address);
    return made;
}

Inet6Address inet6(const char* name) {
    Inet6Address made;
    made.link = name;
    return made;
}

Interfaces someInterfaces() {
    return {{link("lo", 1), link("eth10", 3), link("eth1", 2), link("eth0", 4)},
            {labelled(2, "eth1:a", "10.0.0.2"), labelled(2, "eth1", "10.0.0.3"),
             labelled(2, "eth1", "10.0.0.4"), labelled(2, "eth1:a", "10.0.0.5"),
             labelled(3, "eth10:1", "10.0.0.6"), labelled(9, "gone", "10.0.0.7")},
            {inet6("eth1"), inet6("lo"), inet6("eth1"), inet6("gone")}};
}

TEST(Stanzas, ByNameWithTheirAliases) {
    const Interfaces interfaces = someInterfaces();
    const std::vector<Stanza> stanzas = listStanzas(interfaces);
    std::vector<std::string> names;
    for (const Stanza& stanza : stanzas) names.push_back(stanza.name);
    EXPECT_THAT(names, TextsAre("eth0", "eth1", "eth10", "eth10:1", "eth1:a", "lo"));
}

TEST(Stanzas, AddressesOfLinksAndAliases) {
    const Interfaces interfaces = someInterfaces();
    const std::vector<Stanza> stanzas = listStanzas(interfaces);
    EXPECT_EQ(stanzas[0].inet, nullptr);
    ASSERT_NE(stanzas[1].inet, nullptr);
    EXPECT_EQ(textOf(stanzas[1].inet->local), "10.0.0.3");
    EXPECT_THAT(stanzas[1].inet6, SizeIs(2));
    EXPECT_FALSE(stanzas[1].alias);
    EXPECT_EQ(stanzas[2].inet, nullptr) << "eth10 has an alias's address only";
    EXPECT_EQ(textOf(stanzas[4].inet->local), "10.0.0.2") << "the first of its label";
    EXPECT_TRUE(stanzas[4].alias);
    EXPECT_THAT(stanzas[4].inet6, IsEmpty());
    EXPECT_EQ(stanzas[4].link->name, "eth1");
}

TEST(Stanzas, OneByName) {
    Interfaces interfaces = someInterfaces();
    interfaces.links = {link("eth1", 2)};
    EXPECT_EQ(textOf(makeStanza(interfaces, "eth1")->inet->local), "10.0.0.3");
    EXPECT_THAT(makeStanza(interfaces, "eth1")->inet6, SizeIs(2));
    EXPECT_EQ(textOf(makeStanza(interfaces, "eth1:a")->inet->local), "10.0.0.2");
    const Stanza absent = makeStanza(interfaces, "eth1:77").value();
    EXPECT_EQ(absent.name, "eth1:77");
    EXPECT_EQ(absent.inet, nullptr);
    EXPECT_TRUE(absent.alias);
}

}  // namespace
}  // namespace hosttools
