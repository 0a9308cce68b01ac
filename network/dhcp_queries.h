#pragma once

#include <string>

namespace IC {

/// Whether dhcpcd keeps a lease for the interface, in /var/lib/dhcpcd/dhcpcd-<name>.info.
bool checkIsDhcp(const std::string& name);

/// The BOOTPROTO keyword of the interface's file below /etc/sysconfig/network, found by its hardware
/// address, without its quotes ("dhcp", "static").
/// @param keyword empty when there is none
void getBootProto(const std::string& name, std::string& keyword);

/// The identity (DUID) of the DHCPv6 server, from the client's lease files, which do not tell the interface.
/// @param server untouched when there is none
bool getDHCPv6Servers(const std::string& name, std::string& server);

}  // namespace IC
