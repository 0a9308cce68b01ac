// What classic `ifconfig` printed for many interfaces, through the machine's own text tools.
#include "network/address_queries.h"
#include "network/link_queries.h"
#include "tests/network/recording.h"
#include "tests/support/fake_host.h"

namespace {

struct IPv4 {
    const char* address;
    const char* mask;
};
using Kind = std::optional<unsigned int>;
constexpr std::nullopt_t kNone = std::nullopt;

struct Recorded {
    const char* file;
    const char* device;
    const char* hardwareAddress;
    std::optional<IPv4> ipv4;
    Kind kind;  ///< of a global IPv6 address
};

constexpr Recorded kInterfaces[] = {
    {"ethernet", "eth0", "00:1a:64:0b:7c:10", IPv4{"192.168.17.4", "255.255.255.0"}, 7},
    {"ethernet-ipv4-only", "eth0", "00:1a:64:0b:7c:11", IPv4{"10.3.0.9", "255.255.252.0"}, 7},
    {"ethernet-ipv6-link-only", "eth1", "00:1a:64:0b:7c:12", kNone, 5},
    {"ethernet-no-address", "eth2", "00:1a:64:0b:7c:13", kNone, kNone},
    {"ethernet-down", "eth3", "00:1a:64:0b:7c:14", kNone, kNone},
    {"ethernet-several-inet6", "eth0", "00:0c:29:5e:aa:01", IPv4{"172.16.200.31", "255.255.0.0"}, 7},
    {"ethernet-global-first", "eth1", "00:0c:29:5e:aa:02", kNone, 5},
    {"ethernet-site-only", "eth1", "00:0c:29:5e:aa:03", kNone, 5},
    {"ethernet-compat-scope", "eth1", "00:0c:29:5e:aa:04", kNone, 5},
    {"ethernet-unknown-scope", "eth1", "00:0c:29:5e:aa:05", kNone, 5},
    {"ethernet-promiscuous", "eth0", "00:50:56:9c:00:20", IPv4{"192.0.2.20", "255.255.255.240"}, 7},
    {"ethernet-jumbo", "eth4", "00:02:c9:4e:00:d0", IPv4{"10.250.1.1", "255.255.255.0"}, 7},
    {"ethernet-no-broadcast", "eth5", "52:54:00:12:34:56", IPv4{"198.51.100.5", "255.255.255.255"}, 7},
    {"ethernet-host-route-mask", "eth6", "52:54:00:12:34:57", IPv4{"203.0.113.77", "255.255.255.255"}, 7},
    {"ethernet-class-a", "eth7", "52:54:00:12:34:58", IPv4{"10.255.255.254", "255.0.0.0"}, 7},
    {"ethernet-zero-mask", "eth8", "52:54:00:12:34:59", IPv4{"1.2.3.4", "0.0.0.0"}, 7},
    {"ethernet-lower-case", "eth0", "de:ad:be:ef:00:01", IPv4{"192.168.122.50", "255.255.255.0"}, 7},
    {"ethernet-zero-address", "usb0", "00:00:00:00:00:00", kNone, kNone},
    {"bond-master", "bond0", "00:1b:21:a0:00:0a", IPv4{"10.20.30.40", "255.255.254.0"}, 7},
    {"bond-member", "eth0", "00:1b:21:a0:00:0a", kNone, kNone},
    {"bond-without-address", "bond1", "00:00:00:00:00:00", kNone, kNone},
    {"alias", "eth0:1", "00:1a:64:0b:7c:10", IPv4{"192.168.17.104", "255.255.255.0"}, 7},
    {"vlan", "eth0.10", "00:1a:64:0b:7c:10", IPv4{"10.10.0.4", "255.255.255.0"}, 7},
    {"bridge", "br0", "00:25:90:77:00:31", IPv4{"192.168.50.2", "255.255.255.0"}, 7},
    {"esx-service-console", "vswif0", "00:50:56:41:0f:33", IPv4{"10.0.5.33", "255.255.255.0"}, 7},
    {"esx-port", "vmnic1", "00:1e:0b:cc:40:2e", kNone, kNone},
    {"wireless", "wlan0", "00:13:02:4f:91:ac", IPv4{"192.168.1.101", "255.255.255.0"}, 7},
    {"dummy", "dummy0", "9a:3b:55:07:1c:f2", kNone, kNone},
    // The loopback's line has no broadcast field, so that the mask stands in the third one, not the fourth.
    {"loopback", "lo", "", IPv4{"127.0.0.1", ""}, 7},
    {"loopback-ipv4-only", "lo", "", IPv4{"127.0.0.1", ""}, 7},
    {"loopback-ipv6-only", "lo", "", kNone, 5},
    {"ppp", "ppp0", "", IPv4{"10.64.64.64", "255.255.255.255"}, 7},
    {"tunnel", "tun0", "00-00-00-00-00-00-00-00-00-00-00-00-00-00-00-00", IPv4{"10.8.0.6", "255.255.255.255"},
     7},
    {"tunnel-6in4", "sit1", "", kNone, 5},
    {"infiniband", "ib0", "80:00:00:48:fe:80:00:00:00:00:00:00:00:00:00:00:00:00:00:00",
     IPv4{"10.99.0.1", "255.255.255.0"}, 7},
    // The title of the link is three words here, and one of them stands where the address does elsewhere.
    {"token-ring", "tr0", "token", IPv4{"10.1.1.1", "255.255.255.0"}, 7},
    {"fifteen-characters", "enp0s20f0u4c2i2", "0a:94:ef:5c:11:70", IPv4{"169.254.95.120", "255.255.255.0"},
     7},
    {"busybox", "eth0", "02:42:ac:11:00:02", IPv4{"172.17.0.2", "255.255.0.0"}, 7},
};

constexpr Recorded kNearMisses[] = {
    {"missing-device", "eth9", "", kNone, kNone},
    {"new-format", "eth0", "", kNone, kNone},
    {"bsd-format", "em0", "", kNone, kNone},
    {"german", "eth0", "", kNone, kNone},
    {"truncated-in-address-line", "eth0", "00:1a:64:0b:7c:10", IPv4{"192.168.17.4", ""}, 7},
    {"truncated-in-mask", "eth0", "00:1a:64:0b:7c:10", IPv4{"192.168.17.4", "255.25"}, 7},
    {"truncated-in-hwaddr", "eth0", "00:1a:64", kNone, kNone},
    {"hwaddr-without-address", "eth0", "", kNone, kNone},
    {"empty-inet-addr", "eth0", "00:1a:64:0b:7c:10", IPv4{"", ""}, kNone},
    {"inet-address-spelled-out", "eth0", "00:1a:64:0b:7c:10", kNone, kNone},
    {"lower-case-labels", "eth0", "", kNone, kNone},
    {"carriage-returns", "eth0", "00:1a:64:0b:7c:10\r", IPv4{"192.168.17.4", "255.255.255.0\r"}, 7},
    {"binary-noise", "eth0", "", kNone, kNone},
};

Kind kindOf(const std::string& device) {
    unsigned int kind = 99;
    const bool set = IC::getIPv6AddressType(device, kind);
    EXPECT_TRUE(set || kind == 99) << "touched without an answer";
    return set ? Kind(kind) : kNone;
}

void checkAddress(const Recorded& recorded) {
    std::string address = "before";
    std::string mask = "before";
    EXPECT_EQ(IC::getIPv4Details(recorded.device, address, mask), recorded.ipv4.has_value());
    EXPECT_EQ(address, recorded.ipv4 ? recorded.ipv4->address : "before");
    EXPECT_EQ(mask, recorded.ipv4 ? recorded.ipv4->mask : "before");
}

void check(FakeHost& host, const Recorded& recorded) {
    SCOPED_TRACE(recorded.file);
    const std::string device = recorded.device;
    host.tool("ifconfig " + device, recording(std::string("ifconfig/") + recorded.file + ".txt"));
    host.tool("ip -6 address show dev " + device, recording("ip6/static.txt"));
    std::string hardwareAddress = "before";
    IC::getHardwareAddress(device, hardwareAddress);
    EXPECT_EQ(hardwareAddress, recorded.hardwareAddress);
    checkAddress(recorded);
    EXPECT_EQ(kindOf(device), recorded.kind);
}

HOST_TEST(RecordedIfconfig, InterfacesOfManyKinds) {
    for (const Recorded& recorded : kInterfaces) {
        check(host, recorded);
    }
}

HOST_TEST(RecordedIfconfig, NearMisses) {
    for (const Recorded& recorded : kNearMisses) {
        check(host, recorded);
    }
}

struct Listed {
    const char* file;
    const char* name;
    bool listed;
};

constexpr Listed kListings[] = {
    {"two-ports", "eth0", true},
    {"two-ports", "eth1", true},
    {"two-ports", "lo", true},
    {"two-ports", "eth2", false},
    {"two-ports", "eth10", false},
    {"two-ports", "ETH0", false},
    // Any part of any line will do.
    {"two-ports", "eth", true},
    {"two-ports", "packets", true},
    {"eleventh-port", "eth1", true},
    {"vlan-on-eth1", "eth1", true},
    {"vlan-on-eth1", "eth1.10", true},
    {"vlan-on-eth1", "eth1.1", true},
    {"vlan-on-eth1", "eth1.20", false},
    {"bond-alias-only", "bond0", true},
    {"bond-alias-only", "bond1", false},
    {"loopback-only", "eth0", false},
    {"none-up", "lo", false},
};

HOST_TEST(RecordedIfconfig, ListsAnInterfaceWhoseLinesHoldTheName) {
    for (const Listed& row : kListings) {
        SCOPED_TRACE(std::string(row.file) + " " + row.name);
        const std::string listing = recording(std::string("ifconfig/all/") + row.file + ".txt");
        host.remove(IC::ifconfigSnapshotPath);
        host.tool("ifconfig", listing);
        EXPECT_EQ(IC::isInterfaceUP(row.name), row.listed);
        host.tool("ifconfig", "");
        host.file(IC::ifconfigSnapshotPath, listing);
        EXPECT_EQ(IC::isInterfaceUP(row.name), row.listed) << "from the snapshot";
    }
}

}  // namespace
