#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "mi/command.h"
#include "mi/node_tree.h"

namespace IC {

/// What differs between drives and partitions; buildStorageNodes does what they have in common.
struct StorageKind {
    Command listing;            ///< the command that prints one line per candidate
    const char* withdrawnText;  ///< logged before the description of a node that goes
    const char* publishedText;
    /// Makes the node of one line, which carries no line break; null when the line gives none.
    std::unique_ptr<MutableNode> (*build)(NodeTree& tree, const std::string& line, unsigned int index,
                                          bool update);
};

/// Each line of the listing may give a node.
/// @param nodes those of the kind that are in the tree
/// @param update withdraw the old nodes first and publish the new ones
void buildStorageNodes(NodeTree& tree, const StorageKind& kind, std::vector<Node*>& nodes, bool update);

/// The first line that a command about one line of the listing prints, without its line break, "" when it
/// prints none. Nothing when it could not be started: that is logged, and the line it is about is skipped.
std::optional<std::string> askAboutLine(const Command& command);

}  // namespace IC
