#pragma once

#include <netinet/in.h>
#include <string>
#include <string_view>

namespace hosttools {

/// The usual text of an address.
std::string textOf(in_addr address);
std::string textOf(const in6_addr& address);

/// An IPv6 address as files of /proc write it: 32 hexadecimal digits without colons.
/// @return whether it is one
bool parsePlainInet6(std::string_view digits, in6_addr& address);

/// A numeric IPv4 address, or "default" for 0.0.0.0. Names are not looked up.
/// @return whether it is one
bool parseInet(const char* text, in_addr& address);

}  // namespace hosttools
