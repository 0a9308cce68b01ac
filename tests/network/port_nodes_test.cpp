// Port nodes and the walk that makes them.
#include <gmock/gmock.h>

#include <thread>

#include "network/ip_config_node.h"
#include "network/port_node.h"
#include "network/port_queries.h"
#include "tests/network/one_node.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using IC::PropertyValue;
using testing::Contains;
using testing::IsEmpty;
using testing::Not;

struct Expected {
    unsigned int id;
    PropertyValue value;
};

void expectStored(const IC::MutableNode& node, const std::vector<Expected>& expected) {
    for (const Expected& property : expected) {
        EXPECT_EQ(PortHost::stored(node, property.id), property.value) << "property " << property.id;
    }
}

void expectLive(const IC::MutableNode& node, const std::vector<Expected>& expected) {
    for (const Expected& property : expected) {
        EXPECT_EQ(PortHost::live(node, property.id), property.value) << "property " << property.id;
    }
}

HOST_TEST(PortNode, HoldsEverythingAtCreation) {
    OneNode interface(host, "suse-two-nics");
    const auto port = interface.port("eth0");
    ASSERT_NE(port, nullptr);
    EXPECT_EQ(port->getStatus(), 1U);
    expectStored(*port, {{108, text("eth0")},
                         {121, text("eth0")},
                         {123, number(1)},
                         {0, texts({"eth0"})},
                         {57, number64(1000000)},
                         {82, flag(true)},
                         {67, flag(true)},
                         {185, number(50)},
                         {38, number(10)},
                         {182, numbers({3U})},
                         {183, numbers({3U})},
                         {110, enumeration(1)},
                         {111, enumeration(1)},
                         {125, numbers({0U, 1U, 12U})},
                         {193, flag(false)},
                         {199, text("")},
                         {194, flag(false)},
                         {195, text("")},
                         {196, number(0)}});
    std::map<unsigned int, PropertyValue> all;
    port->getProperties(all);
    EXPECT_EQ(all.size(), 19U) << "nothing but what the table names";
}

HOST_TEST(PortNode, WithoutLinkIsDown) {
    OneNode interface(host, "suse-two-nics");
    const auto port = interface.port("eth1");
    ASSERT_NE(port, nullptr);
    EXPECT_EQ(port->getStatus(), 12U);
    expectStored(*port, {{123, number(12)}, {57, number64(0)}, {82, flag(false)}});
}

HOST_TEST(PortNode, ShowsItsPlaceInATeam) {
    OneNode interface(host, "bond-two-members");
    expectStored(
        *interface.port("eth0"),
        {{193, flag(true)}, {199, text("bond0")}, {194, flag(true)}, {195, text("up")}, {196, number(0)}});
    expectStored(*interface.port("eth1"),
                 {{193, flag(true)}, {194, flag(false)}, {195, text("up")}, {196, number(3)}});
}

HOST_TEST(PortNode, ShowsItsTeamAsItStandsInItsFileAndFindsItWithoutTheQuotes) {
    OneNode interface(host, "bond-two-members");
    host.file("/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:01:01", "SLAVE=yes\nMASTER=\"bond0\" \n");
    expectStored(*interface.port("eth0"), {{193, flag(true)},
                                           {199, text("\"bond0\" ")},
                                           {194, flag(true)},
                                           {195, text("up")},
                                           {196, number(0)}});
    expectLive(*interface.port("eth0"), {{199, text("\"bond0\" ")}, {194, flag(true)}, {195, text("up")}});
}

HOST_TEST(PortNode, IsNoTeamMemberWhenItsFileSaysNo) {
    OneNode interface(host, "suse-two-nics");
    const auto port = interface.port("eth0");
    host.file("/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:01", "SLAVE=no\nMASTER=bond0\n");
    expectLive(*port, {{193, flag(false)}, {199, text("bond0")}});
}

HOST_TEST(PortNode, AnswersLinkAndTeamFactsLive) {
    OneNode interface(host, "bond-two-members");
    const auto port = interface.port("eth0");
    host.tool("ethtool eth0", "Speed: 100Mb/s\nDuplex: Half\nLink detected: no\n");
    std::string bonding = *host.read("/proc/net/bonding/bond0");
    bonding.replace(bonding.find("Active Slave: eth0"), 18, "Active Slave: eth1");
    bonding.replace(bonding.find("Count: 0"), 8, "Count: 7");
    host.file("/proc/net/bonding/bond0", bonding);
    expectLive(*port, {{57, number64(100000)},
                       {67, flag(false)},
                       {82, flag(false)},
                       {123, number(12)},
                       {193, flag(true)},
                       {194, flag(false)},
                       {195, text("up")},
                       {196, number(7)},
                       {199, text("bond0")}});
    host.remove("/etc/sysconfig/network");
    expectLive(*port, {{193, flag(false)}, {195, text("")}, {196, number(0)}, {199, text("")}});
}

HOST_TEST(PortNode, AnswersTheRestFromItsStoreAndChangesNothingOnTheHost) {
    OneNode interface(host, "suse-two-nics");
    const auto port = interface.port("eth0");
    LogCapture capture;
    EXPECT_EQ(port->setProperty(38, number(42)).getStatus(), 0);
    expectLive(*port, {{38, number(42)}, {108, text("eth0")}});
    PropertyValue value;
    EXPECT_NE(port->getProperty(999, value).getStatus(), 0);
    EXPECT_THAT(host.calls(), IsEmpty());
    const auto messages = capture.ownMessages();
    for (const std::string operation : {"NetworkPortNode::setProperty", "NetworkPortNode::getProperty"}) {
        const int calls = operation.ends_with("getProperty") ? 3 : 1;
        EXPECT_THAT(messages, Contains(operation + ": entry").Times(calls));
        EXPECT_THAT(messages, Contains(operation + ": exit").Times(calls));
    }
    EXPECT_EQ(messages.size(), 8U);
}

TEST(PortQueries, TakeTheModeInFrontOfTheSlashAndItsDigits) {
    EXPECT_EQ(IC::parse::linkMode("1000baseT/Full\n"), "1000baseT");
    EXPECT_EQ(IC::parse::linkMode("Not\n"), "Not");
    EXPECT_EQ(IC::parse::linkMode(""), "");
    EXPECT_EQ(IC::parse::baseTSpeed("10baseT"), 10U);
    EXPECT_EQ(IC::parse::baseTSpeed("10000baseT"), 10000U);
    EXPECT_EQ(IC::parse::baseTSpeed("1000baseKX"), 0U);
    EXPECT_EQ(IC::parse::baseTSpeed("baseT"), 0U);
    EXPECT_EQ(IC::parse::baseTSpeed("Not"), 0U);
    EXPECT_EQ(IC::parse::baseTSpeed(""), 0U);
}

HOST_TEST(PortQueries, TellSupportedFromEnabledWakeOnLan) {
    host.tool("ethtool a", "\tSupports Wake-on: g\n\tWake-on: d\n");
    host.tool("ethtool b", "\tSupports Wake-on: g\n");
    host.tool("ethtool c", "\tWake-on: g\n");
    host.tool("ethtool d", "No data available\n");
    struct Case {
        const char* name;
        bool supported, enabled;
    };
    for (const Case& of :
         {Case{"a", true, true}, Case{"b", true, false}, Case{"c", false, true}, Case{"d", false, false}}) {
        const IC::WakeOnLan found = IC::getWakeOnLan(of.name);
        EXPECT_EQ(found.supported, of.supported) << of.name;
        EXPECT_EQ(found.enabled, of.enabled) << of.name;
    }
}

HOST_TEST(PortNode, KeepsWakeOnLanUnsetWhenTheToolTellsNothing) {
    OneNode interface(host, "suse-two-nics");
    host.tool("ethtool eth0", "\tLink detected: yes\n");
    const auto port = interface.port("eth0");
    expectStored(*port, {{182, PropertyValue()}, {183, PropertyValue()}, {185, number(0)}, {38, number(0)}});
}

HOST_TEST(PortNode, TakesTypeAndSpeedFromTheFirstSupportedMode) {
    OneNode interface(host, "suse-two-nics");
    host.tool("ethtool eth0",
              "\tSupported link modes:   1000baseT/Full \n\t                        10baseT/Half \n");
    const auto port = interface.port("eth0");
    expectStored(*port, {{185, number(53)}, {38, number(1000)}});
}

HOST_TEST(PortWalk, GivesTheIndexOfTheConfigurationsMadeSoFar) {
    PortHost plugin(host, "bond-two-members");
    plugin.build();
    EXPECT_EQ(plugin.port("eth0")->getIndex(), 0U);
    EXPECT_EQ(plugin.config("eth0")->getIndex(), 1U);
    EXPECT_EQ(plugin.port("eth1")->getIndex(), 1U);
    EXPECT_EQ(plugin.config("eth1")->getIndex(), 2U);
    EXPECT_EQ(plugin.config("bond0")->getIndex(), 3U);
}

HOST_TEST(PortWalk, HangsWhatHasNoPortUnderTheController) {
    PortHost plugin(host, "bond-two-members");
    plugin.build();
    EXPECT_EQ(plugin.port("eth0")->getLinkedId(), plugin.controller());
    EXPECT_EQ(plugin.port("eth0")->getDescription(), "Network Port");
    EXPECT_EQ(plugin.port("bond0"), nullptr);
    EXPECT_EQ(plugin.config("bond0")->getLinkedId(), plugin.controller());
    EXPECT_EQ(plugin.config("eth1")->getLinkedId(), plugin.port("eth1")->getNodeId());
    IC::MutableNode* known = nullptr;
    EXPECT_TRUE(plugin.mi().findNetworkPort("bond0", &known));
    EXPECT_EQ(known, plugin.config("bond0").get());
    EXPECT_TRUE(plugin.mi().findNetworkPort("eth0", &known));
    EXPECT_EQ(known, plugin.port("eth0").get());
    LogCapture capture;
    EXPECT_FALSE(plugin.mi().findNetworkPort("eth7", &known));
    EXPECT_THAT(capture.messages(3000), TextsAre("findNetworkPort: entry", "findNetworkPort: exit"));
}

HOST_TEST(PortWalk, OfAVMwareHostListsNamesOfVAndALetterOrDigitAlone) {
    PortHost plugin(host, "vmware");
    host.file("/proc/net/dev", "Inter-|\n face |\nvmnic0: 1\nv-x: 1\n vmnic1: 1\n  eth9: 1\n");
    LogCapture capture;
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("vmnic0"));
    EXPECT_THAT(capture.ownMessages(), Contains("Machine has vmware"));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(PortWalk, PassesOverAZeroHardwareAddress) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/sys/class/net/eth1/address", "00:00:00:00:00:00\n");
    LogCapture capture;
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("eth0"));
    EXPECT_THAT(plugin.names(29), TextsAre("eth0"));
    EXPECT_THAT(capture.ownMessages(), Contains("Permanent_address compare"));
    EXPECT_FALSE(host.exists("/opt/vantrel/corvista/data/ifcfg-eth1"));
}

HOST_TEST(PortWalk, PassesOverTheMembersOfABridgeAndCallsTheBridgeOne) {
    PortHost plugin(host, "bridge-with-members");
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("eth1"));
    EXPECT_THAT(plugin.names(29), TextsAre("eth1", "br0"));
    EXPECT_EQ(plugin.config("br0")->getDescription(), "Bridge");
    EXPECT_EQ(plugin.config("eth1")->getDescription(), "IP Configuration");
}

HOST_TEST(PortWalk, MakesAPortWithoutConfigurationWhenIfconfigListsNone) {
    PortHost plugin(host, "no-network-tools");
    LogCapture capture;
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("eth0"));
    EXPECT_THAT(plugin.names(29), IsEmpty());
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
}

HOST_TEST(PortWalk, LeavesNoFileOfItsOwnInTmp) {
    PortHost plugin(host, "suse-two-nics");
    plugin.build();
    EXPECT_THAT(host.listDirectory("/tmp"), IsEmpty());
}

HOST_TEST(PortWalk, AddsTheNewInterfaceAndLeavesTheOldNodesAlone) {
    PortHost plugin(host, "suse-two-nics");
    const std::string devices = *host.read("/proc/net/dev");
    host.file("/proc/net/dev", devices.substr(0, devices.find("  eth1:")));
    plugin.build();
    const auto old = plugin.port("eth0");
    ASSERT_EQ(plugin.names(12), std::vector<std::string>{"eth0"});
    host.file("/proc/net/dev", devices);
    const std::string before = *host.read("/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:02");
    plugin.mi().createNetworkPortNodes(true);
    EXPECT_THAT(plugin.names(12), TextsAre("eth0", "eth1"));
    EXPECT_EQ(plugin.port("eth0"), old);
    EXPECT_EQ(plugin.config("eth1")->getIndex(), 1U) << "counted anew in each walk";
    // The host is running by now: filling the new nodes must not write to it.
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:02"), before);
    EXPECT_THAT(host.calls(), Not(Contains("ifconfig eth1 up")));
    EXPECT_THAT(host.calls(), Not(Contains("ifconfig eth1 down")));
    EXPECT_THAT(host.callsOf("rpm"), IsEmpty());
    host.clearCalls();
    host.tool("ifconfig eth1 down", "");
    EXPECT_EQ(plugin.config("eth1")->setProperty(123, number(12)).getStatus(), 0);
    EXPECT_THAT(host.calls(), Contains("ifconfig eth1 down")) << "from now on writes do act";
}

HOST_TEST(PortWalk, SavesEachInterfacesSettings) {
    PortHost plugin(host, "suse-two-nics");
    plugin.build();
    EXPECT_EQ(
        host.read("/opt/vantrel/corvista/data/ifcfg-eth0"),
        "BOOTPROTO=static\nCONFIG_NAME=eth0\nDNSSERVERS=192.0.2.53 192.0.2.54 \nDNSSUFFIXES=example.com \n"
        "DOMAINNAME=example.com\nGATEWAY=192.0.2.1\nHOSTNAME=linux-a\nIPV6ADDR=2001:db8::10\n"
        "IPV6GATEWAY=2001:db8::1\nIPv4ADDR=192.0.2.10\nNETMASK=255.255.255.0\nPREFIX=64\n");
    EXPECT_EQ(
        host.read("/opt/vantrel/corvista/data/ifcfg-eth1"),
        "BOOTPROTO=dhcp\nCONFIG_NAME=eth1\nDNSSERVERS=192.0.2.53 192.0.2.54 \nDNSSUFFIXES=example.com \n"
        "DOMAINNAME=example.com\nGATEWAY=\nHOSTNAME=linux-a\nIPV6ADDR=\nIPV6GATEWAY=\nIPv4ADDR=0.0.0.0\n"
        "NETMASK=0.0.0.0\nPREFIX=0\n");
}

HOST_TEST(PortWalk, SavesAPrefixLengthThatNoIntHoldsAsANegativeNumber) {
    PortHost plugin(host, "suse-two-nics");
    host.tool("ip -6 address show dev eth0", "    inet6 2001:db8::10/-1 scope global \n");
    plugin.build();
    EXPECT_THAT(*host.read("/opt/vantrel/corvista/data/ifcfg-eth0"), testing::HasSubstr("\nPREFIX=-1\n"));
    EXPECT_EQ(PortHost::stored(*plugin.config("eth0"), 102), number(4294967295));
}

HOST_TEST(PortWalk, SavesTheResolverAnewForANewInterfaceAndLeavesTheOldFilesAlone) {
    PortHost plugin(host, "suse-two-nics");
    const std::string devices = *host.read("/proc/net/dev");
    host.file("/proc/net/dev", devices.substr(0, devices.find("  eth1:")));
    plugin.build();
    const auto old = host.read("/opt/vantrel/corvista/data/ifcfg-eth0");
    host.file("/proc/net/dev", devices);
    host.file("/etc/resolv.conf", "nameserver 203.0.113.1\nsearch a.example\n");
    plugin.mi().createNetworkPortNodes(true);
    EXPECT_EQ(host.read("/opt/vantrel/corvista/data/ifcfg-eth0"), old);
    EXPECT_THAT(*host.read("/opt/vantrel/corvista/data/ifcfg-eth1"),
                testing::HasSubstr("\nDNSSERVERS=203.0.113.1 \nDNSSUFFIXES=a.example \n"));
    EXPECT_EQ(PortHost::stored(*plugin.config("eth1"), 94), texts({"203.0.113.1"}));
    EXPECT_EQ(PortHost::stored(*plugin.config("eth0"), 94), texts({"192.0.2.53", "192.0.2.54"}));
}

HOST_TEST(PortWalk, KeepsTheSettingsOfAnInterfaceThatIsGoneUntilTheStop) {
    PortHost plugin(host, "suse-two-nics");
    plugin.build();
    const std::string devices = *host.read("/proc/net/dev");
    const auto old = host.read("/opt/vantrel/corvista/data/ifcfg-eth1");
    host.file("/proc/net/dev", devices.substr(0, devices.find("  eth1:")));
    plugin.mi().createNetworkPortNodes(true);
    EXPECT_EQ(host.read("/opt/vantrel/corvista/data/ifcfg-eth1"), old);
    plugin.mi().unload();
    EXPECT_THAT(host.listDirectory("/opt/vantrel/corvista/data"), IsEmpty());
}

HOST_TEST(PortWalk, SaysWhatItDoes) {
    PortHost plugin(host, "vlans");
    LogCapture capture;
    plugin.build();
    const std::vector<std::string> messages = capture.ownMessages();
    EXPECT_EQ(messages.front(), "createNetworkPortNodes: entry");
    EXPECT_EQ(messages.back(), "createNetworkPortNodes: exit");
    for (const char* text :
         {"Creating an IPConfigNode for eth0.10", "Inserting the interface in the Map eth0.10",
          "NetworkPortNode::NetworkPortNode: entry", "NetworkPortNode::NetworkPortNode: exit",
          "Size of Inteface  0", "createSettingData: entry"}) {
        EXPECT_THAT(messages, Contains(text));
    }
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(PortWalk, MakesNothingOnceTheTreeIsGone) {
    PortHost plugin(host, "suse-two-nics");
    const auto held = plugin.build().config("eth0");
    plugin.mi().unload();
    held->setProperty(74, number(1));
    EXPECT_THAT(plugin.mi().holdAll(), IsEmpty());
    EXPECT_THAT(host.calls(), Not(Contains("ifconfig")));
}

HOST_TEST(PortWalk, ComesToItsEndBeforeTheTreeGoes) {
    PortHost plugin(host, "suse-two-nics");
    std::thread walk([&] { plugin.mi().createNetworkPortNodes(false); });
    while (host.calls().empty()) {
        std::this_thread::yield();
    }
    plugin.mi().unload();
    walk.join();
    EXPECT_THAT(plugin.mi().holdAll(), IsEmpty());
}

}  // namespace
