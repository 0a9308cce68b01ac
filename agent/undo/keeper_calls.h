#pragma once

#include <string>
#include <vector>

namespace cvagent::undo {

/// What the systems that keep interfaces read, and what has to be run so that they know of files that come
/// back.
struct KeeperCalls {
    std::vector<std::string> files;   ///< whole paths
    std::vector<std::string> before;  ///< command lines: with the files as they are
    std::vector<std::string> after;   ///< with the files as they were

    /// What can be run while the host starts, when those systems do not run yet and read the files later.
    KeeperCalls whileStarting() const;
};

/// Runs these one after the other, without a shell: the few that are known, with the name of a link. One that
/// takes longer than twenty seconds is left to itself, for ended in its middle it would leave a link half set
/// up.
/// @param notes gets a line for each that fails
void runCalls(const std::vector<std::string>& calls, std::vector<std::string>& notes);

}  // namespace cvagent::undo
