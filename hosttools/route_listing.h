#pragma once

#include <string_view>

#include "hosttools/text.h"

namespace hosttools {

/// The routing table in the classic format, from the text of /proc/net/route. The kernel's files hold what
/// netlink does not tell (reference counts, the flags of routes from router advertisements), in the order
/// that listings have. A damaged line costs that line; routes that are not up are left out.
Text listRoutes(std::string_view procNetRoute);

/// The same for IPv6, from the text of /proc/net/ipv6_route: every table, and the routes that are not up too.
Text listInet6Routes(std::string_view procNetIpv6Route);

}  // namespace hosttools
