#include "network/ipv6_writer.h"

#include <sys/mount.h>

#include "network/route_queries.h"
#include "tests/network/killed_writer.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using Lines = std::vector<std::string>;

constexpr char kMac[] = "00:0c:29:00:00:01";
constexpr char kInterface[] = "/etc/sysconfig/network/ifcfg-eth-id-00:0c:29:00:00:01";
constexpr char kDirectory[] = "/etc/sysconfig/network";
constexpr char kRoutes[] = "/etc/sysconfig/network/routes";
constexpr char kListing[] =
    "route -A inet6 -n 2> /dev/null | grep eth0 | grep UG | grep -v UGDA | tr -s ' ' "
    "| cut -d ' ' -f2 2> /dev/null";
constexpr char kAdd[] = "ip -6 route add default via fd00::1 dev eth0 2> /dev/null";

std::string afterAddress(FakeHost& host, const std::string& content) {
    host.file(kInterface, content);
    IC::setIPv6Address("eth0", "fd00::7", kMac);
    return host.read(kInterface).value_or("missing");
}

std::string afterPrefix(FakeHost& host, const std::string& content) {
    host.file(kInterface, content);
    IC::setIPv6PrefixLength("eth0", 64, kMac);
    return host.read(kInterface).value_or("missing");
}

/// One line as the routing tool prints it.
std::string route(const std::string& gateway, const std::string& flags, const std::string& interface) {
    return "::/0                           " + gateway + "                 " + flags + "  1024 2     0 " +
           interface + "\n";
}

void routingTable(FakeHost& host, const std::string& lines) {
    host.tool("route -A inet6 -n",
              "Kernel IPv6 routing table\nDestination Next Hop Flag Met Ref Use If\n" + lines);
    host.recordOnly("ip");
}

std::string deletion(const std::string& gateway) {
    return "ip -6 route delete default via " + gateway + " dev eth0";
}

/// What the routes file is after fd00::1 became the gateway.
std::string afterGateway(FakeHost& host, const std::string& content) {
    routingTable(host, route("fd00::1", "UG", "eth0"));
    host.file(kRoutes, content);
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    return host.read(kRoutes).value_or("missing");
}

HOST_TEST(IPv6Address, ReplacesLabelAndAddressInPlace) {
    EXPECT_EQ(
        afterAddress(host, "BOOTPROTO='static'\nIPADDR_1=fd00::1\nIPADDR=10.0.0.1\nLABEL_1='old'\nMTU=''"),
        "BOOTPROTO='static'\nIPADDR_1=fd00::7\nIPADDR=10.0.0.1\nLABEL_1='1'\nMTU=''");
}

HOST_TEST(IPv6Address, BecomesEverySecondaryAddress) {
    EXPECT_EQ(
        afterAddress(host, "BOOTPROTO=static\nIPADDR_1=fd00::1\nLABEL_1='1'\nIPADDR_2=fd00::2\nLABEL_x=2\n"),
        "BOOTPROTO=static\nIPADDR_1=fd00::7\nLABEL_1='1'\nIPADDR_1=fd00::7\nLABEL_1='1'\n");
}

HOST_TEST(IPv6Address, AppendsWhatIsMissingInOrder) {
    const std::string all = "BOOTPROTO=static\nLABEL_1='1'\nIPADDR_1=fd00::7\n";
    EXPECT_EQ(afterAddress(host, ""), all);
    EXPECT_EQ(afterAddress(host, "IPADDR=10.0.0.1"), "IPADDR=10.0.0.1\n" + all);
    EXPECT_EQ(afterAddress(host, "BOOTPROTO='dhcp'\n"), "BOOTPROTO='dhcp'\nLABEL_1='1'\nIPADDR_1=fd00::7\n");
    EXPECT_EQ(afterAddress(host, "IPADDR_9=x\n"), "IPADDR_1=fd00::7\nBOOTPROTO=static\nLABEL_1='1'\n");
}

HOST_TEST(IPv6Address, ALineWithLabelAndAddressIsTheLabels) {
    EXPECT_EQ(afterAddress(host, "LABEL_1=a IPADDR_1=b BOOTPROTO=c\n"),
              "LABEL_1='1'\nBOOTPROTO=static\nIPADDR_1=fd00::7\n");
}

HOST_TEST(IPv6Address, MakesAMissingFile) {
    host.directory(kDirectory);
    IC::setIPv6Address("eth0", "fd00::7", kMac);
    EXPECT_EQ(host.read(kInterface), "BOOTPROTO=static\nLABEL_1='1'\nIPADDR_1=fd00::7\n");
}

HOST_TEST(IPv6Address, ReplacesALineOfAnyLength) {
    const std::string head = "BOOTPROTO=static\nLABEL_1='1'\n";
    EXPECT_EQ(afterAddress(host, head + "IPADDR_1=" + std::string(5000, 'x') + "\n"),
              head + "IPADDR_1=fd00::7\n");
    const std::string keyAtTheEnd = std::string(600, '#') + "IPADDR_1=\n";
    EXPECT_EQ(afterAddress(host, head + keyAtTheEnd), head + "IPADDR_1=fd00::7\n");
}

HOST_TEST(IPv6Address, RunsNoCommandAndLogsTheWriting) {
    host.file(kInterface, "");
    const CommandLines commands;
    LogCapture capture;
    IC::setIPv6Address("eth0", "fd00::7", kMac);
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_THAT(capture.messages(),
                TextsAre("setIPv6Address: entry", "Writing IP Address", "setIPv6Address: exit"));
    EXPECT_THAT(capture.messages(4000), TextsAre("Writing IP Address"));
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(IPv6Address, LeavesAnUnwritableFileWithoutAWord) {
    host.file(kInterface, "IPADDR_1=fd00::1\n");
    host.readOnly(kDirectory);
    LogCapture capture;
    IC::setIPv6Address("eth0", "fd00::7", kMac);
    IC::setIPv6PrefixLength("eth0", 64, kMac);
    EXPECT_EQ(host.read(kInterface), "IPADDR_1=fd00::1\n");
    EXPECT_THAT(capture.messages(), TextsAre("setIPv6Address: entry", "setIPv6Address: exit",
                                             "setIPv6PrefixLength: entry", "setIPv6PrefixLength: exit"));
}

HOST_TEST(IPv6Address, FileIsTheOldOneWhenTheDiskIsFull) {
    host.file(kInterface, "IPADDR_1=fd00::1\n");
    host.fullDisk(kDirectory);
    IC::setIPv6Address("eth0", "fd00::7", kMac);
    IC::setIPv6PrefixLength("eth0", 64, kMac);
    EXPECT_EQ(host.read(kInterface), "IPADDR_1=fd00::1\n");
}

HOST_TEST(IPv6Address, FileIsTheOldOneWhenTheWriterIsKilledBeforeItWrites) {
    host.file(kInterface, "IPADDR_1=fd00::1\n");
    killBeforeItWrites(kInterface, [] { IC::setIPv6Address("eth0", "fd00::7", kMac); });
    EXPECT_EQ(host.read(kInterface), "IPADDR_1=fd00::1\n");
}

HOST_TEST(IPv6Address, SaysThatTheFileIsOpenBeforeItWrites) {
    host.directory(kDirectory);
    ASSERT_EQ(mount("small", kDirectory, "tmpfs", 0, "size=16k"), 0);
    std::string content;
    while (content.size() < 16384) {
        content += "#23456789abcdef\n";
    }
    host.file(kInterface, content);
    LogCapture capture;
    IC::setIPv6Address("eth0", "fd00::7", kMac);
    IC::setIPv6PrefixLength("eth0", 64, kMac);
    const std::string full = std::string("Could not write all of '") + kInterface + "'.";
    EXPECT_THAT(capture.messages(),
                TextsAre("setIPv6Address: entry", "Writing IP Address", full, "setIPv6Address: exit",
                         "setIPv6PrefixLength: entry", "File open '/etc/sysconfig/network' in write mode.",
                         full, "setIPv6PrefixLength: exit"));
}

HOST_TEST(IPv6PrefixLength, IsReplacedOrAppendedInDecimal) {
    EXPECT_EQ(afterPrefix(host, "BOOTPROTO=dhcp\nPREFIXLEN_1=48\nPREFIXLEN_2=56\nPREFIXLEN=24\n"),
              "BOOTPROTO=dhcp\nPREFIXLEN_1=64\nPREFIXLEN_1=64\nPREFIXLEN=24\n");
    EXPECT_EQ(afterPrefix(host, "IPADDR_1=fd00::1"), "IPADDR_1=fd00::1\nPREFIXLEN_1=64\n");
    host.remove(kInterface);
    IC::setIPv6PrefixLength("eth0", 0, kMac);
    EXPECT_EQ(host.read(kInterface), "PREFIXLEN_1=0\n");
    IC::setIPv6PrefixLength("eth0", 2147483647, kMac);
    EXPECT_EQ(host.read(kInterface), "PREFIXLEN_1=2147483647\n");
    IC::setIPv6PrefixLength("eth0", 4294967295, kMac);
    EXPECT_EQ(host.read(kInterface), "PREFIXLEN_1=-1\n") << "as %d prints it";
}

HOST_TEST(IPv6PrefixLength, LogsTheWriting) {
    host.file(kInterface, "");
    LogCapture capture;
    IC::setIPv6PrefixLength("eth0", 64, kMac);
    EXPECT_THAT(capture.messages(3000), TextsAre("setIPv6PrefixLength: entry", "setIPv6PrefixLength: exit"));
    EXPECT_THAT(capture.messages(4000), TextsAre("File open '/etc/sysconfig/network' in write mode."));
}

HOST_TEST(StaticIPv6Gateways, AreTheNextHopsNoRouterAdvertised) {
    routingTable(host, route("fd00::2", "UG", "eth0") + route("fe80::9", "UGDA", "eth0") +
                           route("::", "U", "eth0") + route("fd00::3", "UG", "eth1") +
                           route("fd00::4", "UGA", "eth0"));
    const CommandLines commands;
    Lines gateways{"before"};
    EXPECT_TRUE(IC::getStaticIPV6GatewaysOnSuSe10("eth0", gateways));
    EXPECT_THAT(gateways, TextsAre("before", "fd00::2", "fd00::4"));
    EXPECT_THAT(commands.all(), ElementsAre(kListing));
}

HOST_TEST(StaticIPv6Gateways, AreAlsoThoseOfLongerNames) {
    routingTable(host, route("fd00::10", "UG", "eth10"));
    Lines gateways;
    EXPECT_TRUE(IC::getStaticIPV6GatewaysOnSuSe10("eth1", gateways));
    EXPECT_THAT(gateways, TextsAre("fd00::10"));
}

HOST_TEST(StaticIPv6Gateways, AreNoneWithoutALineOrATool) {
    routingTable(host, route("::", "U", "eth0"));
    Lines gateways;
    LogCapture capture;
    EXPECT_FALSE(IC::getStaticIPV6GatewaysOnSuSe10("eth0", gateways));
    EXPECT_THAT(capture.messages(),
                TextsAre("getStaticIPV6GatewaysOnSuSe10: entry", "getStaticIPV6GatewaysOnSuSe10: exit"));
    host.toolMissing("route");
    EXPECT_FALSE(IC::getStaticIPV6GatewaysOnSuSe10("eth0", gateways));
    const NoDescriptors none;
    EXPECT_FALSE(IC::getStaticIPV6GatewaysOnSuSe10("eth0", gateways));
    EXPECT_THAT(gateways, IsEmpty());
}

HOST_TEST(StaticIPv6Gateways, AreDeletedInOrderWhateverTheToolSays) {
    host.tool("ip %any", "", 2);
    const CommandLines commands;
    LogCapture capture;
    IC::deleteStaticIPv6GatewayOnSuSe10("eth0", {"fd00::2", "fd00::3"});
    IC::deleteStaticIPv6GatewayOnSuSe10("eth0", {});
    EXPECT_THAT(commands.all(), ElementsAre(deletion("fd00::2"), deletion("fd00::3")));
    EXPECT_THAT(host.calls(), ElementsAre(deletion("fd00::2"), deletion("fd00::3")));
    EXPECT_THAT(capture.messages(6000), IsEmpty());
    EXPECT_EQ(capture.messages().front(), "deleteStaticIPv6GatewayOnSuSe10: entry");
    EXPECT_EQ(capture.messages().back(), "deleteStaticIPv6GatewayOnSuSe10: exit");
}

HOST_TEST(IPv6Gateway, ThatIsTheOnlyOneIsNeitherAddedNorDeletedAndWrittenLast) {
    host.file(kRoutes, "default\tfd00::1\t-\n10.0.0.0 10.0.0.1 -\n");
    routingTable(host, route("fd00::1", "UG", "eth0"));
    const CommandLines commands;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_THAT(commands.all(), ElementsAre(kListing));
    EXPECT_EQ(host.read(kRoutes), "10.0.0.0 10.0.0.1 -\ndefault\tfd00::1\t-\n");
}

HOST_TEST(IPv6Gateway, IsAddedBeforeTheOldOnesAreDeletedInTheirOrder) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    routingTable(host, route("fd00::3", "UG", "eth0") + route("fd00::2", "UG", "eth0"));
    const CommandLines commands;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_THAT(commands.all(), ElementsAre(kListing, kAdd, deletion("fd00::3"), deletion("fd00::2")));
    EXPECT_THAT(host.callsOf("ip"), ElementsAre("ip -6 route add default via fd00::1 dev eth0",
                                                deletion("fd00::3"), deletion("fd00::2")));
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::1\t-\n");
}

HOST_TEST(IPv6Gateway, ThatIsPresentTwiceStaysAndTheOthersGo) {
    host.file(kRoutes, "");
    routingTable(host, route("fd00::1", "UG", "eth0") + route("fd00::12", "UG", "eth0") +
                           route("fd00::1", "UG", "eth0"));
    const CommandLines commands;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_THAT(commands.all(), ElementsAre(kListing, deletion("fd00::12")));
}

HOST_TEST(IPv6Gateway, WithoutAnAddressOrAnInterfaceDoesNothing) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    const CommandLines commands;
    LogCapture capture;
    IC::setIPv6GatewayForSuSe10("eth0", "");
    IC::setIPv6GatewayForSuSe10("", "fd00::1");
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::3\t-\n");
    EXPECT_THAT(capture.messages(),
                TextsAre("setIPv6GatewayForSuSe: entry", "Either NIC or gateway is null",
                         "setIPv6GatewayForSuSe10: exit", "setIPv6GatewayForSuSe: entry",
                         "Either NIC or gateway is null", "setIPv6GatewayForSuSe10: exit"));
    EXPECT_EQ(capture.messages(6000).size(), 2U);
}

HOST_TEST(IPv6Gateway, ThatCannotBeAddedLeavesRoutesAndFileAlone) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    LogCapture capture;
    {
        const NoDescriptors none;
        IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    }
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not execute 'ip -6 route add default' command"));
    EXPECT_THAT(capture.messages(), Not(Contains("deleteStaticIPv6GatewayOnSuSe10: entry")));
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::3\t-\n");
}

HOST_TEST(IPv6Gateway, ThatMakesTheCommandTooLongIsNotAddedEither) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    routingTable(host, route("fd00::3", "UG", "eth0"));
    const CommandLines commands;
    LogCapture capture;
    IC::setIPv6GatewayForSuSe10("eth0", std::string(500, 'f'));
    EXPECT_THAT(commands.all(), ElementsAre(kListing));
    EXPECT_THAT(capture.messages(6000), Contains("Could not execute 'ip -6 route add default' command"));
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::3\t-\n");
}

HOST_TEST(IPv6Gateway, WithItsAddressIsTheSameTwice) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    routingTable(host, route("fd00::3", "UG", "eth0"));
    const CommandLines commands;
    LogCapture capture;
    IC::setIPv6Gateway("eth0", "fd00::1", "");
    IC::setIPv6Gateway("eth0", "fd00::1", "fd00::7");
    EXPECT_THAT(commands.all(),
                ElementsAre(kListing, kAdd, deletion("fd00::3"), kListing, kAdd, deletion("fd00::3")));
    EXPECT_EQ(capture.messages().front(), "setIPv6Gateway: entry");
    EXPECT_EQ(capture.messages().back(), "setIPv6Gateway: exit");
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::1\t-\n");
}

HOST_TEST(IPv6RoutesFile, KeepsCommentsAndIPv4RoutesInOrder) {
    EXPECT_EQ(
        afterGateway(
            host, "# head\ndefault\t10.0.0.1\t-\ndefault\tfd00::9\t-\n192.168.1.0 10.0.0.2 # old: fd00::8"),
        "# head\ndefault\t10.0.0.1\t-\n192.168.1.0 10.0.0.2 # old: fd00::8\ndefault\tfd00::1\t-\n");
}

HOST_TEST(IPv6RoutesFile, OfCommentsAloneBecomesTheRouteAlone) {
    EXPECT_EQ(afterGateway(host, "# one\n#default fd00::9 -\n"), "default\tfd00::1\t-\n");
    EXPECT_EQ(afterGateway(host, ""), "default\tfd00::1\t-\n");
}

HOST_TEST(IPv6RoutesFile, AnEmptyLineCountsAsARoute) {
    EXPECT_EQ(afterGateway(host, "# one\n\n"), "# one\n\ndefault\tfd00::1\t-\n");
}

HOST_TEST(IPv6RoutesFile, LooksIntoTheWholeOfALine) {
    const std::string comment = std::string(600, ' ') + "#c\n";
    const std::string ipv6 = "default " + std::string(600, ' ') + "fd00::9 -\n";
    const std::string ipv4 = "default " + std::string(600, ' ') + "10.0.0.9 -\n";
    EXPECT_EQ(afterGateway(host, comment), "default\tfd00::1\t-\n");
    EXPECT_EQ(afterGateway(host, comment + ipv6 + ipv4), comment + ipv4 + "default\tfd00::1\t-\n");
}

HOST_TEST(IPv6RoutesFile, WithADirectoryInItsPlaceCannotBeOpenedForWriting) {
    host.directory("/etc/sysconfig/network/routes");
    routingTable(host, route("fd00::1", "UG", "eth0"));
    LogCapture capture;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_THAT(capture.messages(6000),
                TextsAre("Can not open '/etc/sysconfig/network/routes' in write mode."));
}

HOST_TEST(IPv6RoutesFile, IsNotMadeWhenItIsMissing) {
    routingTable(host, route("fd00::2", "UG", "eth0"));
    LogCapture capture;
    const CommandLines commands;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_THAT(commands.all(), ElementsAre(kListing, kAdd, deletion("fd00::2")));
    EXPECT_FALSE(host.exists(kRoutes));
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(IPv6RoutesFile, IsTheOldOneWhenItCannotBeWrittenButTheRoutesAreChanged) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    host.readOnly(kDirectory);
    routingTable(host, route("fd00::3", "UG", "eth0"));
    LogCapture capture;
    const CommandLines commands;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_THAT(commands.all(), ElementsAre(kListing, kAdd, deletion("fd00::3")));
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::3\t-\n");
    EXPECT_THAT(capture.messages(6000),
                TextsAre("Can not open '/etc/sysconfig/network/routes' in write mode."));
}

HOST_TEST(IPv6RoutesFile, IsTheOldOneWhenTheDiskIsFull) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    host.fullDisk(kDirectory);
    routingTable(host, route("fd00::3", "UG", "eth0"));
    LogCapture capture;
    IC::setIPv6GatewayForSuSe10("eth0", "fd00::1");
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::3\t-\n");
    EXPECT_EQ(capture.messages(6000).size(), 1U);
}

HOST_TEST(IPv6RoutesFile, IsTheOldOneWhenTheWriterIsKilledBeforeItWrites) {
    host.file(kRoutes, "default\tfd00::3\t-\n");
    routingTable(host, "");
    killBeforeItWrites(kRoutes, [] { IC::setIPv6GatewayForSuSe10("eth0", "fd00::1"); });
    EXPECT_EQ(host.read(kRoutes), "default\tfd00::3\t-\n");
}

}  // namespace
