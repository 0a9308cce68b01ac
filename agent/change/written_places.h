#pragma once

#include <string>
#include <vector>

namespace cvagent::change {

/// The directories that a plug-in's writers write to, apart from /run and /tmp, without links: each exists.
/// Links in /etc are followed where their way is on this machine's own file systems.
/// @param dataDirectory "": none but the one that is always used
std::vector<std::string> writtenPlaces(const std::string& dataDirectory);

/// Sorted, without those that lie in another one, and without "/".
std::vector<std::string> outermost(std::vector<std::string> places);

/// Whether a path is the directory or lies below it.
bool isBelow(const std::string& path, const std::string& directory);

}  // namespace cvagent::change
