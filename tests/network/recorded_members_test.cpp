// What the bonding driver and `brctl` told of members, through the machine's own text tools.
#include <gmock/gmock.h>

#include "network/interface_lists.h"
#include "network/link_queries.h"
#include "tests/network/recording.h"
#include "tests/support/fake_host.h"

namespace {

using Names = std::vector<std::string>;

struct Bond {
    const char* file;
    Names members;  ///< as they are listed
    bool up;        ///< when all of them have a link
    Names probed;   ///< as they are asked for a link, where that differs
};

const std::vector<Bond>& bonds() {
    static const std::vector<Bond> all = {
        {"2.6.5", {"eth0", "eth1"}, true, {}},
        {"2.6.32", {"eth2", "eth3"}, true, {}},
        // The bond's own word for a member does not count: the link is asked of the member.
        {"5.10", {"ens1f0", "ens1f1"}, true, {}},
        {"no-members", {}, false, {}},
        {"down-no-members", {}, false, {}},
        {"down-with-members", {"eth0"}, false, {}},
        {"one-member", {"eth0"}, true, {}},
        {"eight-members", {"eth0", "eth1", "eth2", "eth3", "eth4", "eth5", "eth6", "eth7"}, true, {}},
        {"vlan-members", {"eth0.10", "eth1.10"}, true, {}},
        {"nothing", {}, false, {}},
        {"status-not-reported", {"eth0"}, false, {}},
        {"up-only-in-member", {"eth0"}, true, {}},
        {"status-interrupted", {"eth0"}, true, {}},  // "interrUPted"
        {"status-upper-case", {"eth0"}, false, {}},
        {"lower-case-label", {}, false, {}},
        // The list takes a blank behind the label for granted, the probe does not.
        {"no-blank-behind-label", {"th0"}, true, {"eth0"}},
        {"two-blanks-behind-label", {" eth0"}, true, {"eth0"}},
        {"label-with-more-before-it", {"eth0"}, true, {}},
        {"blanks-behind-name", {"eth0"}, true, {}},
        {"empty-name", {""}, false, {}},
        {"truncated-in-name", {"eth"}, true, {}},
        {"truncated-in-label", {}, false, {}},
        {"carriage-returns", {"eth0\r"}, false, {}},  // such a name enters no command
    };
    return all;
}

void setLink(FakeHost& host, const std::string& member, bool up) {
    const std::string command = member.empty() ? "ethtool" : "ethtool " + member;
    const bool known = !member.empty();
    host.tool(command, known ? std::string("\tLink detected: ") + (up ? "yes\n" : "no\n") : "",
              known ? 0 : 1);
}

HOST_TEST(RecordedBonds, Members) {
    for (const Bond& bond : bonds()) {
        SCOPED_TRACE(bond.file);
        host.file("/proc/net/bonding/bond0", recording(std::string("bonding/") + bond.file + ".txt"));
        Names members;
        EXPECT_TRUE(IC::getSlaveInterfaces("bond0", members));
        EXPECT_EQ(members, bond.members);
    }
}

HOST_TEST(RecordedBonds, AreUpWithAllTheirMembers) {
    for (const Bond& bond : bonds()) {
        SCOPED_TRACE(bond.file);
        host.file("/proc/net/bonding/bond0", recording(std::string("bonding/") + bond.file + ".txt"));
        const Names& members = bond.probed.empty() ? bond.members : bond.probed;
        for (const std::string& member : members) {
            setLink(host, member, true);
        }
        EXPECT_EQ(IC::isNICUp("bond0"), bond.up);
        for (const std::string& unplugged : members) {
            setLink(host, unplugged, false);
            EXPECT_FALSE(IC::isNICUp("bond0")) << "without " << unplugged;
            setLink(host, unplugged, true);
        }
    }
}

struct Bridges {
    const char* file;
    Names members;
    bool any;
};

const std::vector<Bridges>& bridges() {
    static const std::vector<Bridges> all = {
        {"no-bridge", {}, false},
        {"one-bridge-one-member", {"eth0"}, true},
        {"one-bridge-three-members", {"eth0", "eth1", "tap0"}, true},
        {"two-bridges", {"eth0", "virbr0-nic", "vnet0"}, true},
        {"docker", {"veth3f21a0c", "veth9be0077"}, true},
        {"long-bridge-name", {"veth00a1b2c"}, true},
        {"new-tool-header", {"ens3"}, true},
        {"blanks-for-tabs", {"eth0", "eth1"}, true},
        // Without a member the last column is the one before: whether the bridge runs a spanning tree.
        {"bridge-without-members", {"no"}, true},
        {"bridge-without-members-trimmed", {"no"}, true},
        {"bridges-with-and-without", {"eth0", "yes"}, true},
        {"member-named-interfaces", {"eth1"}, true},
        {"not-supported", {"exist!"}, true},
        {"nothing", {}, false},
        {"blank-lines", {"", ""}, true},
        {"truncated", {"8000.001a64"}, true},
        {"carriage-returns", {"eth0\r"}, true},
    };
    return all;
}

HOST_TEST(RecordedBridges, Members) {
    for (const Bridges& row : bridges()) {
        SCOPED_TRACE(row.file);
        host.tool("brctl show", recording(std::string("brctl/") + row.file + ".txt"));
        Names members;
        EXPECT_EQ(IC::getbridgeInterfaces(members), row.any);
        EXPECT_EQ(members, row.members);
    }
}

}  // namespace
