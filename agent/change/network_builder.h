#pragma once

#include "agent/change/network_messages.h"

namespace cvagent::change {

/// Makes the network of the calling thread, which has nothing but a loopback, like another one. What the
/// kernel refuses is left out.
void buildNetwork(const NetworkMessages& like);

}  // namespace cvagent::change
