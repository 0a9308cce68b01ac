// What a plug-in writes to files is brought into the running host: on links of a real kernel.
#include "agent/change/in_force.h"

#include <gmock/gmock.h>

#include "agent/change/standing.h"
#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"

namespace {

using cvagent::EffectInForce;
using cvagent::findProperty;
using cvagent::NodeType;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr unsigned int kAddress = 25;
constexpr unsigned int kMask = 26;
constexpr unsigned int kIpv6Address = 27;
constexpr unsigned int kGateway = 100;
constexpr unsigned int kIpv6Gateway = 101;
constexpr unsigned int kPrefixLength = 102;

class InForce : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("ip");
        host.realTool("ifconfig");
        host.useKernelNetwork();
        ip(host, "link add eth0 type veth peer name sw0");
        ip(host, "link add eth1 type veth peer name sw1");
        for (const char* link : {"eth0", "sw0", "eth1", "sw1"}) {
            ip(host, std::string("link set ") + link + " up");
        }
        for (const char* link : {"eth0", "sw0", "eth1", "sw1"}) {
            ASSERT_TRUE(carrierComes(link));
        }
        host.run({"sh", "-c", "echo 0 > /proc/sys/net/ipv6/conf/eth0/dad_transmits"});
        hardware_ = host.run({"cat", "/sys/class/net/eth0/address"}).out;
        hardware_.pop_back();
    }

    static std::string ip(FakeHost& host, const std::string& words) {
        const Finished done = host.run({"sh", "-c", "ip " + words});
        EXPECT_EQ(done.status, 0) << words << ": " << done.err;
        return done.out;
    }
    void file(FakeHost& host, const std::string& content) {
        host.file("/etc/sysconfig/network/ifcfg-eth-id-" + hardware_, "BOOTPROTO=static\n" + content);
    }
    /// A write of the plug-in, which does what the deed does.
    static EffectInForce write(unsigned int property, const std::string& value,
                               const std::function<void()>& deed) {
        IC::MutableNode node(7, 1, {}, static_cast<unsigned int>(NodeType::ipConfig), 1);
        node.setPath("/oshw/network-port:eth0/ip-config:eth0");
        const auto* row = findProperty(static_cast<unsigned int>(NodeType::ipConfig), property);
        const auto after = cvagent::change::bringingIntoForce()(node, *row, IC::PropertyValue(value, true));
        deed();
        return after ? after() : EffectInForce{"nothing was to be done", {}};
    }
    /// Whether another host has an IPv6 address is asked at once, not within a second.
    static void askTheLink(FakeHost& host) {
        ASSERT_EQ(host.run({"sh", "-c",
                            "cd /proc/sys/net/ipv6/conf/eth0; echo 1 > dad_transmits; echo 0 > "
                            "router_solicitation_delay; echo 200 > "
                            "/proc/sys/net/ipv6/neigh/eth0/retrans_time_ms"})
                      .status,
                  0);
    }
    /// The addresses of eth0, in the kernel's order.
    static std::vector<std::string> addresses(FakeHost& host, const std::string& family = "-4") {
        return linesOf(ip(host, "-o " + family + " address show dev eth0 scope global | awk '{print $4}'"));
    }
    static std::vector<std::string> routes(FakeHost& host) {
        return linesOf(ip(host,
                          "-4 route show table all | grep -v -e 'proto kernel' -e 'table local'"
                          " | sed 's/ *$//'"));
    }
    static std::vector<std::string> linesOf(const std::string& text) {
        std::istringstream in(text);
        std::vector<std::string> lines;
        for (std::string line; std::getline(in, line);) {
            lines.push_back(line);
        }
        return lines;
    }

    std::string hardware_;
};

HOST_TEST_F(InForce, AnAddressTakesThePlaceOfTheOldOne) {
    ip(host, "address add 192.0.2.10/24 broadcast + dev eth0");
    ip(host, "route add default via 192.0.2.1");
    ip(host, "route add 10.0.0.0/8 via 192.0.2.2 src 192.0.2.10 metric 5 table 77");
    const EffectInForce effect =
        write(kAddress, "192.0.2.20", [&] { file(host, "IPADDR=192.0.2.20\nNETMASK=255.0.0.0\n"); });
    EXPECT_EQ(effect.lacking, "");
    EXPECT_THAT(effect.notes, IsEmpty());
    EXPECT_THAT(addresses(host), ElementsAre("192.0.2.20/24")) << "the running mask counts";
    EXPECT_THAT(routes(host),
                ElementsAre("10.0.0.0/8 via 192.0.2.2 dev eth0 table 77 src 192.0.2.20 metric 5",
                            "default via 192.0.2.1 dev eth0"));
    EXPECT_THAT(ip(host, "-o -4 address show dev eth0"), HasSubstr("brd 192.0.2.255"));
}

HOST_TEST_F(InForce, OtherAddressesStayBehindTheNewOne) {
    for (const char* each : {"192.0.2.10/24", "192.0.2.11/24", "192.0.2.12/24 label eth0:1", "10.0.0.1/8"}) {
        ip(host, std::string("address add ") + each + " dev eth0");
    }
    ip(host, "route add 203.0.113.0/24 via 10.0.0.9");
    for (const char* promoted : {"0", "1"}) {
        host.run({"sh", "-c",
                  std::string("echo ") + promoted + " > /proc/sys/net/ipv4/conf/eth0/promote_secondaries"});
        const std::string next = promoted[0] == '0' ? "192.0.2.20" : "192.0.2.30";
        const EffectInForce effect = write(kAddress, next, [&] { file(host, "IPADDR=" + next + "\n"); });
        EXPECT_EQ(effect.lacking, "");
        EXPECT_THAT(effect.notes, IsEmpty());
        const auto now = addresses(host);
        EXPECT_THAT(ip(host, "-o -4 address show dev eth0 label eth0 | head -n 1"), HasSubstr(next + "/24"))
            << promoted;
        EXPECT_THAT(
            now, testing::UnorderedElementsAre(next + "/24", "192.0.2.11/24", "192.0.2.12/24", "10.0.0.1/8"));
        EXPECT_THAT(ip(host, "-o -4 address show dev eth0"), HasSubstr("eth0:1"));
        EXPECT_THAT(routes(host), ElementsAre("203.0.113.0/24 via 10.0.0.9 dev eth0"));
    }
}

HOST_TEST_F(InForce, ARouteThatCannotStayIsTold) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    ip(host, "route add default via 192.0.2.1 src 192.0.2.10");
    const EffectInForce effect =
        write(kAddress, "198.51.100.7", [&] { file(host, "IPADDR=198.51.100.7\n"); });
    EXPECT_EQ(effect.lacking, "");
    EXPECT_THAT(addresses(host), ElementsAre("198.51.100.7/24"));
    EXPECT_THAT(effect.notes, ElementsAre(HasSubstr("the route default via 192.0.2.1 dev eth0 is gone: ")));
}

HOST_TEST_F(InForce, AMaskKeepsTheRoutesThatGoWithIt) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    ip(host, "address add 192.0.2.11/24 dev eth0");
    ip(host, "route add default via 192.0.2.1");
    file(host, "IPADDR=192.0.2.10\nNETMASK=255.255.255.0\n");
    const EffectInForce effect = write(kMask, "255.255.0.0", [&] {
        file(host, "IPADDR=192.0.2.10\nNETMASK=255.255.0.0\n");
        // as the plug-in's command does
        ip(host, "address del 192.0.2.10/24 dev eth0");
        ip(host, "address add 192.0.2.10/16 dev eth0");
    });
    EXPECT_EQ(effect.lacking, "");
    EXPECT_EQ(addresses(host).front(), "192.0.2.10/16");
    EXPECT_THAT(addresses(host), testing::UnorderedElementsAre("192.0.2.10/16", "192.0.2.11/24"));
    EXPECT_THAT(routes(host), ElementsAre("default via 192.0.2.1 dev eth0"));
}

HOST_TEST_F(InForce, AnAddressWithoutAMaskWaitsForIt) {
    const EffectInForce early = write(kAddress, "192.0.2.9", [&] { file(host, "IPADDR=192.0.2.9\n"); });
    EXPECT_THAT(early.lacking, HasSubstr("no mask or prefix length is known"));
    EXPECT_THAT(addresses(host), IsEmpty());
    const EffectInForce late =
        write(kMask, "255.255.255.0", [&] { file(host, "IPADDR=192.0.2.9\nNETMASK=255.255.255.0\n"); });
    EXPECT_EQ(late.lacking, "");
    EXPECT_THAT(addresses(host), ElementsAre("192.0.2.9/24"));
}

HOST_TEST_F(InForce, ALeaseThatIsReplacedIsTold) {
    ip(host, "address add 192.0.2.10/24 dev eth0 valid_lft 3000 preferred_lft 3000");
    const EffectInForce effect = write(kAddress, "192.0.2.20", [&] { file(host, "IPADDR=192.0.2.20\n"); });
    EXPECT_THAT(effect.notes, ElementsAre(HasSubstr("a DHCP client that still runs may bring it back")));
    EXPECT_THAT(addresses(host), ElementsAre("192.0.2.20/24"));
}

HOST_TEST_F(InForce, NothingComesOfAFileThatWasNotWritten) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    file(host, "IPADDR=192.0.2.10\nNETMASK=255.255.255.0\n");
    for (const auto& [property, value] :
         std::vector<std::pair<unsigned, std::string>>{{kAddress, "192.0.2.20"},
                                                       {kMask, "255.255.0.0"},
                                                       {kGateway, "192.0.2.1"},
                                                       {kIpv6Address, "2001:db8::7"},
                                                       {kPrefixLength, "64"}}) {
        const EffectInForce effect = write(property, value, [] {});
        EXPECT_EQ(effect.lacking, "") << property;
    }
    EXPECT_THAT(addresses(host), ElementsAre("192.0.2.10/24"));
    EXPECT_THAT(addresses(host, "-6"), IsEmpty());
    EXPECT_THAT(routes(host), IsEmpty());
}

/// The host has it until its restart, which is told; the plug-in's files are none of such a host's.
HOST_TEST_F(InForce, WhereNobodyKeepsTheInterfaceTheRunningHostAloneHasIt) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    ip(host, "route add default via 192.0.2.1 metric 5");
    const auto written = [](unsigned int property, const std::string& value) {
        const EffectInForce effect = write(property, value, [] {});
        EXPECT_EQ(effect.lacking, "") << property;
        EXPECT_TRUE(effect.isForNow && !effect.isKept) << property;
        ASSERT_FALSE(effect.notes.empty());
        EXPECT_EQ(effect.notes.back(), "not kept over a restart: nobody is known who keeps 'eth0'");
    };
    written(kAddress, "192.0.2.20");
    written(kMask, "255.255.255.128");
    written(kGateway, "192.0.2.2");
    EXPECT_THAT(addresses(host), ElementsAre("192.0.2.20/25"));
    EXPECT_THAT(routes(host), ElementsAre("default via 192.0.2.2 dev eth0 proto static metric 5"));
    ip(host, "address add 2001:db8::1/64 dev eth0 nodad");
    written(kIpv6Address, "2001:db8::7");
    written(kPrefixLength, "56");
    EXPECT_THAT(addresses(host, "-6"), ElementsAre("2001:db8::7/56"));
    EXPECT_FALSE(write(kIpv6Gateway, "2001:db8::2", [] {}).isForNow);
}

/// The plug-in writes an address beside an origin alone; a restart would bring back what the file says.
HOST_TEST_F(InForce, NothingComesOfAFileThatTellsNoOrigin) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    host.file("/etc/sysconfig/network/ifcfg-eth-id-" + hardware_, "IPADDR=192.0.2.10\n");
    EXPECT_FALSE(write(kAddress, "192.0.2.20", [] {}).isForNow);
    EXPECT_THAT(addresses(host), ElementsAre("192.0.2.10/24"));
}

HOST_TEST_F(InForce, AnIpv6AddressComesAndTheOldOneGoes) {
    ip(host, "-6 address add 2001:db8::1/64 dev eth0 nodad");
    ip(host, "-6 address add 2001:db8::2/64 dev eth0 nodad");
    const EffectInForce effect =
        write(kIpv6Address, "2001:db8::9", [&] { file(host, "IPADDR_1=2001:db8::9\nPREFIXLEN_1=56\n"); });
    EXPECT_EQ(effect.lacking, "");
    EXPECT_THAT(addresses(host, "-6"), testing::Contains("2001:db8::9/56"));
    EXPECT_THAT(addresses(host, "-6"), testing::SizeIs(2));
    write(kPrefixLength, "48", [&] { file(host, "IPADDR_1=2001:db8::9\nPREFIXLEN_1=48\n"); });
    EXPECT_THAT(addresses(host, "-6"), testing::Contains("2001:db8::9/48"));
    EXPECT_THAT(addresses(host, "-6"), testing::SizeIs(2));
}

/// The host at the other end of the cable has it.
HOST_TEST_F(InForce, AnIpv6AddressOfAnotherHostIsToldAndTheOldOneStays) {
    const auto write9 = [&](const std::string& address) {
        return write(kIpv6Address, address,
                     [&] { file(host, "IPADDR_1=" + address + "\nPREFIXLEN_1=64\n"); });
    };
    askTheLink(host);
    ip(host, "-6 address add 2001:db8::1/64 dev eth0 nodad");
    ip(host, "-6 address add 2001:db8::9/64 dev sw0 nodad");
    EXPECT_THAT(write9("2001:db8::9").lacking, HasSubstr("another host has 2001:db8::9"));
    EXPECT_THAT(addresses(host, "-6"), testing::UnorderedElementsAre("2001:db8::1/64", "2001:db8::9/64"));
    IC::MutableNode node(7, 1, {}, static_cast<unsigned int>(NodeType::ipConfig), 1);
    node.setPath("/oshw/network-port:eth0/ip-config:eth0");
    cvagent::Reading reading;
    reading.row = findProperty(static_cast<unsigned int>(NodeType::ipConfig), kIpv6Address);
    reading.value = IC::PropertyValue("2001:db8::9", true);
    EXPECT_EQ(cvagent::change::standingOf(node, *reading.row, reading.value, reading).reason,
              "another host has it, so this one does not use it");
    // The next one takes the place of both.
    EXPECT_EQ(write9("2001:db8::7").lacking, "");
    EXPECT_THAT(addresses(host, "-6"), ElementsAre("2001:db8::7/64"));
}

HOST_TEST_F(InForce, AGatewayTakesThePlaceOfTheOneWithItsMetric) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    ip(host, "address add 198.51.100.10/24 dev eth1");
    ip(host, "route add default via 198.51.100.1 dev eth1 metric 10");
    ip(host, "route add default via 192.0.2.1 dev eth0 metric 100");
    const auto routesFile = [&host](const std::string& gateway) {
        return
            [&host, gateway] { host.file("/etc/sysconfig/network/routes", "default\t" + gateway + "\t-\n"); };
    };
    EffectInForce effect = write(kGateway, "192.0.2.254", routesFile("192.0.2.254"));
    EXPECT_EQ(effect.lacking, "");
    EXPECT_THAT(effect.notes, ElementsAre("the route default via 192.0.2.1 dev eth0 is replaced"));
    EXPECT_THAT(routes(host), ElementsAre("default via 198.51.100.1 dev eth1 metric 10",
                                          "default via 192.0.2.254 dev eth0 proto static metric 100"));
    effect = write(kGateway, "10.9.9.9", routesFile("10.9.9.9"));
    EXPECT_THAT(effect.lacking, HasSubstr("no interface has a subnet with this gateway"));
    effect = write(kGateway, "198.51.100.1", routesFile("198.51.100.1"));
    EXPECT_EQ(effect.lacking, "");
    EXPECT_THAT(routes(host), testing::SizeIs(2)) << "it is there";
}

HOST_TEST_F(InForce, WhatTheKernelRefusesIsTold) {
    ip(host, "address add 192.0.2.10/24 dev eth0");
    ip(host, "link set eth0 down");
    const EffectInForce effect = write(kGateway, "192.0.2.1", [&host] {
        host.file("/etc/sysconfig/network/routes", "default\t192.0.2.1\t-\n");
    });
    EXPECT_THAT(effect.lacking, HasSubstr("the running host does not take the gateway: "));
}

}  // namespace
