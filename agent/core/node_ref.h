#pragma once

#include <memory>

#include "agent/core/node_classes.h"

namespace cvagent {

/// A node as front ends hold it. It keeps the node, the loaded plug-in whose code the node is, and the whole
/// agent at work for as long as it lives; only the agent makes one, and NodeCopy of what
/// another process's agent has told. What it shows is what the plug-in has told; reading and writing go
/// through the agent.
class NodeRef {
public:
    const IC::MutableNode& operator*() const& { return *node_; }
    const IC::MutableNode* operator->() const& { return node_.get(); }
    // What a temporary gives would be gone with it.
    const IC::MutableNode& operator*() const&& = delete;
    const IC::MutableNode* operator->() const&& = delete;

    bool operator==(const NodeRef& other) const { return node_.get() == other.node_.get(); }

private:
    friend class Agent;
    friend struct NodeCopy;
    friend struct NodeRefOfTest;  // for lists without an agent

    /// @param agent what must live as long as the node
    NodeRef(std::shared_ptr<void> agent, Handle node);

    Handle node_;  // owns the agent, too
};

}  // namespace cvagent
