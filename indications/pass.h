#pragma once

#include <string>
#include <vector>

#include "indications/comparison.h"
#include "mi/node_tree.h"

namespace IC {

/// What the steps of a pass hand on to each other, and a pass to the next. Each monitor's thread has its own:
/// one that hangs in a callback of the agent outlives the stop, and the next start's has another.
struct Pass {
    LinkStates previous;  ///< as the pass before found them
    Settled now;
    BondMembers members;
};

// The steps, in the order of a pass. Indications has them by the same names.

/// Reads the states of the last pass from the state file.
void readPrevNetNodeMap(Pass& pass);
/// Takes the states of now from the published nodes.
void createCurNetNodeMap(const NodeTree& tree, Pass& pass);
/// Asks for a bond's members, and those that the last pass knew for their states.
/// @param members receives those that the kernel lists
/// @return what the first member whose change means something means for the bond; LinkState::noVerdict
unsigned int bondedNetNodeStatus(const NodeTree& tree, const LinkStates& previous, const std::string& bond,
                                 std::vector<std::string>& members);
/// Tells the agent what is not as it was.
void checkAndSendNetAlert(const NodeTree& tree, const Pass& pass);
/// Keeps the states of now across restarts of the agent.
void writePrevNetNodeMap(const Pass& pass);

}  // namespace IC
