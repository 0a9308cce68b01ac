#pragma once

#include <set>
#include <string>

#include "agent/undo/network_messages.h"

// Who makes a route: what others make by themselves is not put back.
namespace cvagent::undo {

/// There can be a million of them, and the program has its own memory of them.
bool isOfRoutingProgram(const NetworkMessage& route);

/// The subnets to which the kernel makes no route: who has set the address makes it in the kernel's name.
std::set<std::string> subnetsOfSomebody(const NetworkMessages& network);

/// Made by the kernel, a router or a routing program.
/// @param ofSomebody see above
bool isOfOthers(const NetworkMessage& route, const std::set<std::string>& ofSomebody);

}  // namespace cvagent::undo
