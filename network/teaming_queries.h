#pragma once

#include <string>
#include <vector>

namespace IC {

// What the bonding driver's status files, /proc/net/bonding/<team>, and the interface files say of teams.
// Asked anew at each call; nothing here changes the host.

/// What getNICTeamingInformation can be asked, by the port's property ids.
namespace TeamingProperty {
constexpr unsigned int role = 193;  ///< SLAVE and MASTER of the port's interface file
constexpr unsigned int activeMember =
    194;                                 ///< not empty when the active member's name begins with the port's
constexpr unsigned int miiStatus = 195;  ///< the first word of the member's MII status
constexpr unsigned int linkFailures = 196;  ///< the member's link failure count, decimal
}  // namespace TeamingProperty

/// The teams in the order of the driver's directory; editor backups ("bond0~") are none.
/// @param teams is appended to
/// @return false when there is no bonding driver
bool getNICTeams(std::vector<std::string>& teams);

/// @param mode the driver's words: "fault-tolerance (active-backup)"; "" on failure
/// @return whether there was one
bool getBondingMode(std::string team, std::string& mode);

/// @param members is appended to, in the order of the status file
/// @return whether there was one
bool getBondingMembers(std::string team, std::vector<std::string>& members);

/// Answers one question about a port.
/// @param id a TeamingProperty; any other changes nothing
/// @param result the answer; "" when there is none
/// @param master for the role it receives the team's name or "", for the others it names the port's team
void getNICTeamingInformation(std::string const& port, unsigned int id, std::string& result,
                              std::string& master);

}  // namespace IC
