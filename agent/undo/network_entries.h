#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "agent/undo/network_restore.h"

namespace cvagent::undo {

/// One thing of the kernel's network that can be put back.
struct Entry {
    std::string group;  ///< entries of one group have an order among each other
    std::string same;   ///< two entries with this in common are the same
    std::string key;    ///< there can be only one with this
    NetworkMessage message;
    int rank = 0;  ///< those of a lower one are added first: others count on them
};

/// A kind of them: how it is found, made and taken away.
struct EntryKind {
    bool isOneValue;  ///< what stands in a group is one thing that somebody has set
    /// Those of links that are known, the oldest of a group first; not what the kernel or a router makes.
    std::vector<Entry> (*entries)(const NetworkState& state, const std::vector<unsigned>& links);
    /// Makes one. @return 0 or an errno
    int (*add)(hosttools::NetlinkSocket& socket, const NetworkMessage& message);
    int (*remove)(hosttools::NetlinkSocket& socket, const NetworkMessage& message);
    /// "the address 192.0.2.7/24 of eth0"
    std::string (*text)(const NetworkMessage& message, const NetworkMessages& network);
    /// Whether a DHCP client has set it; null: it sets none of these.
    bool (*isLeased)(const NetworkMessage& message, const NetworkMessages& network);
};

/// In the order in which they are added; they are taken away the other way round.
const std::vector<EntryKind>& entryKinds();

/// The routes that the kernel, a router or a routing program makes, as texts, sorted.
std::vector<std::string> routesOfOthers(const NetworkMessages& network);

/// Whether a route has an address as the one that it prefers.
bool prefers(const NetworkMessage& route, const NetworkMessage& address);

/// An address that was given for a time, with what is left of it after so many seconds. False when nothing
/// is.
bool age(NetworkMessage& address, std::uint64_t seconds);

std::string linkName(const NetworkMessages& network, unsigned index);

}  // namespace cvagent::undo
