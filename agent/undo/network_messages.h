#pragma once

#include <functional>
#include <string>
#include <vector>

#include "hosttools/netlink.h"

namespace cvagent::undo {

/// One message of the kernel about its network: what stands behind the header.
struct NetworkMessage {
    unsigned type = 0;
    std::string body;
};

/// What the kernel tells of a network of one namespace, each list in its order.
struct NetworkMessages {
    std::vector<NetworkMessage> links;
    std::vector<NetworkMessage> addresses;
    std::vector<NetworkMessage> nextHops;
    std::vector<NetworkMessage> routes;  ///< of all tables; without those that the kernel keeps itself
    std::vector<NetworkMessage> rules;
    int problem = 0;  ///< why some of it may be missing, as an errno; 0 when nothing is
};

/// Reads the network that the socket belongs to: that in which it was made.
NetworkMessages readNetwork(hosttools::NetlinkSocket& socket);
/// The neighbours that somebody has entered by hand.
std::vector<NetworkMessage> readPermanentNeighbours(hosttools::NetlinkSocket& socket, int& problem);

/// The attributes behind the fixed part of a message, changed or left out.
/// @param change gets an attribute's type and data; "false" leaves it out
std::string attributesOf(std::string_view body, std::size_t fixedPart,
                         const std::function<bool(unsigned, std::string&)>& change);
/// The data of one attribute; empty when there is none.
std::string_view attributeOf(std::string_view body, std::size_t fixedPart, unsigned type);

}  // namespace cvagent::undo
