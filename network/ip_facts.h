#pragma once

#include <string>
#include <vector>

namespace IC {

// What an IP configuration shows beside the plain answers of the queries.

/// The interface's IPv6 gateway: the first one that was set by hand, else the one its routes have; "" for
/// none.
std::string preferredIPv6Gateway(const std::string& name);

/// The servers that gave the interface its addresses: the DHCP server of dhcpcd's lease file, then the
/// identity of the DHCPv6 server.
std::vector<std::string> dhcpServersOf(const std::string& name);

/// The fourth group of an IPv6 address; "" when there is none.
std::string ipv6InterfaceIdOf(const std::string& address);

}  // namespace IC
