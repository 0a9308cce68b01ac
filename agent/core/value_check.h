#pragma once

#include "agent/core/catalogue.h"

/// What may be written to the host. The plug-in puts these values into root's shell commands and into line
/// files, so each check lets pass only what it knows to be harmless, byte by byte, and never cleans a value
/// up.
namespace cvagent::check {

using Words = std::span<const std::string>;
using Value = std::optional<IC::PropertyValue>;

/// A writable code of the property's labels, by number or label; for properties of kind enumeration.
Value enumeration(const Property& property, Words words);
/// The same for properties of kind number.
Value code(const Property& property, Words words);
/// Up to 1024 bytes of UTF-8 without control characters; empty is accepted.
Value ownerText(const Property& property, Words words);
/// A date and time that QX::DateTime reads.
Value dateTime(const Property& property, Words words);
/// An offset from UTC in minutes that the host has a zone for.
Value timeZoneOffset(const Property& property, Words words);
/// An IPv4 address that a host can have: not 0.x, 127.x, nor from 224.0.0.0 up.
Value ipv4Address(const Property& property, Words words);
/// A contiguous mask of at least one bit.
Value subnetMask(const Property& property, Words words);
/// An IPv6 address that an interface can be given: not ::, ::1, multicast, link-local or IPv4-mapped.
Value ipv6Address(const Property& property, Words words);
/// An IPv6 address of a router; link-local ones are the usual case.
Value ipv6Gateway(const Property& property, Words words);
/// 1 to 128.
Value prefixLength(const Property& property, Words words);
/// IPv4 and IPv6 addresses in any mix; one empty word empties the list.
Value dnsServers(const Property& property, Words words);
/// One label of RFC 1123.
Value hostName(const Property& property, Words words);
/// Labels of RFC 1123 joined by dots; empty means that the host has no domain.
Value domainName(const Property& property, Words words);
/// Domain names that together fit a search line; one empty word empties the list.
Value dnsSuffixes(const Property& property, Words words);

}  // namespace cvagent::check
