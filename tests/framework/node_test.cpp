#include "framework/ic/mutable_node.h"

#include <gtest/gtest.h>

namespace {

using IC::Error;
using IC::MutableNode;
using IC::Number;
using IC::PropertyValue;

TEST(MutableNode, KeepsWhatItWasBuiltFrom) {
    const MutableNode node(7, 2, {1, 5}, 59, 3);
    EXPECT_EQ(node.getNodeId(), 7U);
    EXPECT_EQ(node.getLinkedId(), 2U);
    EXPECT_EQ(node.getMIIds(), (std::vector<unsigned int>{1, 5}));
    EXPECT_EQ(node.nodeType(), 59U);
    EXPECT_EQ(node.getIndex(), 3U);
    EXPECT_EQ(node.getStatus(), 0U);
    EXPECT_EQ(node.getDescription(), "");
    EXPECT_EQ(node.getPath(), "");
}

TEST(MutableNode, TakesNewAttributes) {
    MutableNode node(7, 2, {}, 59, 0);
    EXPECT_EQ(node.setStatus(12).getStatus(), Error::success);
    EXPECT_EQ(node.setDescription("Root").getStatus(), Error::success);
    EXPECT_EQ(node.setPath("/oshw/root").getStatus(), Error::success);
    EXPECT_EQ(node.setParent(1).getStatus(), Error::success);
    EXPECT_EQ(node.getStatus(), 12U);
    EXPECT_EQ(node.getDescription(), "Root");
    EXPECT_EQ(node.getPath(), "/oshw/root");
    EXPECT_EQ(node.getLinkedId(), 1U);
    EXPECT_EQ(static_cast<std::string>(node), "/oshw/root (type 59, id 7)");
}

TEST(Node, TwoReadsCanBeCalledAsItsOwn) {
    class Loud : public MutableNode {
    public:
        Loud() : MutableNode(7, 2, {}, 59, 0) {}
        unsigned int getStatus() const override { return 99; }
        std::string getDescription() const override { return "LOUD"; }
    };
    Loud loud;
    const IC::Node& node = loud;
    EXPECT_EQ(node.IC::Node::getStatus(), 0U);
    EXPECT_EQ(node.IC::Node::getDescription(), "");
    loud.setStatus(12);
    loud.setDescription("loud");
    EXPECT_EQ(node.IC::Node::getStatus(), 12U);
    EXPECT_EQ(node.IC::Node::getDescription(), "loud");
    EXPECT_EQ(node.getStatus(), 99U);
    EXPECT_EQ(node.getDescription(), "LOUD");
}

TEST(MutableNode, AsksThePathSourceUntilThePathIsSet) {
    MutableNode node(7, 2, {}, 59, 0);
    IC::Node::setPathSource([](const IC::Node& unseen) {
        return "/node/" + std::to_string(dynamic_cast<const MutableNode&>(unseen).getNodeId());
    });
    EXPECT_EQ(node.getPath(), "/node/7");
    node.setPath("/oshw/root");
    EXPECT_EQ(node.getPath(), "/oshw/root");
    IC::Node::setPathSource(nullptr);
    EXPECT_EQ(node.getPath(), "/oshw/root");
    EXPECT_EQ(MutableNode(8, 2, {}, 59, 0).getPath(), "");
}

TEST(MutableNode, AnUnknownPropertyFailsAndLeavesTheValueAlone) {
    const MutableNode node(1, 0, {}, 1, 0);
    PropertyValue value("before", true);
    const Error error = node.getProperty(999, value);
    EXPECT_EQ(error.getStatus(), Error::failure);
    EXPECT_EQ(error.text(), "no such property: 999");
    EXPECT_EQ(error.code(), Number(IC::Error::kNoSuchProperty));
    EXPECT_TRUE(value == PropertyValue("before", true));
}

TEST(MutableNode, AnswersWhatWasStoredLast) {
    MutableNode node(1, 0, {}, 1, 0);
    EXPECT_EQ(node.setProperty(108, PropertyValue("eth0", true)).getStatus(), Error::success);
    EXPECT_EQ(node.setProperty(108, PropertyValue("eth1", true)).getStatus(), Error::success);
    EXPECT_EQ(node.setProperty(123, PropertyValue(Number(1U), true)).getStatus(), Error::success);
    PropertyValue value;
    EXPECT_EQ(node.getProperty(108, value).getStatus(), Error::success);
    EXPECT_EQ(static_cast<std::string>(value), "eth1");
    std::map<unsigned int, PropertyValue> all{{1, PropertyValue("left over", true)}};
    EXPECT_EQ(node.getProperties(all).getStatus(), Error::success);
    EXPECT_EQ(all.size(), 2U);
    EXPECT_TRUE(all.at(123) == PropertyValue(Number(1U), true));
}

TEST(MutableNode, AValueCanBeStoredFromItself) {
    MutableNode node(1, 0, {}, 1, 0);
    PropertyValue value("eth0", true);
    node.setProperty(108, value);
    node.getProperty(108, value);
    node.setProperty(108, value);
    node.getProperty(108, value);
    EXPECT_EQ(static_cast<std::string>(value), "eth0");
}

TEST(MutableNode, AddsAndRemovesOwners) {
    MutableNode node(1, 0, {1}, 1, 0);
    EXPECT_EQ(node.addMI(2).getStatus(), Error::success);
    EXPECT_EQ(node.addMI(2).getStatus(), Error::success);
    EXPECT_EQ(node.getMIIds(), (std::vector<unsigned int>{1, 2}));
    EXPECT_EQ(node.delMI(1).getStatus(), Error::success);
    EXPECT_EQ(node.getMIIds(), std::vector<unsigned int>{2});
    const Error error = node.delMI(1);
    EXPECT_EQ(error.getStatus(), Error::failure);
    EXPECT_EQ(error.text(), "no such management interface: 1");
}

}  // namespace
