#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "mi/command.h"
#include "mi/os_hw_mi.h"

namespace IC {

/// What the builders of drives and of partitions differ in; the frame around it is buildStorageNodes.
struct OsHwMI::StorageKind {
    Command listing;            ///< the command that prints one line per candidate
    const char* withdrawnText;  ///< logged before the description of a node that goes
    const char* publishedText;
    std::vector<Node*> OsHwMI::*nodes;
    /// Makes the node of one line, which carries no line break; null when the line gives none.
    std::unique_ptr<MutableNode> (OsHwMI::*build)(const std::string& line, unsigned int index, bool update);
};

/// The first line that a command about one line of the listing prints, without its line break, "" when it
/// prints none. Nothing when it could not be started: that is logged, and the line it is about is skipped.
std::optional<std::string> askAboutLine(const Command& command);

}  // namespace IC
