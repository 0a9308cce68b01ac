#pragma once

#include <string>
#include <vector>

namespace IC {

// What an IP configuration shows beside the plain answers of the queries.

struct IPv4 {
    std::string address;  ///< may be there without the mask
    std::string mask;
    bool isWhole = false;  ///< both were told
};
IPv4 ipv4Of(const std::string& name);

struct IPv6 {
    std::string address;
    unsigned int prefixLength = 0;  ///< bits
};
IPv6 ipv6Of(const std::string& name);

/// The BOOTPROTO keyword of the interface's file; "" for none.
std::string bootProtoOf(const std::string& name);

/// Whether a line of `ifconfig` holds the bond's name: bond0's aliases count, and so does bond01.
bool isBondListed(const std::string& bond);

/// The interface's IPv6 gateway: the first one that was set by hand, else the one its routes have; "" for
/// none.
std::string preferredIPv6Gateway(const std::string& name);

/// The servers that gave the interface its addresses: the DHCP server of dhcpcd's lease file, then the
/// identity of the DHCPv6 server.
std::vector<std::string> dhcpServersOf(const std::string& name);

/// The fourth group of an IPv6 address; "" when there is none.
std::string ipv6InterfaceIdOf(const std::string& address);

}  // namespace IC
