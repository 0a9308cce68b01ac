#include "framework/ic/management_interface.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using IC::Error;
using IC::ManagementInterface;
using IC::MutableNode;
using IC::Node;
using IC::Number;
using testing::ElementsAre;
using testing::HasSubstr;

/// A node that counts how many of its kind are alive.
class CountedNode : public MutableNode {
public:
    explicit CountedNode(unsigned int id, int& alive) : MutableNode(id, 0, {1}, 1, 0), alive_(alive) {
        ++alive_;
    }
    ~CountedNode() override { --alive_; }

private:
    int& alive_;
};

class Interface : public ManagementInterface {
public:
    using ManagementInterface::alertHandler;
    using ManagementInterface::appendNode;
    using ManagementInterface::miIds;
    using ManagementInterface::ownNodeId;
    using ManagementInterface::takeNodeId;
};

/// The agent's side: what its callbacks heard and how they answer.
struct Agent {
    std::vector<unsigned int> loaded;
    std::vector<unsigned int> withdrawn;
    Error answer;
    ManagementInterface* interface = nullptr;  // called back into when set

    static Error load(Node* const& node, const void* context) {
        auto& agent = *static_cast<Agent*>(const_cast<void*>(context));
        agent.loaded.push_back(static_cast<MutableNode*>(node)->getNodeId());
        if (agent.interface != nullptr) {
            agent.interface->getNode(1);  // hangs when a lock is held
            agent.interface->deleteNode(node);
        }
        return agent.answer;
    }
    static void forget(const Node& node, const void* context) {
        auto& agent = *static_cast<Agent*>(const_cast<void*>(context));
        agent.withdrawn.push_back(static_cast<const MutableNode&>(node).getNodeId());
        if (agent.interface != nullptr) {
            agent.interface->setWithdrawCallBack(nullptr, nullptr);  // hangs when a lock is held
        }
    }
};

class ManagementInterfaceTest : public testing::Test {
protected:
    std::vector<Node*> map() {
        std::vector<Node*> nodes{nullptr};
        EXPECT_EQ(interface_.getMap(nodes).getStatus(), Error::success);
        return nodes;
    }
    CountedNode* makeNode(unsigned int id) { return new CountedNode(id, alive_); }
    void connect() {
        interface_.setLoadCallBack(&Agent::load, &agent_, nullptr);
        interface_.setWithdrawCallBack(&Agent::forget, &agent_);
    }

    int alive_ = 0;
    Agent agent_;
    Interface interface_;
};

TEST_F(ManagementInterfaceTest, InitializeSetsIdsAndCounter) {
    EXPECT_EQ(interface_.initialize(4, Number(9U), Number(20U)).getStatus(), Error::success);
    EXPECT_EQ(interface_.miIds(), std::vector<unsigned int>{4});
    EXPECT_EQ(interface_.ownNodeId(), 9U);
    EXPECT_EQ(interface_.takeNodeId(), 20U);
    EXPECT_EQ(interface_.takeNodeId(), 21U);
    EXPECT_EQ(interface_.initialize(5, Number(1U), Number(2U)).getStatus(), Error::success);
    EXPECT_EQ(interface_.miIds(), std::vector<unsigned int>{5});
    EXPECT_EQ(interface_.takeNodeId(), 2U);
}

TEST_F(ManagementInterfaceTest, InitializeRefusesWhatIsNoNumber) {
    interface_.initialize(4, Number(9U), Number(20U));
    Error error = interface_.initialize(1, Number(), Number(2U));
    EXPECT_EQ(error.getStatus(), Error::failure);
    EXPECT_EQ(error.text(), "initialize: no id of the interface's own node given");
    error = interface_.initialize(1, Number(1U), Number(Number::unsigned32));
    EXPECT_EQ(error.getStatus(), Error::failure);
    EXPECT_EQ(error.text(), "initialize: no first node id given");
    error = interface_.initialize(1, Number(1U), Number(1ULL << 32U));
    EXPECT_EQ(error.getStatus(), Error::failure);
    EXPECT_THAT(error.text(), HasSubstr("4294967296"));
    EXPECT_EQ(interface_.miIds(), std::vector<unsigned int>{4});
    EXPECT_EQ(interface_.ownNodeId(), 9U);
    EXPECT_EQ(interface_.takeNodeId(), 20U);
}

TEST_F(ManagementInterfaceTest, ListsNodesInTheOrderTheyCame) {
    auto* const first = makeNode(3);
    auto* const second = makeNode(2);
    interface_.appendNode(first);
    EXPECT_EQ(interface_.addNewNode(second).getStatus(), Error::success);
    EXPECT_THAT(map(), ElementsAre(first, second));
    EXPECT_EQ(interface_.getNode(2), second);
    EXPECT_EQ(interface_.getNode(99), nullptr);
    EXPECT_EQ(interface_.hold(3).get(), first);
    EXPECT_EQ(interface_.hold(99), nullptr);
    EXPECT_EQ(interface_.holdAll().size(), 2U);
    interface_.initialize(1, Number(1U), Number(2U));
    EXPECT_EQ(static_cast<std::string>(interface_), "management interface (node 1, 2 nodes)");
}

TEST_F(ManagementInterfaceTest, OnlyNodesAddedLaterAreHandedToTheAgent) {
    connect();
    interface_.appendNode(makeNode(1));
    interface_.addNewNode(makeNode(2));
    EXPECT_THAT(agent_.loaded, ElementsAre(2));
}

TEST_F(ManagementInterfaceTest, ANodeTheAgentRefusesIsKeptButNotListed) {
    connect();
    agent_.answer = Error(7, Number(), "no room");
    auto* const node = makeNode(2);
    const Error error = interface_.addNewNode(node);
    EXPECT_EQ(error.getStatus(), 7);
    EXPECT_EQ(error.text(), "no room");
    EXPECT_THAT(map(), ElementsAre());
    EXPECT_EQ(interface_.getNode(2), nullptr);
    EXPECT_EQ(alive_, 1);
    EXPECT_EQ(node->getNodeId(), 2U);

    agent_.answer = Error();
    EXPECT_EQ(interface_.addNewNode(node).getStatus(), Error::success);
    EXPECT_THAT(map(), ElementsAre(node));
}

TEST_F(ManagementInterfaceTest, ANodeAtWhichTheAgentThrowsIsRefused) {
    interface_.setLoadCallBack(
        [](Node* const&, const void*) -> Error { throw std::runtime_error("the agent is broken"); }, nullptr,
        nullptr);
    EXPECT_EQ(interface_.addNewNode(makeNode(2)).text(), "the agent is broken");
    interface_.setLoadCallBack([](Node* const&, const void*) -> Error { throw 7; }, nullptr, nullptr);
    EXPECT_EQ(interface_.addNewNode(makeNode(3)).getStatus(), Error::failure);
    EXPECT_THAT(map(), ElementsAre());
    EXPECT_EQ(alive_, 2);
}

TEST_F(ManagementInterfaceTest, ARefusedNodeCanBeDeletedAndTheAgentHearsNothing) {
    connect();
    agent_.answer = Error(1, Number(), "no");
    auto* const node = makeNode(2);
    interface_.addNewNode(node);
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::success);
    EXPECT_EQ(alive_, 0);
    EXPECT_THAT(agent_.withdrawn, ElementsAre());
}

TEST_F(ManagementInterfaceTest, ANodeHandedOverTwiceIsOwnedOnce) {
    auto* const node = makeNode(2);
    interface_.appendNode(node);
    interface_.appendNode(node);
    connect();
    EXPECT_EQ(interface_.addNewNode(node).getStatus(), Error::success);
    EXPECT_THAT(map(), ElementsAre(node));
    EXPECT_THAT(agent_.loaded, ElementsAre(2));
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::success);
    EXPECT_EQ(alive_, 0);
}

TEST_F(ManagementInterfaceTest, AWithdrawnNodeThatIsStillHeldCanComeBack) {
    auto* const node = makeNode(2);
    interface_.appendNode(node);
    {
        const auto held = interface_.hold(2);
        interface_.deleteNode(node);
        interface_.addNewNode(node);
    }
    EXPECT_THAT(map(), ElementsAre(node));
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::success);
    EXPECT_EQ(alive_, 0);
}

TEST_F(ManagementInterfaceTest, WhatIsNoNodeIsRefused) {
    EXPECT_EQ(interface_.addNewNode(nullptr).getStatus(), Error::failure);
    interface_.appendNode(nullptr);
    EXPECT_THAT(map(), ElementsAre());
    EXPECT_EQ(interface_.deleteNode(nullptr).getStatus(), Error::failure);
    MutableNode stranger(1, 0, {}, 1, 0);
    const Error error = interface_.deleteNode(&stranger);
    EXPECT_EQ(error.getStatus(), Error::failure);
    EXPECT_EQ(error.text(), "deleteNode: no such node");
}

TEST_F(ManagementInterfaceTest, ADeletedNodeLeavesTheListAtOnceAndMemoryWithItsLastHandle) {
    connect();
    interface_.appendNode(makeNode(1));
    auto* const node = makeNode(2);
    interface_.appendNode(node);
    auto held = interface_.hold(2);
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::success);
    EXPECT_EQ(map().size(), 1U);
    EXPECT_EQ(interface_.hold(2), nullptr);
    EXPECT_THAT(agent_.withdrawn, ElementsAre(2));
    EXPECT_EQ(alive_, 2);
    held.reset();
    EXPECT_EQ(alive_, 1);
}

TEST_F(ManagementInterfaceTest, ANodeIsWithdrawnAlsoWhenTheAgentThrowsOnHearingOfIt) {
    interface_.setWithdrawCallBack(
        [](const Node&, const void*) { throw std::runtime_error("the agent is broken"); }, nullptr);
    auto* const node = makeNode(2);
    interface_.appendNode(node);
    EXPECT_EQ(interface_.deleteNode(node).text(), "the agent is broken");
    EXPECT_THAT(map(), ElementsAre());
    EXPECT_EQ(alive_, 0);
}

TEST_F(ManagementInterfaceTest, CallbacksMayCallBack) {
    connect();
    agent_.interface = &interface_;
    EXPECT_EQ(interface_.addNewNode(makeNode(2)).getStatus(), Error::success);
    EXPECT_THAT(map(), ElementsAre());
    EXPECT_THAT(agent_.withdrawn, ElementsAre(2));
    EXPECT_EQ(alive_, 0);
}

TEST_F(ManagementInterfaceTest, ANodeWithdrawnInTheRefusingCallbackIsGone) {
    connect();
    agent_.interface = &interface_;
    agent_.answer = Error(1, Number(), "no");
    EXPECT_EQ(interface_.addNewNode(makeNode(2)).getStatus(), Error::failure);
    EXPECT_EQ(alive_, 0);
}

Error takeAlerts(const std::vector<IC::Alert>& /*alerts*/, const void* /*context*/) {
    return {};
}

TEST_F(ManagementInterfaceTest, RemembersTheAlertHandlerUntilItIsTakenBack) {
    EXPECT_EQ(interface_.alertHandler().first, nullptr);
    EXPECT_EQ(interface_.registerForAlerts(&takeAlerts, &agent_).getStatus(), Error::success);
    EXPECT_EQ(interface_.alertHandler().first, &takeAlerts);
    EXPECT_EQ(interface_.alertHandler().second, &agent_);
    EXPECT_EQ(interface_.deRegisterForAlerts().getStatus(), Error::success);
    EXPECT_EQ(interface_.alertHandler().first, nullptr);
    EXPECT_EQ(interface_.alertHandler().second, nullptr);
}

TEST_F(ManagementInterfaceTest, UnloadEmptiesTheListAndPointersStayGood) {
    connect();
    interface_.appendNode(makeNode(1));
    agent_.answer = Error(1, Number(), "no");
    auto* const refused = makeNode(2);
    interface_.addNewNode(refused);
    const std::vector<Node*> before = map();
    EXPECT_EQ(interface_.unload().getStatus(), Error::success);
    EXPECT_EQ(alive_, 2);
    EXPECT_THAT(map(), ElementsAre());
    EXPECT_EQ(interface_.getNode(1), nullptr);
    EXPECT_EQ(interface_.hold(1), nullptr);
    EXPECT_EQ(before.at(0)->getStatus(), 0U);
    EXPECT_EQ(refused->getNodeId(), 2U);
    EXPECT_THAT(agent_.withdrawn, ElementsAre()) << "none was withdrawn";

    interface_.initialize(1, Number(1U), Number(2U));
    auto* const next = makeNode(2);
    interface_.appendNode(next);
    EXPECT_THAT(map(), ElementsAre(next)) << "a new start has its own";
    EXPECT_EQ(interface_.unload().getStatus(), Error::success);
    EXPECT_EQ(alive_, 3);
    EXPECT_EQ(before.at(0)->getDescription(), "");
}

TEST_F(ManagementInterfaceTest, ANodeCanStillBeDeletedAfterUnloadAndTheAgentHearsNothing) {
    connect();
    auto* const node = makeNode(1);
    interface_.appendNode(node);
    interface_.unload();
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::success);
    EXPECT_EQ(alive_, 0);
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::failure);
    EXPECT_THAT(agent_.withdrawn, ElementsAre());
}

TEST_F(ManagementInterfaceTest, ANodeOfAnEarlierStartCanBeHandedOverAgain) {
    auto* const node = makeNode(1);
    interface_.appendNode(node);
    interface_.unload();
    interface_.appendNode(node);
    EXPECT_THAT(map(), ElementsAre(node));
    interface_.unload();
    EXPECT_EQ(interface_.deleteNode(node).getStatus(), Error::success);
    EXPECT_EQ(alive_, 0) << "owned once";
}

TEST_F(ManagementInterfaceTest, CallbacksStayOverUnloadAndANewInitialize) {
    connect();
    interface_.registerForAlerts(&takeAlerts, &agent_);
    interface_.unload();
    EXPECT_EQ(interface_.alertHandler().first, &takeAlerts);
    interface_.initialize(1, Number(1U), Number(2U));
    EXPECT_EQ(interface_.alertHandler().first, &takeAlerts);
    EXPECT_EQ(interface_.alertHandler().second, &agent_);
    auto* const node = makeNode(4);
    interface_.addNewNode(node);
    interface_.deleteNode(node);
    EXPECT_THAT(agent_.loaded, ElementsAre(4));
    EXPECT_THAT(agent_.withdrawn, ElementsAre(4));
    interface_.unload();
    interface_.deRegisterForAlerts();
    EXPECT_EQ(interface_.alertHandler().first, nullptr);
}

TEST(ManagementInterface, TheDestructorFreesTheNodes) {
    int alive = 0;
    {
        Interface interface;
        interface.appendNode(new CountedNode(1, alive));
        interface.unload();
        interface.appendNode(new CountedNode(2, alive));
        EXPECT_EQ(alive, 2);
    }
    EXPECT_EQ(alive, 0);
}

}  // namespace
