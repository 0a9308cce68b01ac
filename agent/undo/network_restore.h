#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "agent/undo/network_messages.h"

namespace cvagent::undo {

/// The kernel's network, with what of it can be put back.
struct NetworkState {
    NetworkMessages network;
    std::vector<NetworkMessage> neighbours;  ///< those that stay

    /// Of the calling thread. @return what keeps it from being known is in network.problem
    static NetworkState read();
};

/// What a change has done to the network, as far as it is to be taken back.
struct NetworkChange {
    const NetworkState& before;
    const NetworkState* left;   ///< what the change left; null when it did not come to its end
    const NetworkState& now;    ///< when the taking back began
    std::uint64_t seconds;      ///< since `before`; lifetimes are shorter by so much
    bool isKeeperTold = false;  ///< since `now`: the system that keeps an interface has its files back
};

/// Whether nothing would have to be put back of what was changed between them.
bool isSameNetwork(const NetworkState& before, const NetworkState& after);

/// Deletes what the change has made and adds what it has taken away, in three rounds at most. What others
/// have done since stays. Can be done again with the same change.
/// @param notes gets a line for each thing that is not back, and for what only the kernel or a router makes
void putBackNetwork(const NetworkChange& change, std::vector<std::string>& notes);

}  // namespace cvagent::undo
