#pragma once

#include <map>
#include <string>
#include <vector>

namespace hardware {

/// What stands at the other end of a link's cable, as it says itself (LLDP and the like). Anybody on the
/// network can have written it; what is not told is empty.
struct Neighbour {
    std::string name;             ///< of the whole system, usually a switch
    std::string chassis;          ///< its number, often a hardware address
    std::string port;             ///< the port's own number or name
    std::string portDescription;  ///< for people
};

/// By the names of this host's links.
using Neighbours = std::map<std::string, std::vector<Neighbour>>;

/// Asks lldpd through its client library, liblldpctl. Empty where one of them is missing or does not let this
/// process ask. Takes as long as lldpd likes.
Neighbours askNeighbours();

}  // namespace hardware
