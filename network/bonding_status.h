#pragma once

#include <optional>
#include <string>
#include <vector>

namespace IC::parse {

/// What a status file of the bonding driver says of one member.
struct BondingMember {
    std::string miiStatus;     ///< the first word: "up", "down", "going" of "going back"
    std::string linkFailures;  ///< a decimal count
};

/// The section of exactly this port: it goes from its "Slave Interface:" to the next one.
/// @param lines the file's, with their line breaks
/// @return nothing when the port is no member
std::optional<BondingMember> bondingMember(const std::vector<std::string>& lines, const std::string& port);

}  // namespace IC::parse
