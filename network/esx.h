#pragma once

#include <string>

namespace IC {

// VMware ESX keeps its network settings itself: these are its own switches. Nothing in the plug-in calls the
// first two.

/// Turns IPv6 on for the service console and, when that could be started, for the kernel's interfaces.
/// @return whether both commands could be started
bool enableIPv6ForESX();

/// Whether the host's release file speaks of a 4.1.
bool checkESX4_1Release();

// Hosts on which these steps were needed are no longer served; callers still take them in the same order.
void enableIPv6forRHEL();                                             ///< does nothing
void disablePeerDNS(std::string const& ifName);                       ///< does nothing
void executeGatewayChanges(std::string ifName, std::string gateway);  ///< does nothing

}  // namespace IC
