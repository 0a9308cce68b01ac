#pragma once

#include <string>
#include <vector>

namespace IC {

// Writers of an interface's IPv6 settings on hosts with SUSE's files. Failures are only logged. Address and
// prefix length take effect when the interface is next brought up, the gateway at once.

/// Writes the one IPv6 address the plug-in manages, IPADDR_1, into the interface's file. Every secondary
/// address in the file becomes this one.
/// @param mac hardware address, which names the file
void setIPv6Address(std::string ifName, std::string address, std::string mac);

/// Writes PREFIXLEN_1.
/// @param prefixLength bits
void setIPv6PrefixLength(std::string ifName, unsigned int prefixLength, std::string mac);

/// Makes `gateway` the interface's IPv6 default gateway. The address is accepted and not read.
void setIPv6Gateway(std::string ifName, std::string gateway, std::string address);

/// Adds the default route when it is not there yet, then removes the other static ones, so that the host is
/// never without one; then rewrites the routes file. A route that cannot be added leaves everything as it
/// was.
void setIPv6GatewayForSuSe10(std::string const& ifName, std::string const& gateway);

/// Deletes the default routes via these gateways, in order.
void deleteStaticIPv6GatewayOnSuSe10(std::string const& ifName, std::vector<std::string> const& gateways);

}  // namespace IC
