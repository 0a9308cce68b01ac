#include "network/team_node.h"

#include <algorithm>

#include "mi/globals.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/network/bonding_files.h"
#include "tests/support/command_lines.h"
#include "tests/support/log_capture.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"
#include "tests/support/texts_are.h"

namespace {

using IC::NetworkTeamingNode;
using IC::PropertyValue;
using testing::ElementsAre;
using testing::IsEmpty;
using Lines = std::vector<std::string>;

constexpr unsigned int kMembers = 165;
constexpr unsigned int kName = 197;
constexpr unsigned int kMode = 198;

NetworkTeamingNode teamNode() {
    return {7, 3, {1}, 56, 1, "bond0"};
}

PropertyValue get(const IC::Node& node, unsigned int id) {
    PropertyValue value("untouched", true);
    const IC::Error error = node.getProperty(id, value);
    EXPECT_EQ(error.getStatus(), 0);
    EXPECT_EQ(error.code(), IC::Number());
    EXPECT_EQ(error.text(), "");
    return value;
}

PropertyValue text(const char* words) {
    return {words, true};
}

std::map<unsigned int, PropertyValue> stored(const IC::Node& node) {
    std::map<unsigned int, PropertyValue> properties;
    node.getProperties(properties);
    return properties;
}

/// The plug-in object with its static tree up to the computer.
struct Plugin {
    explicit Plugin(FakeHost& host) {
        host.expectUnrecorded();
        mi.ManagementInterface::initialize(1, IC::Number(1U), IC::Number(2U));
        mi.createOsHwNodes();
        mi.createRootNode();
        mi.createComputerNodes();
    }
    std::vector<IC::MutableNode*> teams() {
        std::vector<IC::Node*> all;
        mi.getMap(all);
        std::vector<IC::MutableNode*> found;
        for (IC::Node* node : all) {
            auto* team = dynamic_cast<NetworkTeamingNode*>(node);
            if (team != nullptr) {
                found.push_back(team);
            }
        }
        return found;
    }
    IC::OsHwMI mi;
};

HOST_TEST(TeamNode, AnswersLive) {
    const NetworkTeamingNode node = teamNode();
    installBond(host, "bond0", "active-backup");
    EXPECT_EQ(get(node, kName), text("bond0"));
    EXPECT_EQ(get(node, kMode), text("fault-tolerance (active-backup)"));
    EXPECT_EQ(get(node, kMembers), PropertyValue(Lines{"eth0", "eth1"}, true));
    installBond(host, "bond0", "802.3ad-details");
    EXPECT_EQ(get(node, kMode), text("IEEE 802.3ad Dynamic link aggregation"));
    EXPECT_EQ(get(node, kMembers), PropertyValue(Lines{"eth2", "eth3"}, true));
}

HOST_TEST(TeamNode, LeavesTheValueAloneWhenTheHostHasNoAnswer) {
    NetworkTeamingNode node = teamNode();
    node.setProperty(kMembers, PropertyValue(Lines{"stored"}, true));
    EXPECT_EQ(get(node, kMode), text("untouched"));
    EXPECT_EQ(get(node, kMembers), text("untouched"));
    EXPECT_EQ(get(node, kName), text("bond0"));
    installBond(host, "bond0", "no-members");
    EXPECT_EQ(get(node, kMembers), text("untouched"));
}

HOST_TEST(TeamNode, AnswersOtherIdsFromTheStoreAndAlwaysSucceeds) {
    NetworkTeamingNode node = teamNode();
    EXPECT_EQ(get(node, 108), text("untouched"));
    EXPECT_EQ(node.setProperty(108, text("stored")).getStatus(), 0);
    EXPECT_EQ(get(node, 108), text("stored"));
}

HOST_TEST(TeamNode, CannotBeChanged) {
    installBond(host, "bond0", "active-backup");
    NetworkTeamingNode node = teamNode();
    const CommandLines commands;
    IC::OSHWMI::bInitflag = true;
    for (const unsigned int id : {kName, kMode, kMembers}) {
        EXPECT_EQ(node.setProperty(id, text("changed")).getStatus(), 0);
    }
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_EQ(get(node, kName), text("bond0"));
    EXPECT_EQ(get(node, kMode), text("fault-tolerance (active-backup)"));
}

HOST_TEST(TeamNode, LogsItsWay) {
    LogCapture capture;
    {
        NetworkTeamingNode node = teamNode();
        node.setProperty(1, text("x"));
        get(node, 1);
    }
    const std::string name = "NetworkTeamingNode::";
    Lines expected;
    for (const char* member : {"NetworkTeamingNode", "setProperty", "getProperty", "~NetworkTeamingNode"}) {
        expected.push_back(name + member + ": entry");
        expected.push_back(name + member + ": exit");
    }
    EXPECT_EQ(capture.messages(3000), expected);
}

HOST_TEST(TeamNodes, AreMadeUnderTheComputer) {
    installBond(host, "bond0", "active-backup");
    host.file("/proc/net/bonding/bond0~", "");
    Plugin plugin(host);
    const CommandLines commands;
    plugin.mi.createNetworkTeamingNodes();
    ASSERT_EQ(plugin.teams().size(), 1U);
    const IC::MutableNode& node = *plugin.teams().front();
    EXPECT_EQ(node.nodeType(), 56U);
    EXPECT_EQ(node.getIndex(), 1U);
    EXPECT_EQ(node.getNodeId(), 4U);
    EXPECT_EQ(node.getLinkedId(), IC::OsHwMITestAccess::computer(plugin.mi)->getNodeId());
    EXPECT_THAT(node.getMIIds(), ElementsAre(1U));
    EXPECT_EQ(stored(node), (std::map<unsigned int, PropertyValue>{
                                {kName, text("bond0")},
                                {kMode, text("fault-tolerance (active-backup)")},
                                {kMembers, PropertyValue(Lines{"eth0", "eth1"}, true)},
                            }));
    EXPECT_THAT(commands.all(),
                ElementsAre(testing::HasSubstr("Bonding Mode: "), testing::HasSubstr("Slave Interface: ")));
}

HOST_TEST(TeamNodes, ThatFailAreLoggedAndTheNextIsMade) {
    installBond(host, "bond0", "active-backup");
    installBond(host, "bond1", "active-backup");
    Plugin plugin(host);
    shell_stub::beforeEach([](const std::string& command) {
        if (command.find("Bonding Mode: ") != std::string::npos &&
            command.find("bond0") != std::string::npos) {
            throw std::runtime_error("out of luck");
        }
    });
    const LogCapture capture;
    plugin.mi.createNetworkTeamingNodes();
    shell_stub::beforeEach({});
    EXPECT_THAT(capture.messages(6000), TextsAre("NetworkTeaming node error"));
    std::vector<PropertyValue> names;
    for (const IC::MutableNode* team : plugin.teams()) {
        names.push_back(stored(*team)[kName]);
    }
    EXPECT_THAT(names, testing::Contains(text("bond1")));
}

HOST_TEST(TeamNodes, AreNumberedInTheOrderOfTheDirectory) {
    for (const char* name : {"bond0", "bond1", "bond2"}) {
        installBond(host, name, "802.3ad");
    }
    Plugin plugin(host);
    plugin.mi.createNetworkTeamingNodes();
    ASSERT_EQ(plugin.teams().size(), 3U);
    Lines names;
    unsigned int index = 0;
    for (const IC::MutableNode* node : plugin.teams()) {
        EXPECT_EQ(node->getIndex(), ++index);
        EXPECT_EQ(node->getNodeId(), 3 + index);
        names.push_back(std::string(get(*node, kName)));
    }
    EXPECT_THAT(names, testing::UnorderedElementsAre("bond0", "bond1", "bond2"));
}

HOST_TEST(TeamNodes, WithoutMembersStoreNone) {
    installBond(host, "bond0", "no-members");
    host.file("/proc/net/bonding/bond1", "");
    Plugin plugin(host);
    plugin.mi.createNetworkTeamingNodes();
    ASSERT_EQ(plugin.teams().size(), 2U);
    for (const IC::MutableNode* node : plugin.teams()) {
        const auto properties = stored(*node);
        const bool isBond0 = properties.at(kName) == text("bond0");
        EXPECT_EQ(properties.count(kMembers), 0U);
        EXPECT_EQ(properties.count(kMode), isBond0 ? 1U : 0U);
        EXPECT_EQ(get(*node, kMembers), text("untouched"));
    }
}

HOST_TEST(TeamNodes, ThatCannotBeMadeAreLoggedAndTheOthersMade) {
    for (const char* name : {"bond0", "bond1"}) {
        installBond(host, name, "802.3ad");
    }
    Plugin plugin(host);
    std::string broken;
    shell_stub::beforeEach([&](const std::string& command) {
        if (broken.empty() && command.find("Bonding Mode: ") != std::string::npos) {
            broken = command.substr(std::string("cat /proc/net/bonding/").size(), 5);
            throw std::runtime_error("out of luck");
        }
    });
    LogCapture capture;
    plugin.mi.createNetworkTeamingNodes();
    shell_stub::beforeEach({});
    EXPECT_THAT(capture.messages(6000), TextsAre("NetworkTeaming node error"));
    const auto teams = plugin.teams();
    ASSERT_EQ(teams.size(), 2U);
    EXPECT_EQ(get(*teams[0], kName), text(broken.c_str()));
    EXPECT_EQ(stored(*teams[0]).count(kMode), 0U);
    EXPECT_EQ(stored(*teams[1]).count(kMode), 1U);
    EXPECT_EQ(teams[1]->getIndex(), 2U);
}

HOST_TEST(TeamNodes, AreNoneWithoutADriver) {
    Plugin plugin(host);
    LogCapture capture;
    plugin.mi.createNetworkTeamingNodes();
    EXPECT_THAT(plugin.teams(), IsEmpty());
    EXPECT_THAT(capture.messages(), TextsAre("createNetworkTeamingNodes: entry", "Entering getNICTeams",
                                             "Exiting getNICTeams", "createNetworkTeamingNodes: exit"));
}

}  // namespace
