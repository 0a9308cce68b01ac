#pragma once

#include <string>

#include "framework/ic/property_value.h"

namespace IC {

// Writers of an interface's IPv4 settings on hosts with SUSE's files. Failures are only logged. The mask and
// the gateway take effect at once, origin and address when the interface is next brought up.

/// Writes BOOTPROTO and STARTMODE into the interface's file.
/// @param origin IPOrigin code: dhcp or fixed; any other leaves BOOTPROTO as it is
/// @param mac hardware address, which names the file
void setIPOrigin(std::string ifName, PropertyValue origin, std::string mac);

/// Writes IPADDR, and BOOTPROTO=static when the file tells no origin.
void setIPv4Address(std::string ifName, std::string address, std::string mac);

/// Writes NETMASK, and BOOTPROTO=static when the file tells no origin; gives the running interface the mask
/// too.
void setSubnetMask(std::string ifName, std::string mask, std::string mac);

/// Deletes the host route through the gateway, writes the interface's route file, makes the gateway the
/// default.
/// @param ipAddress the interface's own
void setIPV4Gateway(std::string ifName, std::string ipAddress, std::string gateway);

/// Makes the gateway the IPv4 default route in /etc/sysconfig/network/routes.
void setIPv4GatewayForSuSe10(std::string const& ifName, std::string const& gateway);

/// Brings an interface up (1 or 9) or down (12 or 16). 32 and 33 of a bond are reports of the network
/// monitor, which change nothing; any other status is logged at level 6000 and changes nothing either.
void setInterfaceStatus(const std::string& ifName, unsigned int status);

// Nothing in the plug-in calls these two.
void restartNetwork();                                ///< restarts the host's network service
void disableNMControlled(std::string const& ifName);  ///< changes nothing

}  // namespace IC
