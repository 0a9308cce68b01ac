// The rows of the bridge listing: what is taken for a name, which interfaces are bridges, and what a name can
// do.
#include <gmock/gmock.h>
#include <unistd.h>

#include "tests/network/port_host.h"
#include "tests/support/command_lines.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Contains;
using testing::IsEmpty;
using testing::Not;

constexpr char kData[] = "/opt/vantrel/corvista/data";

/// Interfaces that the kernel and `ifconfig` list and that have nothing else to tell.
void listInterfaces(FakeHost& host, const std::vector<std::string>& names) {
    std::string devices = "Inter-|   Receive\n face |bytes\n";
    std::string listing;
    for (const std::string& name : names) {
        devices += "  " + name + ":1 2\n";
        listing += name + "      Link encap:Ethernet\n";
        host.tool("ifconfig " + name, "");
        host.tool("ip -6 address show dev " + name, "");
    }
    host.file("/proc/net/dev", devices);
    host.tool("ifconfig", listing);
    host.tool("ifconfig -a", listing);
}

HOST_TEST(BridgeRows, GiveABridgeItsNameWhateverTheNameHolds) {
    PortHost plugin(host, "containers");
    plugin.build();
    EXPECT_THAT(plugin.names(12), IsEmpty()) << "its card and the containers' links are members";
    EXPECT_THAT(plugin.names(29), TextsAre("br0", "docker0"));
    EXPECT_EQ(plugin.config("docker0")->getDescription(), "Bridge");
    EXPECT_EQ(plugin.config("docker0")->getLinkedId(), plugin.controller());
    EXPECT_EQ(PortHost::live(*plugin.config("docker0"), 25), text("198.51.100.1"));
    EXPECT_THAT(host.listDirectory(kData), TextsAre("ifcfg-br0", "ifcfg-docker0"));
}

HOST_TEST(BridgeRows, RemoveNothingWhereTheAgentStands) {
    PortHost plugin(host, "containers");
    host.tool("brctl show",
              "bridge name\tbridge id\t\tSTP enabled\tinterfaces\n"
              "docker0\t\t8000.02425e000402\tno\t\tveth1\n\t\t\t\t\t\t\t*\n"
              "cni0 8000.02425e000403 no *\npodman0\t\t8000.02425e000404\tno\t\t*\n");
    listInterfaces(host, {"docker0", "cni0", "podman0"});
    host.file("/proc/net/dev", "");
    for (const char* name : {"no", "veth1", "8000.02425e000402", "mine"}) {
        host.file(std::string("/var/home/") + name, "");
    }
    ASSERT_EQ(chdir("/var/home"), 0);
    plugin.build();
    EXPECT_THAT(host.listDirectory(kData), TextsAre("ifcfg-cni0", "ifcfg-docker0", "ifcfg-podman0"));
    plugin.mi().unload();
    EXPECT_THAT(host.listDirectory("/var/home"), TextsAre("8000.02425e000402", "mine", "no", "veth1"));
}

HOST_TEST(BridgeRows, DescribeABridgeThatTheKernelsListNamedFirst) {
    PortHost plugin(host, "suse-two-nics");
    listInterfaces(host, {"breth1", "br-bond0", "eth-plain", "docker0"});
    host.tool(
        "brctl show",
        "bridge name\tbridge id\t\tSTP enabled\tinterfaces\n"
        "breth1\t\t8000.1\tno\t\tvnet0\nbr-bond0\t\t8000.2\tno\t\tvnet1\ndocker0\t\t8000.3\tno\t\tvnet2\n");
    plugin.build();
    EXPECT_THAT(plugin.names(29), TextsAre("breth1", "br-bond0", "eth-plain", "docker0"));
    for (const char* bridge : {"breth1", "br-bond0", "docker0"}) {
        EXPECT_EQ(plugin.config(bridge)->getDescription(), "Bridge") << bridge;
    }
    EXPECT_EQ(plugin.config("eth-plain")->getDescription(), "IP Configuration");
}

HOST_TEST(BridgeRows, OfFurtherMembersAreNoBridges) {
    PortHost plugin(host, "suse-two-nics");
    listInterfaces(host, {"veth1", "vnet2", "docker0"});
    const std::string head = "bridge name\tbridge id\t\tSTP enabled\tinterfaces\n";
    const std::string row = "docker0\t\t8000.1\tno\t\tveth0\n";
    const std::string more = "\t\t\t\t\t\t\tveth1\n\t\t\t\t\t\t\tvnet2\n";
    // Taken out of the bridge between the two looks at it: no members any more.
    host.toolInTurn("brctl show", {{head + row + more}, {head + row}});
    plugin.build();
    EXPECT_EQ(plugin.config("veth1")->getDescription(), "IP Configuration");
    EXPECT_EQ(plugin.config("vnet2")->getDescription(), "IP Configuration");
    EXPECT_EQ(plugin.config("docker0")->getDescription(), "Bridge");
}

HOST_TEST(BridgeRows, OfMembersMakeNoNodes) {
    PortHost plugin(host, "containers");
    const CommandLines commands;
    plugin.build();
    for (const char* member : {"eth0", "veth1", "veth2"}) {
        IC::MutableNode* known = nullptr;
        EXPECT_FALSE(plugin.mi().findNetworkPort(member, &known)) << member;
        EXPECT_THAT(commands.all(), Not(Contains(testing::HasSubstr(member)))) << member;
    }
}

}  // namespace
