#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace cvagent::change {

/// Takes the sockets that daemons of the host listen on out of sight, whom nothing may reach: those below
/// /run, with the pipes there, are removed, over all others that have a name lies an empty file. To be called
/// once /run is covered. Throws Cannot.
/// @param directory an empty one, of our own
void hideDaemons(const std::string& directory);

/// The absolute names in a table like /proc/net/unix.
std::vector<std::string> socketNames(std::string_view table);

}  // namespace cvagent::change
