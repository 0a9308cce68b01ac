// The write side of IP configurations: which property goes to which writer.
#include <gmock/gmock.h>

#include "tests/network/one_node.h"
#include "tests/support/command_lines.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using IC::PropertyValue;
using testing::Contains;
using testing::IsEmpty;
using testing::Not;

constexpr char kFile[] = "/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:01";
constexpr char kRoutes[] = "/etc/sysconfig/network/routes";

PropertyValue origin(unsigned int code) {
    return enumeration(code);
}

/// Two interfaces, eth0 with a fixed address and eth1 with DHCP, ready for writes.
class Writable {
public:
    explicit Writable(FakeHost& host)
        : interface_(host, "suse-two-nics"), host_(host), eth0_(interface_.config("eth0")) {
        host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");
    }
    std::shared_ptr<IC::MutableNode> eth0() { return eth0_; }
    std::shared_ptr<IC::MutableNode> eth1() {
        return eth1_ != nullptr ? eth1_ : eth1_ = interface_.config("eth1");
    }
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

private:
    OneNode interface_;
    FakeHost& host_;
    const std::shared_ptr<IC::MutableNode> eth0_;
    std::shared_ptr<IC::MutableNode> eth1_;
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
    PortHost plugin(host, "suse-two-nics");
    const auto eth0 = plugin.build().config("eth0");
    LogCapture capture;
    eth0->setProperty(74, number(0));
    EXPECT_EQ(PortHost::stored(*eth0, 74), number(0));
    EXPECT_THAT(capture.ownMessages(), Not(Contains("createNetworkPortNodes: entry")));
    eth0->setProperty(74, number(1));
    EXPECT_EQ(PortHost::stored(*eth0, 74), number(0)) << "the value before";
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
    EXPECT_THAT(writable.changes(), TextsAre("ifconfig eth0 netmask 255.255.0.0"));
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
    EXPECT_THAT(writers, TextsAre("disableNetConfigDNSPolicy: Entering", "setIPOrigin: entry"));
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

HOST_TEST(Dispatch, StoresWhatItHasActedOn) {
    Writable writable(host);
    host.recordOnly("ip");
    host.recordOnly("route");
    host.recordOnly("hostname");
    const auto node = writable.eth0();
    const std::pair<unsigned int, PropertyValue> changes[] = {
        {94, texts({"203.0.113.1"})}, {99, texts({"a.example"})}, {97, text("web")},
        {98, text("example.net")},    {27, text("2001:db8::77")}, {100, text("192.0.2.2")},
        {101, text("fe80::7")},
    };
    for (const auto& [id, value] : changes) {
        writable.set(*node, id, value);
        EXPECT_EQ(PortHost::stored(*node, id), value) << "property " << id;
    }
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
    EXPECT_THAT(writable.changes(), TextsAre("hostname web.example.com", "hostname linux-a.example.net"));
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

HOST_TEST(Dispatch, OfAnIPv4GatewayTakesTheNodesAddress) {
    Writable writable(host);
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.2 eth0", "");
    LogCapture capture;
    EXPECT_EQ(writable.set(*writable.eth0(), 100, text("192.0.2.2"), kRoutes), "default\t192.0.2.2\t-\n");
    EXPECT_THAT(capture.ownMessages(), Contains("Gateway :: 192.0.2.2"));
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
    EXPECT_THAT(writable.changes(),
                TextsAre("ifconfig eth0 up", "ifconfig eth0 up", "ifconfig eth0 down", "ifconfig eth0 down"));
}

HOST_TEST(LinkState, ThatIsNoneIsLoggedAndStored) {
    Writable writable(host);
    for (const unsigned int state : {0U, 2U, 32U, 33U, 4294967295U}) {
        LogCapture capture;
        writable.set(*writable.eth0(), 123, number(state));
        EXPECT_THAT(capture.ownMessages(6000),
                    TextsAre("IPConfigNode::setProperty: Invalid status request."));
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
    OneNode interface(host, "bond-two-members");
    const auto bond = interface.config("bond0");
    const CommandLines commands;
    for (const unsigned int state : {32U, 33U}) {
        LogCapture capture;
        host.clearCalls();
        EXPECT_EQ(bond->setProperty(123, number(state)).getStatus(), 0);
        EXPECT_THAT(capture.ownMessages(), Contains("Status updation for bonded interface. New status is: " +
                                                    std::to_string(state)));
        EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
        EXPECT_EQ(PortHost::stored(*bond, 123), number(state));
        EXPECT_THAT(host.callsOf("ifconfig"), TextsAre("ifconfig bond0", "ifconfig bond0")) << "reads alone";
    }
    EXPECT_THAT(commands.all(), Not(Contains(""))) << "not even an empty one";
}

HOST_TEST(LinkState, OfABondIsSetLikeAnyOther) {
    OneNode interface(host, "bond-two-members");
    const auto bond = interface.config("bond0");
    host.tool("ifconfig bond0 up", "");
    host.tool("ifconfig bond0 down", "");
    LogCapture capture;
    for (const unsigned int state : {9U, 16U, 2U}) {
        EXPECT_EQ(bond->setProperty(123, number(state)).getStatus(), 0);
    }
    EXPECT_THAT(host.calls(), testing::IsSupersetOf({"ifconfig bond0 up", "ifconfig bond0 down"}));
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("IPConfigNode::setProperty: Invalid status request."));
}

}  // namespace
