#include "agent/core/node_ref.h"

#include <utility>

namespace cvagent {

namespace {

/// The node goes first, then what its code is part of.
struct Kept {
    std::shared_ptr<void> agent;
    Handle node;
};

}  // namespace

NodeRef::NodeRef(std::shared_ptr<void> agent, Handle node) {
    IC::MutableNode* const shown = node.get();
    node_ = Handle(std::make_shared<Kept>(Kept{std::move(agent), std::move(node)}), shown);
}

}  // namespace cvagent
