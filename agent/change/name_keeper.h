#pragma once

#include <string>

namespace cvagent::change {

// Behind a fence of dropped rights alone the host's name is the program's own and yet cannot be set: what
// could set it could lift the mounts as well. One process that keeps the right sets it for all others.

/// Starts it. It is reached in the network of the calling process. Throws Cannot.
void startNameKeeper();

/// Has it set the name. @return whether it is set
bool nameKeeperSets(const std::string& name);

}  // namespace cvagent::change
