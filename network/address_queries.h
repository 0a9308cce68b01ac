#pragma once

#include <string>

namespace IC {

// What one interface's addresses say, asked anew at each call.

/// Which protocols an interface carries.
namespace ProtocolCode {
constexpr unsigned int ipv4 = 4096;  ///< also an interface without any address
constexpr unsigned int ipv6 = 4097;
constexpr unsigned int both = 4098;
}  // namespace ProtocolCode

/// Whether IPv6 sockets can be opened. A refused socket counts as "active" too.
bool isIPv6StackActive();

/// IPv4 address and mask from the classic `ifconfig`.
/// @param address set as soon as there is one, untouched otherwise
/// @param mask set with the address; empty for the loopback, whose line has no third field
/// @return whether both could be read
bool getIPv4Details(const std::string& name, std::string& address, std::string& mask);

/// Address and prefix length of one "inet6" line of `ip`.
/// @param line as it came, line break included; goes through the shell
/// @return whether there was one; both untouched otherwise
bool getAddressDetails(const std::string& line, std::string& address, unsigned int& prefixLength);

/// The preferred global IPv6 address from `ip`: the first static one, else the last autoconfigured one.
/// @param prefixLength bits; 0 without an address
/// @return whether the last line read could be parsed
bool getIPv6Address(const std::string& name, std::string& address, unsigned int& prefixLength);

/// @param code receives one of ProtocolCode
/// @return always true
bool getProtocolIIFType(const std::string& name, unsigned int& code);

/// The kind of an interface's IPv6 address: 7 beside an IPv4 address, 2 for IPv4 alone, else after the scope
/// that `ifconfig` prints, which gives 5.
/// @param kind untouched on failure
/// @return whether a kind was set
bool getIPv6AddressType(const std::string& name, unsigned int& kind);

}  // namespace IC
