#pragma once

#include <string>
#include <vector>

namespace IC {

// An interface's gateways, from `route`. The lines are chosen by substring: eth1 also sees the routes of
// eth10.

/// The gateway of the first route of this interface that has one. When all its routes are on-link, the
/// host's default gateway, whatever interface that is on.
/// @param gateway emptied first; "0.0.0.0" stays in it when there is no default route either
/// @return whether one was found
bool getIPV4Gateway(const std::string& name, std::string& gateway);

/// The next hop of the first IPv6 route of this interface that is up and has one.
/// @param gateway emptied first
/// @return whether one was found
bool getIPV6Gateway(const std::string& name, std::string& gateway);

/// The next hops of the interface's IPv6 gateway routes that no router advertised, from `route`.
/// @param gateways is appended to, in the order of the routing table
/// @return whether there was one
bool getStaticIPV6GatewaysOnSuSe10(std::string const& ifName, std::vector<std::string>& gateways);

/// Whether the text holds a colon, as every IPv6 address does.
bool isIPv6GatewayAddressPresent(const std::string& address);

}  // namespace IC
