#pragma once

#include <map>
#include <memory>
#include <string>

#include "mi/node_tree.h"

namespace IC {

extern std::string loggerOsHwMICpu;  ///< the logger component of the processor nodes

/// Builds the nodes of the processors.
class ProcessorBuilder {
public:
    explicit ProcessorBuilder(NodeTree& tree) : tree_(tree) {}

    /// One node for each processor that the kernel lists. A second call makes a second set.
    void createCpuNodeAndMap();
    /// The same, with clock speeds; from any thread, one build at a time. Nothing outside initialize and
    /// unload.
    void createCpuNodes();

    /// The nodes have left the tree with all others: a build that lists none describes none.
    void forgetProcessors() { processors_.clear(); }

private:
    NodeTree& tree_;
    std::map<unsigned int, std::weak_ptr<MutableNode>> processors_;  ///< of the last build, by number, from 1
};

}  // namespace IC
