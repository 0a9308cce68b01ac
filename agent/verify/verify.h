#pragma once

#include <string>
#include <vector>

#include "agent/core/node_ref.h"
#include "agent/core/reading.h"

namespace cvagent::verify {

/// A fact of the tree that is not what the kernel says.
struct Difference {
    std::string path;  ///< of the node
    std::string property;
    std::string shown;
    std::string kernel;
    std::string why;  ///< what may be the reason
};

struct Result {
    std::size_t compared = 0;  ///< facts
    std::vector<Difference> differences;
};

/// Compares what a tree shows with what the kernel says at this moment, by netlink, /proc and /sys, and with
/// the host's files where these decide (name servers, leases, the origin of an address). What is always the
/// same, what the agent keeps itself (the owner) and what only a name server knows is left out.
/// @param readings of each node, see Agent::readTree
/// Throws Problem (failed) when the kernel tells no links.
Result verify(const std::vector<NodeRef>& nodes, const std::vector<std::vector<Reading>>& readings);

}  // namespace cvagent::verify
