#pragma once

#include <string>
#include <vector>

#include "agent/core/node_ref.h"

namespace cvagent::oshw {

/// The names of the kernel's links, from /sys/class/net, that no port, IP configuration or team of the nodes
/// has, sorted; without the loopback and the members of bridges. None where the nodes are of no such plug-in.
std::vector<std::string> unshownLinks(const std::vector<NodeRef>& nodes);

}  // namespace cvagent::oshw
