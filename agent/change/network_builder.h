#pragma once

#include "agent/undo/network_messages.h"

namespace cvagent::change {

/// Makes the network of the calling thread, which has nothing but a loopback, like another one. What the
/// kernel refuses is left out.
void buildNetwork(const undo::NetworkMessages& like);

}  // namespace cvagent::change
