#pragma once

#include "agent/change/plan.h"
#include "agent/undo/network_messages.h"

namespace cvagent::change {

/// What the kernel holds for the calling thread: its network and host name.
KernelState readKernelState();

/// The lines of a network alone, sorted.
KernelState linesOf(const undo::NetworkMessages& network);

/// The lines of one state that another one has not.
KernelState missingFrom(const KernelState& other, const KernelState& state);

}  // namespace cvagent::change
