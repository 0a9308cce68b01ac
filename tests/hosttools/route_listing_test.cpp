#include "hosttools/route_listing.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/hosttools/host_tree.h"
#include "tests/hosttools/network_namespace.h"
#include "tests/hosttools/process.h"

namespace hosttools {
namespace {

constexpr const char* kHeading =
    "Kernel IP routing table\nDestination     Gateway         Genmask         Flags Metric Ref    Use "
    "Iface\n";
constexpr const char* kFileHeading =
    "Iface\tDestination\tGateway \tFlags\tRefCnt\tUse\tMetric\tMask\t\tMTU\tWindow\tIRTT\n";

std::string listed(const std::string& lines) {
    return listRoutes(kFileHeading + lines).str().substr(std::string_view(kHeading).size());
}

TEST(RouteListing, NoRoutes) {
    EXPECT_EQ(listRoutes("").str(), kHeading);
    EXPECT_EQ(listRoutes(kFileHeading).str(), kHeading);
}

TEST(RouteListing, RoutesOfEveryKind) {
    EXPECT_EQ(listed("eth0\t00000000\t0102010A\t0003\t0\t0\t100\t00000000\t0\t0\t0\n"),
              "0.0.0.0         10.1.2.1        0.0.0.0         UG    100    0        0 eth0\n");
    EXPECT_EQ(listed("eth0.10\t0100600A\t0902010A\t0007\t0\t0\t0\tFFFFFFFF\t0\t0\t0\n"),
              "10.96.0.1       10.1.2.9        255.255.255.255 UGH   0      0        0 eth0.10\n");
    EXPECT_EQ(listed("*\t0000620A\t00000000\t0201\t0\t0\t0\t0000FFFF\t0\t0\t0\n"),
              "10.98.0.0       0.0.0.0         255.255.0.0     !     0      0        0 *\n");
}

TEST(RouteListing, RoutesThatAreNotUpAndDamagedLines) {
    EXPECT_EQ(listed("eth0\t00000000\t0102010A\t0002\t0\t0\t100\t00000000\t0\t0\t0\n"), "");
    EXPECT_EQ(listed("eth0\t00000000\t0102010A\t0003\n"), "");
    EXPECT_EQ(listed("eth0\tjunk\t0102010A\t0003\t0\t0\t100\t00000000\t0\t0\t0\n"), "");
    EXPECT_EQ(listed("\n"), "");
    EXPECT_EQ(listed("eth0\t00000000\t00000000\t0001\t0\t0\t0\t00000000"),
              "0.0.0.0         0.0.0.0         0.0.0.0         U     0      0        0 eth0\n");
}

TEST(RouteListing, TheLinesThatARequestTakesApart) {
    HostTree tree;
    tree.addBytes("out", listRoutes(std::string(kFileHeading) +
                                    "eth0\t00000000\t0102010A\t0003\t0\t0\t100\t00000000\t0\t0\t0\n"
                                    "eth1\t0002010A\t00000000\t0001\t0\t0\t0\t00FFFFFF\t0\t0\t0\n")
                             .str());
    const std::string cat = "cat " + tree.root() + "/out | ";
    EXPECT_EQ(shell(cat + "grep eth1 | tr -s ' '").output, "10.1.2.0 0.0.0.0 255.255.255.0 U 0 0 0 eth1\n");
    EXPECT_EQ(shell(cat + "grep \"^0.0.0.0\" | tr -s ' ' | cut -d ' ' -f2").output, "10.1.2.1\n");
}

TEST(RouteListing, TheNextHopThatAnInet6RequestTakes) {
    HostTree tree;
    const std::string prefix = "00000000000000000000000000000000 00 00000000000000000000000000000000 00 ";
    tree.addBytes("out",
                  listInet6Routes(
                      prefix + "00000000000000000000000000000000 00000100 00000001 00000000 00000001 eth0\n" +
                      prefix + "fe800000000000000000000000000001 00000400 00000001 00000000 00450003 eth0\n" +
                      prefix + "fe800000000000000000000000000002 00000400 00000001 00000000 00000003 eth0\n")
                      .str());
    const std::string cat = "cat " + tree.root() + "/out | grep eth0 | grep UG ";
    EXPECT_EQ(shell(cat + "| tr -s ' ' | cut -d ' ' -f2").output, "fe80::1\nfe80::2\n");
    EXPECT_EQ(shell(cat + "| grep -v UGDA | tr -s ' ' | cut -d ' ' -f2").output, "fe80::2\n");
}

TEST(RouteListing, DamagedInet6Lines) {
    const std::size_t heading = listInet6Routes("").size();
    EXPECT_EQ(listInet6Routes("\nfe80 40 0 00 0 1 1 0 1 eth0\n").size(), heading);
    EXPECT_EQ(
        listInet6Routes("fe800000000000000000000000000001 40 00000000000000000000000000000000 00\n").size(),
        heading);
}

/// Every flag alone and beside others, numbers at the ends of their ranges.
std::string inetRoutes() {
    std::string text = kFileHeading;
    for (unsigned bit = 0; bit < 16; ++bit) {
        for (const unsigned others : {0x0u, 0x1u, 0x3u, 0x201u}) {
            char line[128];
            const unsigned flags = others | 1u << bit;
            std::snprintf(line, sizeof line, "i%u_%x\t%08X\t0102010A\t%04X\t%u\t%u\t%d\t00FFFFFF\t0\t0\t0\n",
                          bit, others, 0x2010Au << bit, flags, bit, others, static_cast<int>(bit * bit) - 9);
            text += line;
        }
    }
    return text + "last0123456789a\tFFFFFFFF\tFFFFFFFF\t0003\t123\t12345678\t2147483647\tFFFFFFFF\t0\t0\t0\n";
}

std::string inet6Routes() {
    std::string text;
    for (unsigned bit = 0; bit < 32; ++bit) {
        for (const unsigned others : {0x0u, 0x3u, 0x450003u, 0x200200u}) {
            char line[256];
            std::snprintf(line, sizeof line,
                          "20010db80000000000000000%08x %02x 00000000000000000000000000000000 00 "
                          "fe80000000000000ffffffff%08x %08x %08x %08x %08x  i%u_%x\n",
                          1u << bit, bit, bit, 1u << bit, bit, others, others | 1u << bit, bit, others);
            text += line;
        }
    }
    return text;
}

/// Runs busybox where /proc holds nothing but the one file.
Outcome busyboxWith(const std::string& file, const std::string& content, const Words& words) {
    HostTree tree;
    tree.addBytes("net/" + file, content);
    return run(words, [&] { enterPrivate({{"/proc", tree.root()}}); });
}

TEST(RouteAgainstBusybox, EveryFlag) {
    if (!hasProgram("busybox")) GTEST_SKIP() << "busybox is not installed";
    if (!canUnshare()) GTEST_SKIP() << "namespaces are not available";
    const Outcome inet = busyboxWith("route", inetRoutes(), {"busybox", "route", "-n"});
    ASSERT_EQ(inet.status, 0) << inet.errors;
    EXPECT_EQ(listRoutes(inetRoutes()).str(), inet.output);
    const Outcome inet6 = busyboxWith("ipv6_route", inet6Routes(), {"busybox", "route", "-A", "inet6", "-n"});
    ASSERT_EQ(inet6.status, 0) << inet6.errors;
    EXPECT_EQ(listInet6Routes(inet6Routes()).str(), inet6.output);
}

}  // namespace
}  // namespace hosttools
