#pragma once

#include <string>
#include <vector>

namespace cvagent::change {

/// The directories that a plug-in's writers write to, apart from /run and /tmp, without links.
/// @param dataDirectory "": none but the one that is always used
/// @param missing what becomes of one that is not there
enum class Missing { nearestAbove, leftOut };
std::vector<std::string> writtenPlaces(const std::string& dataDirectory, Missing missing);

/// Where a link in /etc leads in the end, if the way is on this machine's own file systems.
struct LinkTarget {
    std::string directory;
    std::string name;  ///< need not be there; "" when the link leads to the directory itself
};
std::vector<LinkTarget> linkTargets();

/// Sorted, without those that lie in another one, and without "/".
std::vector<std::string> outermost(std::vector<std::string> places);

/// Whether a path is the directory or lies below it.
bool isBelow(const std::string& path, const std::string& directory);

}  // namespace cvagent::change
