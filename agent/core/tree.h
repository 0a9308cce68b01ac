#pragma once

#include <string>
#include <vector>

#include "agent/core/node_ref.h"
#include "framework/ic/management_interface.h"

namespace cvagent {

/// The path of a node, built from the nodes it hangs under. One that hangs nowhere starts at the root.
std::string makePath(const IC::ManagementInterface& interface, const IC::MutableNode& node);
/// Gives every listed node its path.
void setPaths(const IC::ManagementInterface& interface);

/// The node a person means by an id, a path or the last part of one. Throws Problem: notFound, or ambiguous,
/// which lists the candidates.
Handle findNode(const std::vector<Handle>& nodes, const std::string& text);
Handle findNode(const IC::ManagementInterface& interface, const std::string& text);

/// A node with its place in the drawing.
struct Placed {
    NodeRef node;
    std::vector<bool> last;  ///< for each level down to this node: whether it is the last of its siblings
};

/// The nodes in the order of the drawing: each under its parent, siblings in the order of the list. A node
/// whose parent is not listed stands at the top.
std::vector<Placed> drawingOrder(const std::vector<NodeRef>& nodes);

}  // namespace cvagent
