#pragma once

#include "framework/ic/mutable_node.h"

namespace IC {

/// The computer system as a whole.
class ComputerNode : public MutableNode {
public:
    ComputerNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                 unsigned int nodeType, unsigned int index);
    ~ComputerNode() override;
};

}  // namespace IC
