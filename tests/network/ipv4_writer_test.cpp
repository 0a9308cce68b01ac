// The write side of IP configurations.
#include "network/ipv4_writer.h"

#include <gmock/gmock.h>

#include "tests/network/port_host.h"
#include "tests/support/command_lines.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"

namespace {

using IC::PropertyValue;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

constexpr char kMac[] = "02:00:5e:00:00:01";
constexpr char kFile[] = "/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:01";
constexpr char kRoutes[] = "/etc/sysconfig/network/routes";

PropertyValue origin(unsigned int code) {
    return enumeration(code);
}

/// Two interfaces, eth0 with a fixed address and eth1 with DHCP, ready for writes.
class Writable {
public:
    explicit Writable(FakeHost& host) : plugin_(host, "suse-two-nics"), host_(host) {
        plugin_.build();
        host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");
    }
    std::shared_ptr<IC::MutableNode> eth0() { return plugin_.config("eth0"); }
    std::shared_ptr<IC::MutableNode> eth1() { return plugin_.config("eth1"); }
    /// The commands since then that change something.
    std::vector<std::string> changes() {
        std::vector<std::string> calls = host_.calls();
        std::erase_if(calls, [](const std::string& call) {
            return call == "ifconfig" || call == "ifconfig eth0" || call == "ifconfig eth1" ||
                   call.starts_with("route -") || call.starts_with("hostname -") ||
                   call.starts_with("ip -6 address");
        });
        return calls;
    }
    std::string set(IC::MutableNode& node, unsigned int id, const PropertyValue& value,
                    const char* file = kFile) {
        EXPECT_EQ(node.setProperty(id, value).getStatus(), 0);
        return host_.read(file).value_or("(missing)");
    }
    PortHost& plugin() { return plugin_; }

private:
    PortHost plugin_;
    FakeHost& host_;
};

// --- the dispatch

HOST_TEST(Dispatch, OnlyStoresBeforeThePluginHasStarted) {
    Writable writable(host);
    IC::OSHWMI::bInitflag = false;
    const std::string before = *host.read(kFile);
    EXPECT_EQ(writable.set(*writable.eth0(), 24, origin(1)), before);
    EXPECT_EQ(PortHost::stored(*writable.eth0(), 24), origin(1));
    EXPECT_THAT(writable.changes(), IsEmpty());
}

HOST_TEST(Dispatch, StoresAddressesWithoutActingWhileTheOriginIsNotFixed) {
    Writable writable(host);
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    const char* file = "/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:02";
    const std::string before = *host.read(file);
    const auto node = writable.eth1();
    for (const unsigned int id : {25U, 26U, 27U, 100U, 101U}) {
        EXPECT_EQ(writable.set(*node, id, text("192.0.2.99"), file), before) << id;
        EXPECT_EQ(PortHost::stored(*node, id), text("192.0.2.99"));
    }
    EXPECT_EQ(writable.set(*node, 102, number(48), file), before);
    EXPECT_EQ(PortHost::stored(*node, 102), number(48));
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
    EXPECT_THAT(writable.changes(), IsEmpty());
}

HOST_TEST(Dispatch, StoresAnyOtherIdAndRunsNothing) {
    Writable writable(host);
    writable.set(*writable.eth0(), 29, text("cafe"));
    writable.set(*writable.eth0(), 4711, text("anything"));
    EXPECT_EQ(PortHost::stored(*writable.eth0(), 29), text("cafe"));
    EXPECT_EQ(PortHost::stored(*writable.eth0(), 4711), text("anything"));
    EXPECT_THAT(writable.changes(), IsEmpty());
}

HOST_TEST(Dispatch, SaysTheOriginItFoundFirst) {
    Writable writable(host);
    LogCapture capture;
    writable.set(*writable.eth0(), 29, text(""));
    const auto messages = capture.ownMessages();
    EXPECT_EQ(messages.front(), "IPConfigNode::setProperty: entry");
    EXPECT_THAT(messages, Contains("IPConfigNode::setProperty : IPOrigin Value :3"));
    EXPECT_EQ(messages.back(), "IPConfigNode::setProperty: exit");
}

HOST_TEST(Dispatch, AValueOfTheWrongKindIsLoggedAndStored) {
    Writable writable(host);
    const std::string before = *host.read(kFile);
    LogCapture capture;
    EXPECT_EQ(writable.set(*writable.eth0(), 102, text("many")), before);
    EXPECT_EQ(PortHost::stored(*writable.eth0(), 102), text("many"));
    EXPECT_EQ(capture.ownMessages(6000).size(), 1U);
}

HOST_TEST(Dispatch, OfOneReenumeratesAndIsNotStored) {
    Writable writable(host);
    LogCapture capture;
    writable.set(*writable.eth0(), 74, number(0));
    EXPECT_EQ(PortHost::stored(*writable.eth0(), 74), number(0));
    EXPECT_THAT(capture.ownMessages(), Not(Contains("createNetworkPortNodes: entry")));
    writable.set(*writable.eth0(), 74, number(1));
    EXPECT_EQ(PortHost::stored(*writable.eth0(), 74), number(0)) << "the value before";
    EXPECT_THAT(capture.ownMessages(), Contains("createNetworkPortNodes: entry"));
    EXPECT_THAT(capture.ownMessages(), Contains("IPConfigNode::CreateUser :setProperty:"));
    EXPECT_THAT(capture.ownMessages(), Contains("IPConfigNode::CreateUser :PropertyValue:1"));
}

HOST_TEST(Dispatch, WritesAddressMaskAndPrefixLengthWhileTheOriginIsFixed) {
    Writable writable(host);
    host.file(kFile, "BOOTPROTO=static\n");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    const auto node = writable.eth0();
    EXPECT_EQ(writable.set(*node, 25, text("192.0.2.77")), "BOOTPROTO=static\nIPADDR=192.0.2.77\n");
    EXPECT_EQ(writable.set(*node, 26, text("255.255.0.0")),
              "BOOTPROTO=static\nIPADDR=192.0.2.77\nNETMASK=255.255.0.0\n");
    EXPECT_EQ(writable.set(*node, 102, number(48)),
              "BOOTPROTO=static\nIPADDR=192.0.2.77\nNETMASK=255.255.0.0\nPREFIXLEN_1=48\n");
    EXPECT_EQ(PortHost::stored(*node, 25), text("192.0.2.77"));
    EXPECT_EQ(PortHost::stored(*node, 26), text("255.255.0.0"));
    EXPECT_EQ(PortHost::stored(*node, 102), number(48));
    EXPECT_THAT(writable.changes(), ElementsAre("ifconfig eth0 netmask 255.255.0.0"));
}

HOST_TEST(Dispatch, OfAnOriginWritesTheResolversPolicyAndThenTheFile) {
    Writable writable(host);
    const char* policy = "/etc/sysconfig/network/config";
    const char* file = "/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:02";
    host.file(policy, "NETCONFIG_DNS_POLICY=\"auto\"\n");
    host.file(file, "BOOTPROTO='dhcp'\n");
    const auto node = writable.eth1();
    LogCapture capture;
    EXPECT_EQ(writable.set(*node, 24, origin(3), file), "BOOTPROTO=static\nSTARTMODE='auto'\n");
    EXPECT_EQ(host.read(policy), "NETCONFIG_DNS_POLICY=\"\"\n");
    std::vector<std::string> writers = capture.ownMessages();
    std::erase_if(writers, [](const std::string& message) {
        return message != "setIPOrigin: entry" && message != "disableNetConfigDNSPolicy: Entering";
    });
    EXPECT_THAT(writers, ElementsAre("disableNetConfigDNSPolicy: Entering", "setIPOrigin: entry"));
    EXPECT_EQ(PortHost::stored(*node, 24), origin(3));
    // The next call finds the origin fixed.
    EXPECT_EQ(writable.set(*node, 25, text("192.0.2.78"), file),
              "BOOTPROTO=static\nSTARTMODE='auto'\nIPADDR=192.0.2.78\n");
}

HOST_TEST(Dispatch, AlwaysSucceedsWithoutCodeAndText) {
    Writable writable(host);
    const IC::Error error = writable.eth0()->setProperty(102, text("many"));
    EXPECT_EQ(error.getStatus(), 0);
    EXPECT_TRUE(error.code().empty());
    EXPECT_EQ(error.text(), "");
}

HOST_TEST(Dispatch, OfDnsListsWritesTheResolver) {
    Writable writable(host);
    EXPECT_EQ(writable.set(*writable.eth1(), 94, texts({"203.0.113.1"}), "/etc/resolv.conf"),
              "search example.com\nnameserver 203.0.113.1\n");
    EXPECT_EQ(writable.set(*writable.eth1(), 99, texts({"a.example", "b.example"}), "/etc/resolv.conf"),
              "search a.example b.example\nnameserver 203.0.113.1\n");
}

HOST_TEST(Dispatch, OfNamesTakesTheNodesAddressAndOtherName) {
    Writable writable(host);
    host.tool("hostname web.example.com", "");
    host.tool("hostname linux-a.example.net", "");
    LogCapture capture;
    EXPECT_EQ(writable.set(*writable.eth0(), 97, text("web"), "/etc/hosts"),
              "127.0.0.1\tlocalhost\n192.0.2.10\tweb.example.com\tweb\n");
    EXPECT_EQ(writable.set(*writable.eth0(), 98, text("example.net"), "/etc/hosts"),
              "127.0.0.1\tlocalhost\n192.0.2.10\tlinux-a.example.net\tlinux-a\n");
    EXPECT_THAT(writable.changes(), ElementsAre("hostname web.example.com", "hostname linux-a.example.net"));
    EXPECT_THAT(capture.ownMessages(), Contains("HostName :web"));
    EXPECT_THAT(capture.ownMessages(), Contains("DomainName :example.net"));
    EXPECT_THAT(capture.ownMessages(), Contains("Operation : 0").Times(1));
    EXPECT_THAT(capture.ownMessages(), Contains("Operation : 1").Times(1));
}

HOST_TEST(Dispatch, OfAnIPv6AddressWritesFileAndHostsEntry) {
    Writable writable(host);
    host.tool("hostname linux-a.example.com", "");
    EXPECT_THAT(writable.set(*writable.eth0(), 27, text("2001:db8::77")),
                testing::EndsWith("IPADDR_1=2001:db8::77\n"));
    EXPECT_EQ(host.read("/etc/hosts"), "127.0.0.1\tlocalhost\n2001:db8::77\tlinux-a.example.com\tlinux-a\n");
}

HOST_TEST(Dispatch, OfAnIPv6GatewayRunsTheWriterTwiceAndSkipsAnEmptyOne) {
    Writable writable(host);
    host.file(kRoutes, "");
    host.tool("ip -6 route add default via fe80::7 dev eth0", "");
    host.tool("ip -6 route delete default via 2001:db8::1 dev eth0", "");
    LogCapture capture;
    EXPECT_EQ(writable.set(*writable.eth0(), 101, text("fe80::7"), kRoutes), "default\tfe80::7\t-\n");
    EXPECT_THAT(capture.ownMessages(), Contains("setIPv6Gateway: entry").Times(2));
    capture.clear();
    writable.set(*writable.eth0(), 101, text(""));
    EXPECT_THAT(capture.ownMessages(), Not(Contains("setIPv6Gateway: entry")));
}

// --- the link state

HOST_TEST(LinkState, IsSetByIfconfig) {
    Writable writable(host);
    host.tool("ifconfig eth0 up", "");
    host.tool("ifconfig eth0 down", "");
    for (const unsigned int state : {1U, 9U, 12U, 16U}) {
        writable.set(*writable.eth0(), 123, number(state));
        EXPECT_EQ(PortHost::stored(*writable.eth0(), 123), number(state));
    }
    EXPECT_THAT(writable.changes(), ElementsAre("ifconfig eth0 up", "ifconfig eth0 up", "ifconfig eth0 down",
                                                "ifconfig eth0 down"));
}

HOST_TEST(LinkState, ThatIsNoneIsLoggedAndStored) {
    Writable writable(host);
    for (const unsigned int state : {0U, 2U, 32U, 33U, 4294967295U}) {
        LogCapture capture;
        writable.set(*writable.eth0(), 123, number(state));
        EXPECT_THAT(capture.ownMessages(6000),
                    ElementsAre("IPConfigNode::setProperty: Invalid status request."));
        EXPECT_THAT(capture.ownMessages(3000), Contains("Status Value : " + std::to_string(state)));
        EXPECT_EQ(PortHost::stored(*writable.eth0(), 123), number(state));
    }
    EXPECT_THAT(writable.changes(), IsEmpty());
}

HOST_TEST(LinkState, ThatIsNoneRunsAnEmptyCommand) {
    Writable writable(host);
    const CommandLines commands;
    LogCapture capture;
    writable.set(*writable.eth0(), 123, number(33));
    EXPECT_EQ(commands.all().back(), "");
    EXPECT_THAT(capture.ownMessages(), Contains(testing::StartsWith("mypopen():  Count value ")));
}

HOST_TEST(LinkState, OfABondTakesTheMonitorsReportsWithoutACommand) {
    PortHost plugin(host, "bond-two-members");
    const auto bond = plugin.build().config("bond0");
    LogCapture capture;
    EXPECT_EQ(bond->setProperty(123, number(33)).getStatus(), 0);
    EXPECT_THAT(capture.ownMessages(), Contains("Status updation for bonded interface. New status is: 33"));
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
    EXPECT_EQ(PortHost::stored(*bond, 123), number(33));
    EXPECT_THAT(host.callsOf("ifconfig"), ElementsAre("ifconfig bond0", "ifconfig bond0")) << "reads alone";
}

// --- the interface file

HOST_TEST(Origin, IsWrittenInPlaceAndTheStartModeAppended) {
    host.file(kFile, "# mine\nBOOTPROTO='dhcp'\nMTU=1500\n");
    const CommandLines commands;
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_THAT(commands.all(), ElementsAre("rpm -qa | grep dhcpv6*"));
    EXPECT_EQ(host.read(kFile), "# mine\nBOOTPROTO=static\nMTU=1500\nSTARTMODE='auto'\n");
    EXPECT_THAT(host.calls(), ElementsAre("rpm -qa"));
    EXPECT_THAT(capture.ownMessages(3000),
                ElementsAre("setIPOrigin: entry", std::string("File open ") + kFile + " in read mode.",
                            "setIPOrigin: exit"));
    EXPECT_THAT(capture.ownMessages(4000),
                ElementsAre("IP Origin  = 3", "File open '/etc/sysconfig/network' in write mode."));
}

HOST_TEST(Origin, OfDhcpIsWrittenSoWhateverRpmSays) {
    host.file(kFile, "STARTMODE='manual'\nBOOTPROTO=static\nIPADDR=192.0.2.1\n");
    IC::setIPOrigin("eth0", origin(1), kMac);
    EXPECT_EQ(host.read(kFile), "STARTMODE='auto'\nBOOTPROTO=dhcp\nIPADDR=192.0.2.1\n")
        << "old addresses stay";
}

HOST_TEST(Origin, OfDhcpIsDhcp4WhenThePackagesCannotBeAsked) {
    host.file(kFile, "BOOTPROTO=static\n");
    const NoDescriptors none;
    IC::setIPOrigin("eth0", origin(1), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp4\nSTARTMODE='auto'\n");
}

HOST_TEST(Origin, OfAnyOtherKindKeepsTheLineAndRepeatsTheLastWhenThereIsNone) {
    host.file(kFile, "BOOTPROTO=dhcp\n");
    IC::setIPOrigin("eth0", origin(2), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\nSTARTMODE='auto'\n");
    host.file(kFile, "MTU=1500\nNAME=x\n");
    IC::setIPOrigin("eth0", origin(2), kMac);
    EXPECT_EQ(host.read(kFile), "MTU=1500\nNAME=x\nNAME=x\nSTARTMODE='auto'\n");
}

HOST_TEST(Origin, OnAMissingFileCreatesIt) {
    host.directory("/etc/sysconfig/network");
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nSTARTMODE='auto'\n");
    host.remove(kFile);
    IC::setIPOrigin("eth0", origin(2), kMac);
    EXPECT_EQ(host.read(kFile), "STARTMODE='auto'\n");
}

HOST_TEST(Origin, ThatCannotBeWrittenIsPassedOver) {
    host.file(kFile, "BOOTPROTO=dhcp\n");
    host.readOnly("/etc");
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\n");
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
    EXPECT_THAT(capture.ownMessages(4000), ElementsAre("IP Origin  = 3"));
}

HOST_TEST(Address, IsWrittenAndLeftToTheNextStart) {
    host.file(kFile, "BOOTPROTO=dhcp\nIPADDR='192.0.2.1'\n#IPADDR=old\n");
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\nIPADDR=192.0.2.77\nIPADDR=192.0.2.77\n")
        << "every line that holds the key is replaced, a comment too";
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(Address, IsLookedForBesideTheOriginInTheSameLine) {
    host.file(kFile, "BOOTPROTO=static IPADDR=192.0.2.1\n");
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "IPADDR=192.0.2.77\n");
    host.file(kFile, "BOOTPROTO=static NETMASK=255.0.0.0\n");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static NETMASK=255.0.0.0\nNETMASK=255.255.0.0\n")
        << "the mask's writer looks at such a line for the origin alone";
}

HOST_TEST(Address, OnAMissingFileCreatesIt) {
    host.directory("/etc/sysconfig/network");
    LogCapture capture;
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nIPADDR=192.0.2.77\n");
    EXPECT_EQ(capture.ownMessages().front(), "Entering setIPv4Address");
}

HOST_TEST(Mask, OnAMissingFileCreatesItAndChangesTheRunningInterface) {
    host.directory("/etc/sysconfig/network");
    host.tool("ifconfig eth0 netmask 255.255.255.128", "");
    LogCapture capture;
    IC::setSubnetMask("eth0", "255.255.255.128", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nNETMASK=255.255.255.128\n");
    EXPECT_THAT(host.calls(), ElementsAre("ifconfig eth0 netmask 255.255.255.128"));
    EXPECT_EQ(capture.ownMessages().front(), "Entering setSubnetMask");
    EXPECT_THAT(capture.ownMessages(4000), ElementsAre("Writing Subnet to File"));
}

HOST_TEST(Mask, IsWrittenInPlace) {
    host.file(kFile, "BOOTPROTO=dhcp\nNETMASK='255.0.0.0'\nMTU=1500\n");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    const CommandLines commands;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\nNETMASK=255.255.0.0\nMTU=1500\n");
    EXPECT_THAT(commands.all(), ElementsAre("ifconfig eth0 netmask 255.255.0.0"));
}

HOST_TEST(Mask, ThatCannotBeWrittenStillChangesTheRunningInterface) {
    host.file(kFile, "BOOTPROTO=static\nNETMASK=255.0.0.0\n");
    host.readOnly("/etc");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    LogCapture capture;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nNETMASK=255.0.0.0\n");
    EXPECT_THAT(capture.ownMessages(6000), ElementsAre("Failed to open the file for writing"));
    EXPECT_THAT(host.calls(), ElementsAre("ifconfig eth0 netmask 255.255.0.0"));
}

HOST_TEST(Mask, SaysWhenNoCommandCanBeStarted) {
    LogCapture capture;
    const NoDescriptors none;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_THAT(capture.ownMessages(6000),
                ElementsAre("Failed to open the file for writing", "Can not Change Subnet Mask."));
}

HOST_TEST(Mask, OfAnyLengthRunsNoCommandThatDoesNotFit) {
    host.directory("/etc/sysconfig/network");
    LogCapture capture;
    IC::setSubnetMask("eth0", std::string(100000, '1'), kMac);
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_THAT(capture.ownMessages(6000), Contains("Can not Change Subnet Mask."));
    EXPECT_EQ(host.read(kFile)->size(), std::string("BOOTPROTO=static\nNETMASK=\n").size() + 100000);
}

// --- the gateway

HOST_TEST(Gateway, DeletesTheHostRouteAndWritesTwoFiles) {
    host.file(kRoutes,
              "# routes\ndefault\t192.0.2.1\t-\ndefault\tfe80::1\t-\n10.0.0.0 192.0.2.3 255.0.0.0 eth0\n");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.2 eth0", "");
    LogCapture capture;
    IC::setIPV4Gateway("eth0", "192.0.2.10", "192.0.2.2");
    EXPECT_THAT(host.calls(), ElementsAre("route del -host 192.0.2.10 gw 192.0.2.2 eth0"));
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifroute-eth0"), "192.0.2.10\t192.0.2.2\t-\n");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.2\t-\n# routes\ndefault\tfe80::1\t-\n");
    EXPECT_EQ(capture.ownMessages().front(), "Entering setIPV4Gateway");
    EXPECT_THAT(capture.ownMessages(), Contains("setIPv4GatewayForSuSe10: entry"));
}

HOST_TEST(Gateway, ThatIsEmptyLeavesTheDefaultRoute) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.tool("route del -host 192.0.2.10 gw eth0", "");
    const CommandLines commands;
    LogCapture capture;
    IC::setIPV4Gateway("eth0", "192.0.2.10", "");
    EXPECT_THAT(commands.all(), ElementsAre("route del -host 192.0.2.10 gw  eth0 2> /dev/null"));
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifroute-eth0"), "192.0.2.10\t\t-\n");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
    EXPECT_THAT(capture.ownMessages(), Contains("Either NIC or gateway is null"));
}

HOST_TEST(Gateway, OfARoutesFileWithTwoFamiliesKeepsTheIPv6Line) {
    host.file(kRoutes, "default\t192.0.2.1\t-\ndefault\tfe80::1\t-\n");
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.2\t-\ndefault\tfe80::1\t-\n");
}

HOST_TEST(Gateway, OfARoutesFileOfCommentsBecomesTheNewLineAlone) {
    host.file(kRoutes, "# one\n# two\n");
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.2\t-\n");
}

HOST_TEST(Gateway, WithoutARoutesFileMakesNone) {
    host.directory("/etc/sysconfig/network");
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_FALSE(host.exists(kRoutes));
}

HOST_TEST(Gateway, WithoutInterfaceOrGatewayDoesNothing) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    LogCapture capture;
    IC::setIPv4GatewayForSuSe10("", "192.0.2.2");
    IC::setIPv4GatewayForSuSe10("eth0", "");
    EXPECT_THAT(capture.ownMessages(), Contains("Either NIC or gateway is null").Times(2));
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
}

HOST_TEST(Gateway, ThatCannotBeWrittenStopsBeforeTheRoutesFile) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.directory("/etc/sysconfig/network/ifroute-eth0");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.2 eth0", "");
    LogCapture capture;
    IC::setIPV4Gateway("eth0", "192.0.2.10", "192.0.2.2");
    EXPECT_THAT(capture.ownMessages(6000),
                Contains("Can not open '/etc/sysconfig/network/ifroute' in write mode."));
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
}

HOST_TEST(Gateway, WritesNothingWhenTheRouteCannotBeDeleted) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    IC::setIPV4Gateway("eth0", std::string(600, '1'), "192.0.2.2");  // no such command is started
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
    EXPECT_FALSE(host.exists("/etc/sysconfig/network/ifroute-eth0"));
}

HOST_TEST(Gateway, ThroughTheNodeTakesItsAddress) {
    Writable writable(host);
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.2 eth0", "");
    LogCapture capture;
    EXPECT_EQ(writable.set(*writable.eth0(), 100, text("192.0.2.2"), kRoutes), "default\t192.0.2.2\t-\n");
    EXPECT_THAT(capture.ownMessages(), Contains("Gateway :: 192.0.2.2"));
}

// --- what nothing calls

HOST_TEST(Utilities, RestartTheNetworkAndLeaveNetworkManagerAlone) {
    LogCapture capture;
    IC::restartNetwork();
    IC::disableNMControlled("eth0");
    EXPECT_THAT(host.calls(), ElementsAre("service network restart"));
    EXPECT_THAT(capture.ownMessages(),
                testing::IsSupersetOf({"restartNetwork Called.", "Entering disableNMControlled\n",
                                       "Exiting disableNMControlled\n"}));
    capture.clear();
    const NoDescriptors none;
    IC::restartNetwork();
    EXPECT_THAT(capture.ownMessages(6000), ElementsAre("Can not bring up interface."));
}

}  // namespace
