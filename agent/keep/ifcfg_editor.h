#pragma once

#include <string>

#include "agent/keep/wish.h"

namespace cvagent::keep {

/// The file of an interface on current SUSE ("ifcfg-eth0") with as few lines changed as the wish takes.
/// Gateways and name servers stand in other files. Throws CannotKeep.
std::string editedIfcfg(const std::string& text, const Wish& wish);

/// Whether such a file has the address of IPv4 come by DHCP.
bool isIfcfgByDhcp(const std::string& text);

/// The file of an interface's own routes ("ifroute-eth0") with the default routes of the wish in it.
std::string editedIfroute(const std::string& text, const Wish& wish);

}  // namespace cvagent::keep
