#pragma once

#include <string>
#include <vector>

#include "framework/netinfo/network_info.h"
#include "mi/command.h"

namespace IC {

/// Takes the interface name out of a line of /proc/net/dev ("  eth0: 1 2", counters cut off) or of
/// `brctl show` ("br0\t8000…"). Leading blanks stay.
/// @return false when the line is a bridge's, that is, when it holds "br"
bool getNICString(const std::string& line, std::string& name);

/// The last column of `brctl show`: the members of all bridges, and what else stands there in the row of a
/// bridge without members.
/// @param members is appended to
/// @return whether the listing had a line
bool getbridgeInterfaces(std::vector<std::string>& members);

/// The lines of a bond's file below /proc/net/bonding that name its members.
HostCommand bondMemberLines(const std::string& bond);

/// The members of a bond, in the order of its file below /proc/net/bonding.
/// @param members is appended to
/// @return false only when the shell could not be started
bool getSlaveInterfaces(const std::string& bond, std::vector<std::string>& members);

/// The VLAN of exactly this name; null when there is none or no map.
CEthernetPort* getVLANInterface(const EthernetPortsByName* vlans, std::string name);

/// The first physical port of exactly this name, in the order of the controllers; null when there is none.
/// @param ports not null
CEthernetPort* isPhysicalPort(const EthernetPortsByController* ports, std::string name);

}  // namespace IC
