#pragma once

#include "agent/core/node_ref.h"
#include "framework/ic/management_interface.h"

namespace cvagent {

/// Makes references to nodes that no agent has.
struct NodeRefOfTest {
    static NodeRef of(Handle node) { return NodeRef(nullptr, std::move(node)); }
    static std::vector<NodeRef> all(const IC::ManagementInterface& list) {
        std::vector<NodeRef> nodes;
        for (const Handle& node : list.holdAll()) {
            nodes.push_back(NodeRef(nullptr, node));
        }
        return nodes;
    }
};

}  // namespace cvagent

/// A management interface that holds what a test puts into it.
class NodeList : public IC::ManagementInterface {
public:
    NodeList() { initialize(1, IC::Number(1U), IC::Number(1U)); }

    /// @return the new node's id
    unsigned int add(unsigned int type, unsigned int parent, unsigned int index = 0) {
        const unsigned int id = takeNodeId();
        appendNode(new IC::MutableNode(id, parent, miIds(), type, index));
        return id;
    }
    std::vector<cvagent::NodeRef> nodes() const { return cvagent::NodeRefOfTest::all(*this); }
};
