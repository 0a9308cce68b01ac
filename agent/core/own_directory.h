#pragma once

#include <string>

#include "agent/core/problem.h"

namespace cvagent {

/// What a directory is to the agent: the subject of a Problem with it, and why it is used.
struct DirectoryRole {
    Problem::Subject subject;
    std::string reason;
    std::string name = "data directory";  ///< in words of a Problem
};

/// Walks the way to a directory of the caller's own, name by name, so that nothing is made or trusted behind
/// a place where somebody else could put something of his own: each directory and link on it belongs to the
/// caller or to root, the last to the caller, and nobody else can write there (see owners.h). What is missing
/// is made, the last directory with mode 0700.
/// @return the path without symbolic links, with a slash at its end
/// Throws Problem when somebody else could change the directory, std::system_error when it cannot be made or
/// looked at.
std::string ownDirectory(const std::string& path, const DirectoryRole& role);

}  // namespace cvagent
