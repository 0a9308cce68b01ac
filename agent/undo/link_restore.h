#pragma once

#include <string>
#include <vector>

#include "agent/undo/network_restore.h"

namespace cvagent::undo {

/// Gives the links that the change has touched their names, sizes and flags back, one try each.
void putBackLinks(hosttools::NetlinkSocket& socket, const NetworkChange& change);
/// What of that is still to be done, in words: "the state of eth0".
std::vector<std::string> linksToPutBack(const NetworkChange& change, const NetworkState& now);

}  // namespace cvagent::undo
