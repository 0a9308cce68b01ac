#pragma once

#include <optional>
#include <string>

namespace IC::parse {

// Each takes one line as the command printed it, line break included, and asks nobody.

struct AddressAndPrefix {
    std::string address;
    unsigned int prefixLength;  ///< bits
};
/// "2001:db8::1/64"; nothing without a slash.
std::optional<AddressAndPrefix> addressAndPrefix(const std::string& line);

/// Whether a line of `ip -6 address` is that of an address the kernel or DHCP made.
bool isAutoconfigured(const std::string& line);

/// The address kind that a scope word gives.
unsigned int addressKind(const std::string& scope);

/// The second field of a line of `route -n`: the gateway; nothing in a line of one field.
std::optional<std::string> gatewayField(const std::string& line);

/// A value of a shell-style file, all its quotes removed.
std::string unquoted(const std::string& line);

/// The server identity of a lease file's SDUID entry, without the semicolons at its end.
std::string dhcpv6Server(const std::string& line);

}  // namespace IC::parse
