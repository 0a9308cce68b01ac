// Start and stop of the whole plug-in.
#include <gmock/gmock.h>

#include <algorithm>
#include <stdexcept>
#include <thread>

#include "mi/disk_snapshot.h"
#include "mi/globals.h"
#include "mi/my_process.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"
#include "tests/support/texts_are.h"
#include "tests/support/waiting.h"
#include "tests/support/waits.h"

extern "C" int OpenMI(IC::ManagementInterface** mi, IC::Error** err);

namespace {

using IC::MutableNode;
using IC::Number;
using IC::OsHwMI;
using Access = IC::OsHwMITestAccess;

IC::Error initialize(OsHwMI& mi) {
    return mi.initialize(1, Number(1U), Number(2U));
}

std::vector<std::shared_ptr<MutableNode>> nodesOfType(const OsHwMI& mi, unsigned int type) {
    std::vector<std::shared_ptr<MutableNode>> found;
    for (const auto& node : mi.holdAll()) {
        if (node->nodeType() == type) {
            found.push_back(node);
        }
    }
    return found;
}

IC::Error refuse(IC::Node* const&, const void*) {
    return {7, Number(), "the agent is full"};
}

IC::Error throwing(IC::Node* const&, const void*) {
    throw std::runtime_error("the agent is broken");
}

/// How far the network monitor is when it is stopped decides whether it is aborted and waited for.
bool dependsOnTheMonitor(const std::string& message) {
    return message.starts_with("eventThreadNetIndications: Aborting") ||
           message.starts_with("eventThreadNetIndications: Waiting");
}

/// What the agent's thread logs on a host without disks, interfaces, tools and a data directory.
const std::vector<std::string> kWholeLife = {
    "initialize: entry",
    "updateHostAndDomainName: entry",
    "updateHostAndDomainName: exit",
    "createOsHwNodes: entry",
    "createOsHwNodes: exit",
    "Node::ROOT: start",
    "Node::ROOT: end",
    "createComputerNodes: entry",
    "ComputerNode::ComputerNode: entry",
    "ComputerNode::ComputerNode: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::getProperty: entry",
    "ComputerNode::getProperty : OwnerContact/OwnerName - Cannot read asset dat file.",
    "ComputerNode::getProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::getProperty: entry",
    "ComputerNode::getProperty : OwnerContact/OwnerName - Cannot read asset dat file.",
    "ComputerNode::getProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::getProperty: entry",
    "ComputerNode::getProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "ComputerNode::getProperty: entry",
    "ComputerNode::getProperty: exit",
    "ComputerNode::setProperty: entry",
    "ComputerNode::setProperty: exit",
    "createComputerNodes: exit",
    "createChassisNodes: entry",
    "createChassisNodes: exit",
    "createPlanarNodes: entry",
    "createPlanarNodes: exit",
    "createNetworkControllerNodes: entry",
    "createNetworkControllerNodes: exit",
    "createDiskControllerNodes: entry",
    "createDiskControllerNodes: exit",
    "createHardDriveNodes: entry",
    "createHardDriveNodes: exit",
    "createPartitionNodes: entry",
    "createPartitionNodes: exit",
    "createNetworkPortNodes: entry",
    "getbridgeInterfaces: entry",
    "getbridgeInterfaces: exit",
    "getDNSDetails: entry",
    "getDNSDetails: exit",
    "stringFormatForDNSServersAndSuffixes: entry",
    "stringFormatForDNSServersAndSuffixes: exit",
    "IPv6 configured: 0",
    "createNetworkPortNodes: exit",
    "createNetworkTeamingNodes: entry",
    "Entering getNICTeams",
    "Exiting getNICTeams",
    "createNetworkTeamingNodes: exit",
    "enableIndications: entry",
    "Creating NetworkMonitor thread.",
    "NetworkMonitor::NetworkMonitor: entry",
    "NetworkMonitor::NetworkMonitor: exit",
    "NetworkMonitor thread created.",
    "enableIndications: exit",
    "startHDDThread: entry",
    "HardDriveUpdateMonitor::const: entry",
    "HardDriveUpdateMonitor::Const: exit",
    "HardDriveUpdateThread thread created.",
    "startHDDThread: exit",
    "initialize: exit",
    "unload: entry",
    "HardDriveUpdateMonitor::stop: entry",
    "HardDriveUpdateMonitor::stop: exit",
    "disable Hard Drive updates: waiting for HardDriveUpdateMonitor Termination ",
    "disable Hard Drive updates: HardDriveUpdateMonitor terminated.",
    "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: entry",
    "HardDriveUpdateMonitor::~HardDriveUpdateMonitor: exit",
    "disableIndications: entry",
    "eventThreadNetIndications: Stopping thread...",
    "NetworkMonitor::stop: entry",
    "NetworkMonitor::stop: exit",
    "eventThreadNetIndicationsThread terminated.",
    "NetworkMonitor::~NetworkMonitor: entry",
    "NetworkMonitor::~NetworkMonitor: exit",
    "disableIndications: exit",
    "deleteSavedConfigurations: entry",
    "deleteSavedConfigurations: exit",
    "deleteFdiskTmp: entry",
    "Deleting /tmp/fdisk_tmp",
    "deleteFdiskTmp: exit",
    "unload: exit"};

HOST_TEST(OpenMI, HandsOutThePluginObjectAndItsErrorEachTime) {
    LogCapture capture;
    for (int i = 0; i < 2; ++i) {
        IC::ManagementInterface* mi = nullptr;
        IC::Error* error = nullptr;
        EXPECT_EQ(OpenMI(&mi, &error), 0);
        EXPECT_EQ(mi, &IC::myoshwmi);
        EXPECT_EQ(error, &IC::OSHWMI::myerr);
    }
    EXPECT_THAT(capture.messages(3000),
                TextsAre("OpenMI: entry", "OpenMI: exit", "OpenMI: entry", "OpenMI: exit"));
    EXPECT_EQ(capture.lines().front().function, "OpenMI");
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(Lifecycle, BuildsTheStaticTree) {
    initialize(IC::myoshwmi);
    struct Expected {
        unsigned int id, parent, type, index, status;
        const char* description;
    };
    const Expected expected[] = {
        {1, 0, 38, 0, 1, "OsHw Management Interface"},
        {2, 1, 59, 0, 1, "ROOT Node"},
        {3, 2, 40, 0, 1, "Computer"},
        {4, 3, 1, 0, 0, ""},
        {5, 4, 41, 0, 1, "Planar"},
        {6, 4, 49, 0, 1, "Network Controller"},
        {7, 5, 50, 1, 1, "Disk Controller"},
    };
    const auto nodes = IC::myoshwmi.holdAll();
    ASSERT_EQ(nodes.size(), std::size(expected));
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        SCOPED_TRACE(expected[i].description);
        EXPECT_EQ(nodes[i]->getNodeId(), expected[i].id);
        EXPECT_EQ(nodes[i]->getLinkedId(), expected[i].parent);
        EXPECT_EQ(nodes[i]->nodeType(), expected[i].type);
        EXPECT_EQ(nodes[i]->getIndex(), expected[i].index);
        EXPECT_EQ(nodes[i]->getStatus(), expected[i].status);
        EXPECT_EQ(nodes[i]->getDescription(), expected[i].description);
        EXPECT_EQ(nodes[i]->getMIIds(), std::vector<unsigned int>{1});
    }
    std::vector<IC::Node*> map;
    EXPECT_EQ(IC::myoshwmi.getMap(map).getStatus(), 0);
    EXPECT_EQ(map.size(), std::size(expected));
    EXPECT_THAT(Access::drawnIds(), testing::ElementsAre(2, 3, 4, 5, 6, 7)) << "the first was given";
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, TakesTheFirstDiskSnapshotAndRemovesItAtTheEnd) {
    host.tool("fdisk -ls", "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n");
    initialize(IC::myoshwmi);
    EXPECT_EQ(host.read("/tmp/fdisk_tmp"), "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n");
    EXPECT_EQ(nodesOfType(IC::myoshwmi, 11).size(), 1U);
    IC::myoshwmi.unload();
    EXPECT_FALSE(host.exists("/tmp/fdisk_tmp"));
}

HOST_TEST(Lifecycle, StartsTheFirstDiskSnapshotUnderTheFileLock) {
    std::optional<bool> lockWasFree;
    shell_stub::beforeEach([&](const std::string& command) {
        if (command == IC::diskSnapshotCommand) {
            lockWasFree = IC::OSHWMI::myfileLock.lock(0);
        }
    });
    initialize(IC::myoshwmi);
    EXPECT_EQ(lockWasFree, false);
    IC::myoshwmi.unload();
    shell_stub::beforeEach({});
}

HOST_TEST(Lifecycle, GoesOnWithoutASnapshotWhenTheShellCannotBeStarted) {
    LogCapture capture;
    {
        const NoDescriptors none;
        initialize(IC::myoshwmi);
    }
    EXPECT_THAT(capture.messages(6000),
                testing::Contains("Command : fdisk -ls 2>/dev/null > /tmp/fdisk_tmp failed!!"));
    EXPECT_EQ(nodesOfType(IC::myoshwmi, 50).size(), 1U);
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, TellsOfASnapshotThatHasNoPlaceAndGoesOnWithout) {
    host.file(std::string(IC::diskSnapshotPath) + "/in-the-way", "");
    const CommandLines commands;
    LogCapture capture;
    initialize(IC::myoshwmi);
    EXPECT_THAT(capture.messages(6000),
                testing::Contains("Command : fdisk -ls 2>/dev/null > /tmp/fdisk_tmp failed!!"));
    EXPECT_THAT(commands.all(), testing::Not(testing::Contains(testing::HasSubstr("fdisk"))));
    EXPECT_TRUE(nodesOfType(IC::myoshwmi, 11).empty());
    EXPECT_EQ(nodesOfType(IC::myoshwmi, 50).size(), 1U);
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, DoesNotAskHowFdiskEnded) {
    host.tool("fdisk -ls", "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n", 130);
    LogCapture capture;
    initialize(IC::myoshwmi);
    EXPECT_THAT(capture.messages(6000), testing::Not(testing::Contains(testing::HasSubstr("failed!!"))));
    EXPECT_EQ(nodesOfType(IC::myoshwmi, 11).size(), 1U);
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, LogsAStepThatThrowsAndGoesOn) {
    shell_stub::beforeEach([](const std::string& command) {
        if (command == IC::diskSnapshotCommand) {
            throw std::runtime_error("out of luck");
        }
        if (command == "cat /tmp/fdisk_tmp | grep ^/dev") {
            throw 7;
        }
    });
    LogCapture capture;
    initialize(IC::myoshwmi);
    shell_stub::beforeEach({});
    EXPECT_THAT(capture.messages(6000), testing::Contains("createDiskControllerNodes failed: out of luck"));
    EXPECT_THAT(capture.messages(6000), testing::Contains("createPartitionNodes failed: unknown exception"));
    EXPECT_TRUE(Access::monitorRuns()) << "the last step";
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, KnowsNoPortBeforeItsStart) {
    MutableNode* node = nullptr;
    EXPECT_FALSE(IC::myoshwmi.findNetworkPort("eth0", &node));
    EXPECT_EQ(node, nullptr);
}

HOST_TEST(Lifecycle, KeepsTheBaseResultAndGoesOnWhenTheBaseFails) {
    LogCapture capture;
    const IC::Error result = IC::myoshwmi.initialize(1, Number(), Number());
    EXPECT_NE(result.getStatus(), 0);
    EXPECT_THAT(capture.ownMessages(6000),
                testing::ElementsAre("ManagementInterface::initialize failed: " + result.text()));
    EXPECT_EQ(IC::OSHWMI::myerr.getStatus(), result.getStatus());
    EXPECT_TRUE(IC::OSHWMI::bInitflag);
    EXPECT_EQ(IC::myoshwmi.holdAll().size(), 7U);
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, ActsOnTheHostOnlyAfterTheStart) {
    EXPECT_FALSE(IC::OSHWMI::bInitflag);
    EXPECT_EQ(initialize(IC::myoshwmi).getStatus(), 0);
    EXPECT_TRUE(IC::OSHWMI::bInitflag);
    EXPECT_FALSE(IC::HardDriveNodeUpdate);
    IC::myoshwmi.unload();
    EXPECT_TRUE(IC::HardDriveNodeUpdate);
}

HOST_TEST(Lifecycle, FreesAllItKeptAtTheEndButTheNodes) {
    EXPECT_FALSE(Access::hasInventory());
    initialize(IC::myoshwmi);
    EXPECT_TRUE(Access::hasInventory());
    std::vector<IC::Node*> nodes;
    IC::myoshwmi.getMap(nodes);
    const std::weak_ptr<MutableNode> computer = nodesOfType(IC::myoshwmi, 40).front();
    LogCapture capture;
    IC::myoshwmi.unload();
    EXPECT_THAT(capture.messages(), testing::Not(testing::Contains("ComputerNode::~ComputerNode: entry")));
    EXPECT_FALSE(Access::hasInventory());
    EXPECT_TRUE(IC::myoshwmi.holdAll().empty());
    EXPECT_FALSE(computer.expired());
    EXPECT_EQ(IC::myoshwmi.unload().getStatus(), 0) << "a second stop finds nothing to do";
    initialize(IC::myoshwmi);
    EXPECT_EQ(IC::myoshwmi.holdAll().size(), nodes.size());
    for (const auto& next : IC::myoshwmi.holdAll()) {
        EXPECT_THAT(nodes, testing::Not(testing::Contains(next.get()))) << "a new start has nodes of its own";
    }
    IC::myoshwmi.unload();
    ASSERT_EQ(nodes.size(), 7U);
    EXPECT_EQ(nodes[1]->getDescription(), "ROOT Node") << "what the agent was given can still be read";
    EXPECT_EQ(nodes[2]->getStatus(), 1U);
}

HOST_TEST(Lifecycle, StartsAgainAfterAStop) {
    initialize(IC::myoshwmi);
    IC::myoshwmi.unload();
    initialize(IC::myoshwmi);
    EXPECT_EQ(IC::myoshwmi.holdAll().size(), 7U);
    EXPECT_FALSE(IC::HardDriveNodeUpdate) << "or the drive monitor would end at once";
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, StartedTwiceWithoutAStopHasOnePairOfMonitors) {
    initialize(IC::myoshwmi);
    LogCapture capture;
    initialize(IC::myoshwmi);
    EXPECT_THAT(capture.ownMessages(), testing::Contains("eventThreadNetIndicationsThread terminated."));
    EXPECT_THAT(capture.ownMessages(),
                testing::Contains("disable Hard Drive updates: HardDriveUpdateMonitor terminated."));
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, LogsARefusedNodeAndGoesOn) {
    initialize(IC::myoshwmi);
    IC::myoshwmi.setLoadCallBack(refuse, nullptr, nullptr);
    LogCapture capture;
    IC::myoshwmi.publishNode(new MutableNode(900, 1, {1}, 11, 0));
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("publishNode: entry", "addNewNode error = the agent is full", "publishNode: exit"));
    EXPECT_EQ(capture.ownMessages(6000), std::vector<std::string>{"addNewNode error = the agent is full"});
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, LogsANodeAtWhichTheAgentThrowsAndGoesOn) {
    host.toolInTurn("fdisk -ls",
                    {{""}, {"Disk /dev/sda: 1 GB, 1000 bytes\nDisk /dev/sdb: 1 GB, 1000 bytes\n"}});
    initialize(IC::myoshwmi);
    IC::myoshwmi.setLoadCallBack(throwing, nullptr, nullptr);
    LogCapture capture;
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_THAT(capture.ownMessages(6000), testing::ElementsAre("addNewNode error = the agent is broken",
                                                                "addNewNode error = the agent is broken"));
    EXPECT_EQ(Access::drives().size(), 2U) << "they keep their places";
    capture.clear();
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_THAT(capture.ownMessages(6000), testing::IsEmpty()) << "nothing is tried again";
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, WithdrawsTheNextNodeAlsoWhenTheAgentThrowsAtOne) {
    host.tool("fdisk -ls", "Disk /dev/sda: 1 GB, 1000 bytes\nDisk /dev/sdb: 1 GB, 1000 bytes\n");
    initialize(IC::myoshwmi);
    IC::myoshwmi.setWithdrawCallBack([](const IC::Node&, const void*) { throw 7; }, nullptr);
    LogCapture capture;
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_THAT(capture.ownMessages(6000), testing::ElementsAre("deleteNode error = unknown exception",
                                                                "deleteNode error = unknown exception"));
    EXPECT_EQ(Access::drives().size(), 2U);
    EXPECT_THAT(nodesOfType(IC::myoshwmi, 11), testing::SizeIs(2)) << "the new ones alone";
    IC::myoshwmi.unload();
}

/// Where a message stands among all, counted from 1; 0 while it does not.
std::ptrdiff_t place(const LogCapture& capture, const std::string& message) {
    const auto all = capture.messages();
    const auto found = std::ranges::find(all, message);
    return found == all.end() ? 0 : found - all.begin() + 1;
}

HOST_TEST(Lifecycle, WaitsForAWalkThatIsUnderWayBeforeItEmptiesTheTree) {
    initialize(IC::myoshwmi);
    host.tool("brctl show", ToolAnswer{.out = "", .action = kUntilItMayGoOn});
    host.clearCalls();
    LogCapture capture;
    std::thread walk([] { IC::myoshwmi.createNetworkPortNodes(true); });
    ASSERT_TRUE(eventually([&] { return !host.callsOf("brctl").empty(); }));
    std::thread letGoOn([&] {
        EXPECT_TRUE(eventually([&] { return place(capture, "disableIndications: exit") != 0; }));
        host.file("/go-on", "");
    });
    IC::myoshwmi.unload();
    walk.join();
    letGoOn.join();
    const std::ptrdiff_t walked = place(capture, "getDNSDetails: exit");  // behind what held the walk up
    EXPECT_GT(walked, 0);
    EXPECT_LT(walked, place(capture, "deleteSavedConfigurations: entry")) << "what comes after the tree";
}

HOST_TEST(Lifecycle, AStopInTheMiddleOfAComparisonWaitsForItAndLeavesNothing) {
    const std::string layout = "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n/dev/sda1 1 2 300 83 Linux\n";
    host.toolInTurn("fdisk -ls", {{.out = layout}, {.out = layout, .action = kUntilItMayGoOn}});
    const CommandLines commands;
    Waits waits;
    QX::setClockSpeed(1000);
    initialize(IC::myoshwmi);
    EXPECT_EQ(Access::drives().size(), 1U);
    EXPECT_EQ(Access::partitions().size(), 1U);
    ASSERT_TRUE(eventually([&] { return host.callsOf("fdisk").size() == 2; }));
    QX::setClockSpeed(1);
    waits.whenWeWait([&](double) { host.file("/go-on", ""); });
    LogCapture capture;
    IC::myoshwmi.unload();
    EXPECT_THAT(capture.messages(), testing::Contains("Partition Node Published")) << "it went to its end";
    EXPECT_EQ(host.callsOf("fdisk").size(), 2U);
    EXPECT_EQ(commands.all().back(), "rm /tmp/fdisk_tmp 2> /dev/null");
    EXPECT_FALSE(host.exists("/tmp/fdisk_tmp"));
    EXPECT_TRUE(IC::myoshwmi.holdAll().empty());
    EXPECT_TRUE(Access::drives().empty()) << "no pointers to nodes that are gone";
    EXPECT_TRUE(Access::partitions().empty());
}

HOST_TEST(Lifecycle, DeletesTheSnapshotByOneQuietCommand) {
    const CommandLines commands;
    IC::deleteFdiskTmp();
    EXPECT_EQ(commands.all(), std::vector<std::string>{"rm /tmp/fdisk_tmp 2> /dev/null"});
}

HOST_TEST(Lifecycle, StopsWithoutAStart) {
    LogCapture capture;
    EXPECT_EQ(IC::myoshwmi.unload().getStatus(), 0);
    EXPECT_THAT(
        capture.messages(),
        TextsAre("unload: entry", "disableIndications: entry", "disableIndications: exit",
                 "deleteSavedConfigurations: entry", "deleteSavedConfigurations: exit",
                 "deleteFdiskTmp: entry", "Deleting /tmp/fdisk_tmp", "deleteFdiskTmp: exit", "unload: exit"));
}

HOST_TEST(Lifecycle, StopsWithoutWaitingForASleep) {
    QX::setClockSpeed(0.02);  // whoever waits for a sleep of the monitors waits for minutes
    const Waits waits;
    initialize(IC::myoshwmi);
    ASSERT_TRUE(waits.othersBegin(2)) << "both sleep";
    IC::myoshwmi.unload();
}

HOST_TEST(Lifecycle, LogsEveryLineTwiceInTheOrderOfTheSequences) {
    LogCapture capture;
    initialize(IC::myoshwmi);
    IC::myoshwmi.unload();
    EXPECT_TRUE(capture.everyLineTwice());
    for (const LogLine& line : capture.lines()) {
        EXPECT_TRUE(line.reserved1Null);
        EXPECT_EQ(line.reserved2, 0);
        EXPECT_EQ(line.reserved3, 0);
        EXPECT_GT(line.line, 0);
        const bool ofMain = line.source == "OsHwMI_ix86" && line.component == "Corvista.IC.MI.OsHwMI";
        const bool ofIndications =
            line.source == "OsHwMIInd_ix86" && line.component == "Corvista.IC.MI.OsHwMIInd";
        EXPECT_TRUE(ofMain || ofIndications) << line.source << ' ' << line.component;
        const std::string subject = line.message.substr(0, line.message.find(": entry"));
        if (subject != line.message && subject.find(':') == std::string::npos) {
            EXPECT_EQ(line.function, subject);
        }
    }
    EXPECT_THAT(capture.ownMessages(5000), testing::Each(testing::HasSubstr("Cannot read asset dat file.")));
    EXPECT_EQ(capture.ownMessages(3000).size() + 2, capture.ownMessages().size());
    std::vector<std::string> messages = capture.ownMessages();
    std::erase_if(messages, dependsOnTheMonitor);
    EXPECT_THAT(messages, testing::ElementsAreArray(kWholeLife));
}

}  // namespace
