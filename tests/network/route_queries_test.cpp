#include "network/route_queries.h"

#include <gmock/gmock.h>

#include "network/dhcp_queries.h"
#include "tests/network/recording.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

HOST_TEST(IPv4Gateway, IsTheFirstOneOfTheInterface) {
    host.tool("route -n", recording("route/default-last.txt"));
    const CommandLines commands;
    const LogCapture capture;
    std::string gateway = "before";
    EXPECT_TRUE(IC::getIPV4Gateway("eth0", gateway));
    EXPECT_EQ(gateway, "192.168.17.1");
    EXPECT_THAT(commands.all(), TextsAre("route -n | grep eth0 | tr -s ' ' 2> /dev/null"));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("getIPV4Gateway: entry", "Buff :192.168.17.0 0.0.0.0 255.255.255.0 U 0 0 0 eth0\n",
                         "Buff :169.254.0.0 0.0.0.0 255.255.0.0 U 0 0 0 eth0\n",
                         "Buff :0.0.0.0 192.168.17.1 0.0.0.0 UG 0 0 0 eth0\n", "getIPV4Gateway: exit"));
}

HOST_TEST(IPv4Gateway, OfAnInterfaceWithOnLinkRoutesIsTheHostsDefault) {
    host.tool("route -n", recording("route/second-port-on-link.txt"));
    const CommandLines commands;
    const LogCapture capture;
    std::string gateway;
    EXPECT_TRUE(IC::getIPV4Gateway("eth1", gateway));
    EXPECT_EQ(gateway, "192.168.17.1");
    EXPECT_THAT(commands.all(),
                TextsAre("route -n | grep eth1 | tr -s ' ' 2> /dev/null",
                         "route -n | grep \"^0.0.0.0\" | tr -s ' ' | cut -d ' ' -f2 2> /dev/null"));
    EXPECT_THAT(capture.messages(3000), testing::Contains("gw :0.0.0.0"));
}

HOST_TEST(IPv4Gateway, WithoutADefaultRouteTheOnLinkMarkStays) {
    host.tool("route -n", recording("route/no-default.txt"));
    std::string gateway = "before";
    EXPECT_FALSE(IC::getIPV4Gateway("eth1", gateway));
    EXPECT_EQ(gateway, "0.0.0.0");
}

HOST_TEST(IPv4Gateway, OfAnInterfaceWithoutRoutesIsNone) {
    host.tool("route -n", recording("route/one-default.txt"));
    const CommandLines commands;
    const LogCapture capture;
    std::string gateway = "before";
    EXPECT_FALSE(IC::getIPV4Gateway("eth5", gateway));
    EXPECT_EQ(gateway, "");
    EXPECT_EQ(commands.all().size(), 1U) << "the host's default was asked for";
    EXPECT_THAT(capture.messages(3000), TextsAre("getIPV4Gateway: entry", "gw :", "getIPV4Gateway: exit"));
}

HOST_TEST(IPv4Gateway, SeesTheRoutesOfLongerNames) {
    host.tool("route -n", recording("route/ten-before-one.txt"));
    std::string gateway;
    EXPECT_TRUE(IC::getIPV4Gateway("eth1", gateway));
    EXPECT_EQ(gateway, "10.10.10.7") << "the first of eth10, not the host's default";
}

HOST_TEST(IPv4Gateway, EmptyFieldOfALineThatWasCutOffEndsTheSearchToo) {
    host.tool("route -n", "eth0 \n0.0.0.0 192.168.17.1 0.0.0.0 UG 0 0 0 eth0\n");
    std::string gateway = "before";
    EXPECT_TRUE(IC::getIPV4Gateway("eth0", gateway));
    EXPECT_EQ(gateway, "");
}

HOST_TEST(IPv6Gateway, IsTheNextHopOfTheFirstRouteThatHasOne) {
    host.tool("route -A inet6 -n", recording("route6/two-ports.txt"));
    const CommandLines commands;
    const LogCapture capture;
    std::string gateway = "before";
    EXPECT_TRUE(IC::getIPV6Gateway("eth0", gateway));
    EXPECT_EQ(gateway, "fe80::bb");
    EXPECT_FALSE(IC::getIPV6Gateway("eth9", gateway));
    EXPECT_EQ(gateway, "");
    EXPECT_EQ(
        commands.all()[0],
        "route -A inet6 -n 2> /dev/null | grep eth0 | grep UG | tr -s ' ' | cut -d ' ' -f2 2> /dev/null");
    EXPECT_THAT(capture.messages(), TextsAre("getIPV6Gateway: entry", "getIPV6Gateway: exit",
                                             "getIPV6Gateway: entry", "getIPV6Gateway: exit"));
}

HOST_TEST(Gateways, WithoutAShellAreNone) {
    const LogCapture capture;
    std::string gateway = "before";
    std::string gateway6 = "before";
    {
        const NoDescriptors none;
        EXPECT_FALSE(IC::getIPV4Gateway("eth0", gateway));
        EXPECT_FALSE(IC::getIPV6Gateway("eth0", gateway6));
    }
    EXPECT_EQ(gateway + gateway6, "");
    EXPECT_THAT(capture.messages(), TextsAre("getIPV4Gateway: entry", "getIPV4Gateway: exit",
                                             "getIPV6Gateway: entry", "getIPV6Gateway: exit"));
}

HOST_TEST(Gateways, OfAnOverlongNameAreNone) {
    const LogCapture silent;
    const CommandLines commands;
    std::string gateway = "before";
    EXPECT_FALSE(IC::getIPV4Gateway(std::string(600, 'x'), gateway));
    EXPECT_FALSE(IC::getIPV6Gateway(std::string(600, 'x'), gateway));
    EXPECT_EQ(gateway, "");
    EXPECT_THAT(commands.all(), IsEmpty());
}

TEST(IPv6GatewayAddress, IsATextWithAColon) {
    const LogCapture capture;
    for (const char* text : {"::", "fe80::1", "2001:db8::1", ":", "eth0:1", "192.168.17.1:80"}) {
        EXPECT_TRUE(IC::isIPv6GatewayAddressPresent(text)) << text;
    }
    for (const char* text : {"", "192.168.17.1", "0.0.0.0", "fe80.1", "default", "*", "-"}) {
        EXPECT_FALSE(IC::isIPv6GatewayAddressPresent(text)) << text;
    }
    EXPECT_EQ(capture.messages()[0], "isIPv6GatewayAddressPresent: entry");
    EXPECT_EQ(capture.messages()[1], "isIPv6GatewayAddressPresent: exit");
}

HOST_TEST(DhcpLease, IsTheFileOfTheInterface) {
    const CommandLines commands;
    const LogCapture capture;
    EXPECT_FALSE(IC::checkIsDhcp("eth0"));
    host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", "IPADDR=10.0.0.7\n");
    EXPECT_TRUE(IC::checkIsDhcp("eth0"));
    EXPECT_EQ(commands.all()[0], "cat /var/lib/dhcpcd/dhcpcd-eth0.info 2> /dev/null");
    EXPECT_EQ(capture.messages(3000)[0], "NetworkPortNode::checkIsDhcp : entry");
    EXPECT_EQ(capture.messages(3000)[1], "NetworkPortNode::checkIsDhcp : exit");
}

HOST_TEST(BootProtocol, IsReadFromTheFileOfTheHardwareAddress) {
    host.tool("ifconfig eth0", recording("ifconfig/ethernet.txt"));
    host.file("/etc/sysconfig/network/ifcfg-eth-id-00:1a:64:0b:7c:10", "BOOTPROTO='dhcp'\n");
    const CommandLines commands;
    const LogCapture capture;
    std::string keyword = "before";
    IC::getBootProto("eth0", keyword);
    EXPECT_EQ(keyword, "dhcp");
    EXPECT_THAT(commands.all(),
                TextsAre("cat /etc/sysconfig/network/ifcfg-eth-id-`ifconfig eth0 2> /dev/null |grep HWaddr "
                         "|awk '{print $5}'|tr '[A-Z]' '[a-z]'` | grep BOOTPROTO | cut -d '=' -f2 "
                         "2> /dev/null"));
    EXPECT_THAT(capture.messages(), TextsAre("Entering getBootProto", "Exiting getBootProto"));
}

HOST_TEST(BootProtocol, OfAnInterfaceWithoutAFileIsEmpty) {
    host.tool("ifconfig eth0", recording("ifconfig/ethernet.txt"));
    std::string keyword = "before";
    IC::getBootProto("eth0", keyword);
    EXPECT_EQ(keyword, "");
}

HOST_TEST(DhcpQueries, WithoutAShellFindNothing) {
    std::string keyword = "before";
    std::string server = "before";
    const NoDescriptors none;
    EXPECT_FALSE(IC::checkIsDhcp("eth0"));
    EXPECT_FALSE(IC::getDHCPv6Servers("eth0", server));
    IC::getBootProto("eth0", keyword);
    EXPECT_EQ(keyword, "");
    EXPECT_EQ(server, "before");
}

HOST_TEST(DhcpQueries, OverlongNamesFindNothing) {
    const LogCapture capture;
    const CommandLines commands;
    std::string keyword = "before";
    EXPECT_FALSE(IC::checkIsDhcp(std::string(600, 'x')));
    IC::getBootProto(std::string(600, 'x'), keyword);
    EXPECT_EQ(keyword, "");
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_EQ(capture.messages(6000).size(), 2U);
}

HOST_TEST(DhcpV6Servers, AreReadFromEveryLeaseFileWhateverTheInterface) {
    host.file("/var/lib/dhcpv6/client6.leases", "lease {\n}\n");
    host.file("/var/lib/dhcpv6/client6.leases.eth1", "\t SDUID 00:01:00:06;\n");
    const CommandLines commands;
    const LogCapture capture;
    std::string server;
    EXPECT_TRUE(IC::getDHCPv6Servers("eth0", server));
    EXPECT_EQ(server, "00:01:00:06");
    EXPECT_THAT(commands.all(), TextsAre("cat /var/lib/dhcpv6/client6.leases* 2> /dev/null | grep SDUID"
                                         " | cut -d ' ' -f3 2> /dev/null"));
    EXPECT_THAT(capture.messages(), TextsAre("getDHCPv6Servers: entry", "getDHCPv6Servers: exit"));
}

}  // namespace
