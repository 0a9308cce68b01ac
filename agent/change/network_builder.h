#pragma once

#include "agent/change/network_messages.h"

namespace cvagent::change {

struct Peers {
    hosttools::NetlinkSocket& socket;  ///< of that network
    int network;                       ///< its descriptor
};

/// Makes the network of the calling thread, which has nothing but a loopback, like another one. What the
/// kernel refuses is left out.
/// @param peers an empty network for the other ends of cables, which stand for links that cannot be of their
///              kind
void buildNetwork(const NetworkMessages& like, const Peers& peers);

}  // namespace cvagent::change
