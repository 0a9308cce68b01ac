// What `ip -6 address` and `route` printed on many hosts, through the machine's own text tools.
#include "network/address_queries.h"
#include "network/route_queries.h"
#include "tests/network/recording.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"

namespace {

struct IPv6 {
    const char* file;
    bool parsed;
    const char* address;
    unsigned int prefixLength;
};

constexpr IPv6 kAddresses[] = {
    {"static", true, "2001:db8:4:1::31", 64},
    {"dynamic", true, "2001:db8:4:1:21a:64ff:fe0b:7c10", 64},
    {"static-then-dynamic", true, "2001:db8:4:1::31", 64},
    {"dynamic-then-static", true, "2001:db8:4:1::31", 64},
    {"two-static", true, "2001:db8:4:1::31", 64},
    {"two-dynamic", true, "2001:db8:7:7:21a:64ff:fe0b:7c10", 64},
    {"temporary-and-dynamic", true, "2001:db8:4:1:21a:64ff:fe0b:7c10", 64},
    {"temporary-static-dynamic", true, "2001:db8:4:1::31", 64},
    {"deprecated-dynamic", true, "2001:db8:4:1:21a:64ff:fe0b:7c10", 64},
    {"deprecated-static", true, "2001:db8:4:1::99", 64},
    {"deprecated-static-then-static", true, "2001:db8:4:1::99", 64},
    {"tentative", true, "2001:db8:4:1::40", 64},
    {"duplicate-found", true, "2001:db8:4:1::41", 64},
    {"dhcpv6", true, "2001:db8:4:1::1f3", 128},
    {"noprefixroute", true, "2001:db8:4:1::42", 64},
    {"home-address", true, "2001:db8:4:1::43", 64},
    {"unique-local", true, "fd12:3456:789a:1::31", 48},
    {"prefix-0", true, "2001:db8:4:1::44", 0},
    {"prefix-128", true, "2001:db8:4:1::45", 128},
    {"prefix-127", true, "2001:db8:4:1::46", 127},
    {"old-tool", true, "2001:db8:4:1::47", 64},
    {"mapped", true, "::ffff:192.0.2.1", 96},
    {"link-local-only", false, "", 0},
    {"site-local", false, "", 0},
    {"loopback", false, "", 0},
    {"down", false, "", 0},
    {"nothing", false, "", 0},
};

constexpr IPv6 kNearMisses[] = {
    // A line that is no address, or whose third field is none, is parsed in vain; the address stays.
    {"peer", false, "before", 0},
    {"device-named-global", false, "before", 0},
    {"device-named-global-with-address", false, "before", 0},
    {"one-line", false, "before", 0},
    {"no-prefix", false, "before", 0},
    {"carriage-returns", false, "before", 0},  // no control character enters a command
    {"brief", false, "", 0},
    {"upper-case-scope", false, "", 0},
    {"truncated", false, "", 0},
    {"truncated-behind-scope", true, "2001:db8:4:1::56", 64},
    {"empty-prefix", true, "2001:db8:4:1::52", 0},
    {"prefix-of-letters", true, "2001:db8:4:1::53", 0},
    {"two-slashes", true, "2001:db8:4:1::54", 64},
    {"dynamic-without-prefix", false, "", 0},
    // The last line read could not be parsed, yet what an earlier one gave is kept.
    {"dynamic-then-without-prefix", false, "2001:db8:4:1:21a:64ff:fe0b:7c10", 64},
};

void check(FakeHost& host, const IPv6& row) {
    SCOPED_TRACE(row.file);
    const LogCapture silent;
    host.tool("ip -6 address show dev eth0", recording(std::string("ip6/") + row.file + ".txt"));
    std::string address = "before";
    unsigned int prefixLength = 999;
    EXPECT_EQ(IC::getIPv6Address("eth0", address, prefixLength), row.parsed);
    EXPECT_EQ(address, row.address);
    EXPECT_EQ(prefixLength, row.prefixLength);
}

HOST_TEST(RecordedIPv6Addresses, AStaticOneWins) {
    for (const IPv6& row : kAddresses) {
        check(host, row);
    }
}

HOST_TEST(RecordedIPv6Addresses, NearMisses) {
    for (const IPv6& row : kNearMisses) {
        check(host, row);
    }
}

struct Gateway {
    const char* file;
    const char* device;
    bool found;
    const char* gateway;
};

constexpr Gateway kGateways[] = {
    {"one-default", "eth0", true, "192.168.17.1"},
    {"one-default", "eth1", false, ""},
    {"default-last", "eth0", true, "192.168.17.1"},
    {"two-defaults-two-metrics", "eth0", true, "192.168.17.1"},
    {"two-defaults-two-metrics", "eth1", true, "10.0.0.1"},
    {"two-defaults-one-port", "eth0", true, "192.168.17.254"},
    // The order of the table decides, not the metric.
    {"higher-metric-first", "eth0", true, "192.168.17.1"},
    {"second-port-on-link", "eth1", true, "192.168.17.1"},
    {"no-default", "eth0", false, "0.0.0.0"},
    {"no-default", "eth1", false, "0.0.0.0"},
    {"no-default", "eth2", false, ""},
    {"static-route-before-default", "eth0", true, "192.168.17.7"},
    {"host-route", "eth0", true, "192.168.17.3"},
    {"host-route-on-link", "eth0", false, "0.0.0.0"},
    {"reject-route", "eth0", true, "192.168.17.1"},
    {"point-to-point-default", "ppp0", true, "0.0.0.0"},
    {"point-to-point-default", "eth0", true, "0.0.0.0"},
    {"dynamic-flags", "eth0", true, "192.168.17.1"},
    {"ten-before-one", "eth10", true, "10.10.10.7"},
    {"bond", "bond0", true, "10.20.30.1"},
    {"bridge", "br0", true, "192.168.50.1"},
    {"docker", "docker0", true, "192.168.50.1"},
    {"docker", "enp3s0", true, "192.168.50.1"},
    {"many-metrics", "eth3", true, "10.3.0.1"},
    {"widest-fields", "eth0", true, "255.255.255.254"},
    {"fifteen-characters", "enp0s20f0u4c2i2", true, "169.254.95.118"},
    {"empty-table", "eth0", false, ""},
    {"nothing", "eth0", false, ""},
    // Names are matched anywhere in the line: eth1 has a gateway of eth10, and a VLAN's.
    {"ten-before-one", "eth1", true, "10.10.10.7"},
    {"vlan-only", "eth1", true, "10.10.0.1"},
    {"names-not-numbers", "eth0", true, "gw.example.net"},
    {"only-star", "eth0", true, "*"},
    {"truncated", "eth0", false, ""},
    {"truncated-last-line", "eth0", true, "192.16"},
    {"bsd-format", "en0", true, "192.168.17.1"},
    {"one-field", "eth0", false, ""},
    {"leading-blanks", "eth0", true, "192.168.17.1"},
    {"carriage-returns", "eth0", true, "192.168.17.1"},
    // Half of a split default route is the first line that looks like the default one.
    {"default-looks-alike", "eth1", true, "0.0.0.0"},
};

HOST_TEST(RecordedRoutes, GatewayOfAnInterface) {
    for (const Gateway& row : kGateways) {
        SCOPED_TRACE(std::string(row.file) + " " + row.device);
        host.tool("route -n", recording(std::string("route/") + row.file + ".txt"));
        std::string gateway = "before";
        EXPECT_EQ(IC::getIPV4Gateway(row.device, gateway), row.found);
        EXPECT_EQ(gateway, row.gateway);
    }
}

constexpr Gateway kGateways6[] = {
    {"one-default", "eth0", true, "2001:db8:4:1::1"},
    {"one-default", "lo", false, ""},
    {"advertised-default", "eth0", true, "fe80::1"},
    {"two-defaults", "eth0", true, "fe80::1"},
    {"two-ports", "eth0", true, "fe80::bb"},
    {"two-ports", "eth1", true, "fe80::aa"},
    {"static-route-first", "eth0", true, "2001:db8:4:1::7"},
    {"host-route-first", "eth0", true, "2001:db8:4:1::9"},
    {"cached-route", "eth0", true, "fe80::5"},
    {"on-link-only", "eth0", false, ""},
    {"default-without-next-hop", "ppp0", false, ""},
    {"reject-only", "lo", false, ""},
    {"vlan", "eth0.10", true, "fe80::c0"},
    {"bond", "bond0", true, "2001:db8:b0::1"},
    {"wide-columns", "eth0", true, "2001:db8:4:1::1"},
    {"wide-columns-advertised", "eth0", true, "fe80::21a:64ff:fe0b:1"},
    {"long-addresses", "eth0", true, "2001:db8:aaaa:bbbb:cccc:dddd:eeee:ffff"},
    {"mapped-next-hop", "eth0", true, "::ffff:192.168.17.1"},
    {"empty-table", "eth0", false, ""},
    {"nothing", "eth0", false, ""},
    {"no-inet6", "eth0", false, ""},
    {"ten-before-one", "eth1", true, "fe80::10"},
    {"vlan", "eth0", true, "fe80::c0"},
    {"gateway-in-name", "ethUG0", true, "::"},
    {"truncated", "eth0", false, ""},
    {"carriage-returns", "eth0", true, "fe80::1"},
    {"default-word", "eth0", true, "gw6.example.net"},
};

HOST_TEST(RecordedRoutes, IPv6GatewayOfAnInterface) {
    for (const Gateway& row : kGateways6) {
        SCOPED_TRACE(std::string(row.file) + " " + row.device);
        host.tool("route -A inet6 -n", recording(std::string("route6/") + row.file + ".txt"));
        std::string gateway = "before";
        EXPECT_EQ(IC::getIPV6Gateway(row.device, gateway), row.found);
        EXPECT_EQ(gateway, row.gateway);
    }
}

}  // namespace
