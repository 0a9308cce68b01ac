#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "framework/ic/mutable_node.h"

namespace IC {

/// What the plug-in keeps of the nodes and interfaces it knows. The nodes are the framework's.
struct Inventory {
    std::vector<unsigned int> drawnIds;                             ///< every id taken from the counter
    std::map<std::string, std::weak_ptr<MutableNode>> nodesByName;  ///< by interface name, bonds included
    std::map<unsigned int, MutableNode*> processors;                ///< by processor number, from 1
};

/// The nodes of the fixed upper levels, for whoever hangs nodes under them. Null outside initialize and
/// unload, and where a builder failed.
struct StaticTree {
    MutableNode* osHw = nullptr;
    MutableNode* root = nullptr;
    MutableNode* computer = nullptr;
    MutableNode* chassis = nullptr;
    MutableNode* planar = nullptr;
    MutableNode* networkController = nullptr;
    MutableNode* diskController = nullptr;
};

/// The id of a node that another one is to hang under. Throws when there is none.
unsigned int idOf(const MutableNode* parent);

}  // namespace IC
