#pragma once

#include <string>
#include <vector>

namespace cvagent {

/// Gives the process, and every command it starts, a /tmp of its own, where nobody else can lay out files or
/// links under the fixed names that the plug-in's commands use. Mounts that the host makes later still come
/// in. Without the right to mount, and where a service manager gave the process a /tmp of its own already,
/// everything stays as it is. To be called before any thread, with "/" as the current directory.
/// @param kept absolute paths of what is to stay reachable when it lies below /tmp: directories, and files
///             with their directories (only the file where that is /tmp itself)
void makeTmpPrivate(const std::vector<std::string>& kept);

}  // namespace cvagent
