#include "hosttools/ifconfig_listing.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <net/if.h>
#include <net/if_arp.h>

#include "hosttools/addresses.h"
#include "tests/hosttools/host_tree.h"
#include "tests/hosttools/process.h"

namespace hosttools {
namespace {

using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

std::string scaled(std::uint64_t bytes) {
    Text text;
    addScaledBytes(text, bytes);
    return text.str();
}

TEST(ScaledBytes, TheDecimalIsCutOff) {
    EXPECT_EQ(scaled(0), "0.0 B");
    EXPECT_EQ(scaled(1023), "1023.0 B");
    EXPECT_EQ(scaled(1024), "1.0 KiB");
    EXPECT_EQ(scaled(2172), "2.1 KiB");
    EXPECT_EQ(scaled(1048575), "1023.9 KiB");
    EXPECT_EQ(scaled(1048576), "1.0 MiB");
    EXPECT_EQ(scaled(5368709120), "5.0 GiB");
    EXPECT_EQ(scaled(1099511627776), "1.0 TiB");
    EXPECT_EQ(scaled(18446744073709551615ull), "16777215.9 TiB");
}

/// A card in the state of a busy server's.
Link card() {
    Link link;
    link.name = "eth0";
    link.flags = IFF_UP | IFF_BROADCAST | IFF_RUNNING | IFF_MULTICAST;
    link.type = ARPHRD_ETHER;
    link.hardware = {0x00, 0x14, 0x5e, 0xab, 0xcd, 0xef};
    link.mtu = 1500;
    link.queueLength = 1000;
    link.received = {1234567, 987654321, 1, 2, 3, 4, 0};
    link.sent = {7654321, 123456, 5, 6, 7, 8, 0};
    link.collisions = 9;
    return link;
}

InetAddress address(const char* local) {
    InetAddress made;
    EXPECT_TRUE(parseInet(local, made.local));
    EXPECT_TRUE(parseInet("192.168.1.255", made.broadcast));
    EXPECT_TRUE(parseInet("10.9.9.9", made.peer));
    made.prefix = 24;
    return made;
}

std::string listing(const Link& link, const InetAddress* inet = nullptr) {
    Text text;
    listInterface(text, {link.name, &link, inet});
    return text.str();
}

std::string line(const std::string& text, int number) {
    std::string_view rest = text;
    std::string_view found;
    for (; number >= 0; --number) {
        found = rest.substr(0, rest.find('\n'));
        rest.remove_prefix(found.size() + 1);
    }
    return std::string(found);
}

TEST(IfconfigListing, ACardWithEverything) {
    Link link = card();
    link.card = {0xfeb00000, 0xfeb20000, 0xc000, 17, 1};
    const InetAddress inet = address("192.168.1.20");
    Inet6Address inet6;
    ASSERT_TRUE(parsePlainInet6("fe8000000000000002145efffeabcdef", inet6.address));
    inet6.prefix = 64;
    inet6.scope = 0x20;
    Text text;
    listInterface(text, {"eth0", &link, &inet, {&inet6}});
    expectRecorded("ifconfig_card.expected", text.str());
}

TEST(IfconfigListing, TheLinesThatARequestTakesApart) {
    const InetAddress inet = address("192.168.1.20");
    HostTree tree;
    tree.addBytes("out", listing(card(), &inet));
    const std::string cat = "cat " + tree.root() + "/out ";
    EXPECT_EQ(shell(cat + "|grep HWaddr |awk '{print $5}'|tr '[A-Z]' '[a-z]'").output, "00:14:5e:ab:cd:ef\n");
    EXPECT_EQ(shell(cat + "| grep \"inet addr:\" | tr -s ' ' | cut -d: -f2 | cut -d ' ' -f1").output,
              "192.168.1.20\n");
    EXPECT_EQ(shell(cat + "| grep \"inet addr:\" | tr -s ' ' | cut -d: -f4").output, "255.255.255.0\n");
}

TEST(IfconfigListing, NamesAreNeverCut) {
    Link link = card();
    link.name = "verylongname012";
    EXPECT_THAT(listing(link),
                StartsWith("verylongname012 Link encap:Ethernet  HWaddr 00:14:5E:AB:CD:EF  \n"));
    link.name = "e";
    EXPECT_THAT(listing(link), StartsWith("e         Link encap:"));
}

TEST(IfconfigListing, HardwareOfEveryKind) {
    const std::pair<unsigned, const char*> kinds[] = {
        {ARPHRD_LOOPBACK, "Link encap:Local Loopback  \n"},
        {ARPHRD_PPP, "Link encap:Point-to-Point Protocol  \n"},
        {ARPHRD_SIT, "Link encap:IPv6-in-IPv4  \n"},
        {ARPHRD_INFINIBAND,
         "Link encap:InfiniBand  HWaddr 00-14-5E-AB-CD-EF-00-00-00-00-00-00-00-00-00-00  \n"},
        {ARPHRD_NONE, "Link encap:UNSPEC  HWaddr 00-14-5E-AB-CD-EF-00-00-00-00-00-00-00-00-00-00  \n"},
    };
    for (const auto& [type, expected] : kinds) {
        Link link = card();
        link.type = type;
        EXPECT_THAT(listing(link), HasSubstr(expected));
    }
}

TEST(IfconfigListing, PointToPointAndBroadcast) {
    Link link = card();
    const InetAddress inet = address("10.0.0.1");
    link.flags = IFF_POINTOPOINT;
    EXPECT_EQ(line(listing(link, &inet), 1),
              "          inet addr:10.0.0.1  P-t-P:10.9.9.9  Mask:255.255.255.0");
    link.flags = IFF_LOOPBACK;
    EXPECT_EQ(line(listing(link, &inet), 1), "          inet addr:10.0.0.1  Mask:255.255.255.0");
}

TEST(IfconfigListing, MasksOfEveryLength) {
    const Link link = card();
    InetAddress inet = address("10.0.0.1");
    const std::pair<unsigned, const char*> masks[] = {
        {0, "0.0.0.0"}, {1, "128.0.0.0"}, {8, "255.0.0.0"}, {31, "255.255.255.254"}, {32, "255.255.255.255"}};
    for (const auto& [prefix, mask] : masks) {
        inet.prefix = prefix;
        EXPECT_THAT(line(listing(link, &inet), 1), testing::EndsWith(std::string("  Mask:") + mask));
    }
}

TEST(IfconfigListing, Flags) {
    Link link = card();
    link.flags = 0xffff;
    EXPECT_EQ(line(listing(link), 1),
              "          UP BROADCAST DEBUG LOOPBACK POINTOPOINT NOTRAILERS RUNNING NOARP PROMISC ALLMULTI "
              "SLAVE MASTER "
              "MULTICAST DYNAMIC  MTU:1500  Metric:1");
    link.flags = 0x10000;  // the carrier's, which the classic call does not have
    EXPECT_EQ(line(listing(link), 1), "          [NO FLAGS]  MTU:1500  Metric:1");
}

TEST(IfconfigListing, ScopesOfInet6Addresses) {
    const Link link = card();
    const std::pair<unsigned, const char*> scopes[] = {{0, "Global"},  {0x10, "Host"},   {0x20, "Link"},
                                                       {0x40, "Site"}, {0x80, "Compat"}, {0x50, "Unknown"}};
    for (const auto& [scope, name] : scopes) {
        Inet6Address inet6;
        inet6.prefix = 128;
        inet6.scope = scope;
        Text text;
        listInterface(text, {"eth0", &link, nullptr, {&inet6}});
        EXPECT_EQ(line(text.str(), 1), std::string("          inet6 addr: ::/128 Scope:") + name);
    }
}

TEST(IfconfigListing, AnAliasHasNoCounters) {
    const Link link = card();
    Text text;
    listInterface(text, {"eth0:1", &link, nullptr, {}, true});
    EXPECT_EQ(text.str(),
              "eth0:1    Link encap:Ethernet  HWaddr 00:14:5E:AB:CD:EF  \n"
              "          UP BROADCAST RUNNING MULTICAST  MTU:1500  Metric:1\n\n");
}

TEST(IfconfigListing, TheCardLineShowsWhatThereIs) {
    Link link = card();
    EXPECT_THAT(listing(link), Not(HasSubstr("Interrupt")));
    link.card.baseAddress = 0xff;
    EXPECT_THAT(listing(link), Not(HasSubstr("Base address")));
    link.card.baseAddress = 0x100;
    EXPECT_THAT(listing(link), testing::EndsWith("\n          Base address:0x100 \n\n"));
    link.card.interrupt = 255;
    EXPECT_THAT(listing(link), testing::EndsWith("\n          Interrupt:255 Base address:0x100 \n\n"));
}

TEST(IfconfigListing, CompressingLinks) {
    Link link = card();
    link.type = ARPHRD_CSLIP;
    link.received.compressed = 3;
    link.sent.compressed = 4;
    EXPECT_THAT(listing(link), HasSubstr("frame:4\n             compressed:3\n          TX"));
    EXPECT_THAT(listing(link), HasSubstr("collisions:9 compressed:4 txqueuelen:1000 \n"));
}

}  // namespace
}  // namespace hosttools
