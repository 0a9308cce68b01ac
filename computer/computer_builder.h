#pragma once

#include "mi/node_tree.h"

namespace IC {

/// Builds the computer's node.
class ComputerBuilder {
public:
    explicit ComputerBuilder(NodeTree& tree) : tree_(tree) {}

    void createComputerNodes();
    /// Refreshes the system's vital-product-data database. Nothing in the plug-in calls it.
    void vpdUpdate();

private:
    NodeTree& tree_;
};

}  // namespace IC
