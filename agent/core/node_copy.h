#pragma once

#include <string>
#include <vector>

#include "agent/core/node_ref.h"
#include "agent/core/reading.h"

namespace cvagent {

/// A node of another process's agent, as that one has told it. What is shown of nodes can be shown of its
/// reference; nothing is behind it.
struct NodeCopy {
    unsigned int id = 0;
    unsigned int parent = 0;
    unsigned int type = 0;
    unsigned int index = 0;
    unsigned int status = 0;
    std::string path;
    std::string description;

    /// @param readings what the node is to have stored, its name among it
    NodeRef reference(const std::vector<Reading>& readings = {}) const;
};

}  // namespace cvagent
