// The agent calls the plug-in's objects through their virtual tables: the order of the slots is the contract.
#include <gtest/gtest.h>

#include <cstring>

#include "framework/ic/management_interface.h"
#include "framework/ic/mutable_node.h"
#include "framework/qx/thread.h"

namespace {

/// The slot behind a pointer to a virtual member function: such a pointer holds one plus the byte offset in
/// the virtual table. Nothing virtual behind it gives -1.
template <class Member>
long slot(Member member) {
    long raw = 0;
    static_assert(sizeof(member) >= sizeof(raw));
    std::memcpy(&raw, &member, sizeof(raw));
    return raw % 2 == 1 ? (raw - 1) / static_cast<long>(sizeof(void*)) : -1;
}

struct NonVirtual {
    void call() {}
};

TEST(Slots, AMemberThatIsNotVirtualHasNone) {
    EXPECT_EQ(slot(&NonVirtual::call), -1);
}

// The two slots of a destructor cannot be named; they show as the gap in the numbers.
TEST(Slots, OfNode) {
    EXPECT_EQ(slot(&IC::Node::getStatus), 2);
    EXPECT_EQ(slot(&IC::Node::getDescription), 3);
    EXPECT_EQ(slot(&IC::Node::getProperty), 4);
    EXPECT_EQ(slot(&IC::Node::getProperties), 5);
    EXPECT_EQ(slot(&IC::Node::setProperty), 6);
    EXPECT_EQ(slot(&IC::Node::operator std::string), 7);
    EXPECT_EQ(slot(&IC::Node::getPath), -1);
}

TEST(Slots, OfMutableNode) {
    EXPECT_EQ(slot(&IC::MutableNode::getStatus), 2);
    EXPECT_EQ(slot(&IC::MutableNode::getDescription), 3);
    EXPECT_EQ(slot(&IC::MutableNode::getProperty), 4);
    EXPECT_EQ(slot(&IC::MutableNode::getProperties), 5);
    EXPECT_EQ(slot(&IC::MutableNode::setProperty), 6);
    EXPECT_EQ(slot(&IC::MutableNode::operator std::string), 7);
    EXPECT_EQ(slot(&IC::MutableNode::getNodeId), 8);
    EXPECT_EQ(slot(&IC::MutableNode::getLinkedId), 9);
    EXPECT_EQ(slot(&IC::MutableNode::getIndex), 10);
    EXPECT_EQ(slot(&IC::MutableNode::getMIIds), 11);
    EXPECT_EQ(slot(&IC::MutableNode::addMI), 12);
    EXPECT_EQ(slot(&IC::MutableNode::delMI), 13);
    EXPECT_EQ(slot(&IC::MutableNode::setStatus), 14);
    EXPECT_EQ(slot(&IC::MutableNode::setDescription), 15);
    EXPECT_EQ(slot(&IC::MutableNode::setPath), 16);
    EXPECT_EQ(slot(&IC::MutableNode::setParent), 17);
}

TEST(Slots, OfManagementInterface) {
    EXPECT_EQ(slot(&IC::ManagementInterface::getMap), 0);
    EXPECT_EQ(slot(&IC::ManagementInterface::initialize), 1);
    EXPECT_EQ(slot(&IC::ManagementInterface::registerForAlerts), 2);
    EXPECT_EQ(slot(&IC::ManagementInterface::setLoadCallBack), 3);
    EXPECT_EQ(slot(&IC::ManagementInterface::deRegisterForAlerts), 4);
    EXPECT_EQ(slot(&IC::ManagementInterface::unload), 5);
    EXPECT_EQ(slot(&IC::ManagementInterface::operator std::string), 8);
    EXPECT_EQ(slot(&IC::ManagementInterface::addNewNode), 9);
    EXPECT_EQ(slot(&IC::ManagementInterface::deleteNode), 10);
    EXPECT_EQ(slot(&IC::ManagementInterface::getNode), 11);
}

TEST(Slots, OfThread) {
    EXPECT_EQ(slot(&QX::Thread::stop), 2);
    EXPECT_EQ(slot(&QX::Thread::run), 3);
    EXPECT_EQ(slot(&QX::Thread::start), -1);
}

}  // namespace
