#pragma once

#include <string>

#include "agent/undo/network_messages.h"

namespace cvagent::undo {

// Requests that make again what the kernel has told of; states, which cannot be asked for, are left out.
// @param how NLM_F_CREATE and so on

/// @param more flags on top of those that the address has
std::string addressRequest(const NetworkMessage& message, unsigned how, unsigned more);
std::string routeRequest(const NetworkMessage& message, unsigned how);
std::string nextHopRequest(const NetworkMessage& message, unsigned how);

}  // namespace cvagent::undo
