#pragma once

#include <string>

namespace IC {

enum class AddressFamily { ipv4, ipv6 };

enum class RoutesRewrite {
    notRead,     ///< there is no routes file; none is made
    notWritten,  ///< it could not be opened for writing and is the old one
    written,
};

/// Makes `gateway` the only default route of its family in /etc/sysconfig/network/routes. All route lines of
/// the family go; comments and the other family's lines stay in order, behind the new line for IPv4 and
/// before it for IPv6. A file of nothing but comments becomes the new line alone.
RoutesRewrite replaceDefaultRoute(AddressFamily family, const std::string& gateway);

}  // namespace IC
