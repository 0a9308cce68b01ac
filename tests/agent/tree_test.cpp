#include "agent/core/tree.h"

#include <gmock/gmock.h>

#include "agent/core/problem.h"
#include "tests/agent/node_list.h"

namespace {

using cvagent::drawingOrder;
using cvagent::findNode;
using cvagent::Problem;
using cvagent::setPaths;
using testing::ElementsAre;
using testing::HasSubstr;

/// The upper levels of every host's tree.
class Tree : public testing::Test {
protected:
    NodeList list;
    unsigned int oshw = list.add(38, 0);
    unsigned int root = list.add(59, oshw);
    unsigned int computer = list.add(40, root);
    unsigned int chassis = list.add(1, computer);
    unsigned int planar = list.add(41, chassis);
    unsigned int disks = list.add(50, planar, 1);
    unsigned int network = list.add(49, chassis);

    unsigned int addNamed(unsigned int type, unsigned int parent, unsigned int property, const char* name) {
        const unsigned int id = list.add(type, parent, 1);
        list.hold(id)->setProperty(property, IC::PropertyValue(name, true));
        return id;
    }
    std::string path(unsigned int id) {
        setPaths(list);
        return list.hold(id)->getPath();
    }
    Problem::Kind kind = Problem::failed;
    std::string candidates;
    /// What a lookup that must fail says; `kind` is why it failed, `candidates` what could be meant.
    std::string complaint(const std::string& text) {
        setPaths(list);
        try {
            findNode(list, text);
        } catch (const Problem& problem) {
            kind = problem.kind();
            candidates = problem.detail();
            return problem.what();
        }
        return "found";
    }
};

TEST_F(Tree, PathsOfAllClassesFollowTheParents) {
    EXPECT_EQ(path(oshw), "/oshw");
    EXPECT_EQ(path(computer), "/oshw/root/computer");
    EXPECT_EQ(path(disks), "/oshw/root/computer/chassis/planar/disk-controller");
    EXPECT_EQ(path(addNamed(11, disks, 89, "/dev/sda")),
              "/oshw/root/computer/chassis/planar/disk-controller/hard-drive:sda");
    EXPECT_EQ(path(addNamed(45, disks, 89, "/dev/sda1")),
              "/oshw/root/computer/chassis/planar/disk-controller/partition:sda1");
    const unsigned int port = addNamed(12, network, 108, "eth0");
    EXPECT_EQ(path(addNamed(29, port, 108, "eth0")),
              "/oshw/root/computer/chassis/network-controller/network-port:eth0/ip-config:eth0");
    EXPECT_EQ(path(addNamed(73, network, 108, "eth0")),
              "/oshw/root/computer/chassis/network-controller/lan-endpoint:eth0");
    EXPECT_EQ(path(addNamed(56, computer, 197, "bond0")), "/oshw/root/computer/team:bond0");
    EXPECT_EQ(path(list.add(4, planar, 2)), "/oshw/root/computer/chassis/planar/processor:2");
}

TEST_F(Tree, NodesWithoutANameHaveTheirIndex) {
    EXPECT_EQ(path(list.add(12, network, 7)),
              "/oshw/root/computer/chassis/network-controller/network-port:7");
    EXPECT_EQ(path(addNamed(12, network, 108, "")),
              "/oshw/root/computer/chassis/network-controller/network-port:1");
}

TEST_F(Tree, UnknownClassesHaveTheirNumber) {
    EXPECT_EQ(path(list.add(99, computer, 3)), "/oshw/root/computer/type-99:3");
}

TEST_F(Tree, SlashesInNamesDoNotMakeLevels) {
    EXPECT_EQ(path(addNamed(45, disks, 89, "/dev/mapper/root")),
              "/oshw/root/computer/chassis/planar/disk-controller/partition:mapper!root");
}

TEST_F(Tree, NodesWithoutAListedParentStartAtTheTop) {
    EXPECT_EQ(path(list.add(40, 1000)), "/computer");
}

TEST_F(Tree, ParentsInACircleEndSomewhere) {
    const unsigned int first = list.add(41, 0);
    const unsigned int second = list.add(41, first);
    list.hold(first)->setParent(second);
    EXPECT_THAT(path(first), testing::StartsWith("/planar/planar"));
    EXPECT_EQ(drawingOrder(list.nodes()).size(), 9U);
}

TEST_F(Tree, PathsFollowARenamedNode) {
    const unsigned int port = addNamed(12, network, 108, "eth0");
    path(port);
    list.hold(port)->setProperty(108, IC::PropertyValue("lan0", true));
    EXPECT_THAT(path(port), testing::EndsWith("network-port:lan0"));
}

TEST_F(Tree, ANodeIsFoundByIdPathAndLastPart) {
    const unsigned int port = addNamed(12, network, 108, "eth0");
    setPaths(list);
    for (const std::string text : {"9", "/oshw/root/computer/chassis/network-controller/network-port:eth0",
                                   "network-port:eth0", "eth0"}) {
        EXPECT_EQ(findNode(list, text == "9" ? std::to_string(port) : text)->getNodeId(), port) << text;
    }
    EXPECT_EQ(findNode(list, "computer")->getNodeId(), computer);
}

TEST_F(Tree, AnAmbiguousNameListsTheCandidates) {
    const unsigned int port = addNamed(12, network, 108, "eth0");
    const unsigned int ip = addNamed(29, port, 108, "eth0");
    EXPECT_EQ(complaint("eth0"), "'eth0' is the name of 2 nodes");
    EXPECT_EQ(kind, Problem::ambiguous);
    EXPECT_EQ(candidates, "\n  " + std::to_string(port) + "  " + path(port) + "\n  " + std::to_string(ip) +
                              "  " + path(ip));
    EXPECT_EQ(findNode(list, "ip-config:eth0")->getNodeId(), ip);
}

TEST_F(Tree, WhatIsNotThereIsNotFound) {
    for (const std::string text : {"999", "", "/", "/oshw/", "oshw/root", "eth0", "computer:", "Computer",
                                   "-1", "99999999999999999999", " 1", "1 ", "/computer"}) {
        EXPECT_THAT(complaint(text), HasSubstr("there is no node")) << text;
        EXPECT_EQ(kind, Problem::notFound) << text;
    }
}

TEST_F(Tree, TheDrawingPutsChildrenUnderTheirParents) {
    const unsigned int drive = addNamed(11, disks, 89, "/dev/sda");
    const unsigned int orphan = list.add(40, 1000);
    std::vector<unsigned int> ids;
    std::vector<std::size_t> depths;
    for (const cvagent::Placed& placed : drawingOrder(list.nodes())) {
        ids.push_back(placed.node->getNodeId());
        depths.push_back(placed.last.size());
    }
    EXPECT_THAT(ids, ElementsAre(oshw, root, computer, chassis, planar, disks, drive, network, orphan));
    EXPECT_THAT(depths, ElementsAre(1, 2, 3, 4, 5, 6, 7, 5, 1));
}

}  // namespace
