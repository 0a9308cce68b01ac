#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace cvagent::shell {

/// The mount point of the file system that a path lies on, if that one and all above it on the way are this
/// machine's own: none of them can keep a thread waiting for another machine or another program.
/// @param path from the root directory on, as it is written: links in it are not followed here
std::optional<std::string> localMountOf(const std::string& path);

/// The same from a text like that of /proc/self/mountinfo.
std::optional<std::string> localMountOf(const std::string& path, std::string_view mountInfo);

}  // namespace cvagent::shell
