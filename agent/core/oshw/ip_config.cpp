// IP configurations: what can be changed on the host's interfaces.
#include "agent/core/oshw/tables.h"
#include "agent/core/value_check.h"
#include "framework/ic/link_state.h"

namespace cvagent::oshw {

namespace {

constexpr Label kOrigins[] = {{"unknown", 0}, {"DHCP", 1, true}, {"BOOTP", 2}, {"static", 3, true}};
constexpr Label kLeaseOrigins[] = {{"DHCP", 1}, {"static", 3}};
constexpr Label kStates[] = {{"up", IC::LinkState::up, true},
                             {"up", IC::LinkState::bringUp, true},
                             {"down", IC::LinkState::down, true},
                             {"down", IC::LinkState::takeDown, true},
                             {"switched over", IC::LinkState::switchedOver},
                             {"switched back", IC::LinkState::switchedBack}};
constexpr Label kProtocols[] = {{"IPv4", 4096}, {"IPv6", 4097}, {"IPv4 and IPv6", 4098}};
constexpr Label kAddressTypes[] = {{"IPv4", 2}, {"IPv6", 5}, {"IPv4 and IPv6", 7}};
constexpr Label kEnumerate[] = {{"now", 1, true}};

constexpr auto ip = NodeType::ipConfig;

constexpr Property kIpConfigRows[] = {
    {ip, 24, "IPOrigin", Kind::enumeration, Unit::none, kOrigins,
     "how the interface is configured to get its address; takes effect when it is next brought up",
     check::enumeration},
    {ip,
     25,
     "IPv4Address",
     Kind::text,
     Unit::none,
     {},
     "the IPv4 address, 0.0.0.0 for none; written to the interface file, and only while IPOrigin is 3",
     check::ipv4Address,
     "the IPv4 address of a host, such as 192.0.2.10"},
    {ip,
     26,
     "SubnetMask",
     Kind::text,
     Unit::none,
     {},
     "the IPv4 mask, 0.0.0.0 for none; written only while IPOrigin is 3",
     check::subnetMask,
     "a contiguous mask, such as 255.255.255.0"},
    {ip,
     27,
     "IPv6Address",
     Kind::text,
     Unit::none,
     {},
     "the global IPv6 address; written to the interface file, and only while IPOrigin is 3",
     check::ipv6Address,
     "an IPv6 address without its prefix length, such as 2001:db8::10"},
    {ip, 28, "IPv6AddressType", Kind::enumeration, Unit::none, kAddressTypes,
     "which kinds of addresses the interface has"},
    {ip, 29, "IPv6InterfaceId", Kind::text, Unit::none, {}, "fourth group of the IPv6 address"},
    {ip, 47, "Protocol", Kind::number, Unit::none, kProtocols, "the protocols the interface carries"},
    {ip, 74, "EnumeratePorts", Kind::number, Unit::none, kEnumerate,
     "writing 1 looks for interfaces that have appeared", check::code, nullptr, false},
    {ip, 93, "DHCPServers", Kind::texts, Unit::none, {}, "the servers that leased the addresses"},
    {ip,
     94,
     "DNSServers",
     Kind::texts,
     Unit::none,
     {},
     "the host's name servers, in order of preference",
     check::dnsServers,
     "IPv4 and IPv6 addresses, each as a word of its own; \"\" removes all"},
    {ip, 95, "IPOrigins", Kind::numbers, Unit::none, kOrigins, "what IPOrigin accepts"},
    {ip, 96, "LeaseOrigin", Kind::enumeration, Unit::none, kLeaseOrigins,
     "1 when there was a DHCP lease for the interface as the plug-in was loaded, else 3"},
    {ip,
     97,
     "HostName",
     Kind::text,
     Unit::none,
     {},
     "the host's short name",
     check::hostName,
     "a host name without its domain: up to 63 letters, digits and inner hyphens"},
    {ip,
     98,
     "DomainName",
     Kind::text,
     Unit::none,
     {},
     "the host's DNS domain",
     check::domainName,
     "a domain name: labels of letters, digits and inner hyphens joined by dots, the last of them no "
     "number; \"\" removes it"},
    {ip,
     99,
     "DNSSuffixes",
     Kind::texts,
     Unit::none,
     {},
     "domains that short names are searched in",
     check::dnsSuffixes,
     "domain names, each as a word of its own, 504 characters in all; \"\" removes all"},
    {ip,
     100,
     "IPv4Gateway",
     Kind::text,
     Unit::none,
     {},
     "the IPv4 default gateway; written only while IPOrigin is 3",
     check::ipv4Address,
     "the IPv4 address of a router, such as 192.0.2.1"},
    {ip,
     101,
     "IPv6Gateway",
     Kind::text,
     Unit::none,
     {},
     "the IPv6 default gateway; written only while IPOrigin is 3",
     check::ipv6Gateway,
     "the IPv6 address of a router, such as fe80::1"},
    {ip,
     102,
     "IPv6PrefixLength",
     Kind::number,
     Unit::bits,
     {},
     "length of the IPv6 prefix; written to the interface file, and only while IPOrigin is 3",
     check::prefixLength,
     "a number of bits from 1 to 128"},
    {ip, 108, "InterfaceName", Kind::text, Unit::none, {}, "the interface name"},
    {ip, 121, "DisplayName", Kind::text, Unit::none, {}, "the interface name once more"},
    {ip, 123, "InterfaceState", Kind::number, Unit::none, kStates,
     "whether the interface has a link; writing brings it up or down at once", check::code},
    {ip, 125, "InterfaceStates", Kind::numbers, Unit::none, kStates, "the states an interface can have"},
    {ip, 186, "UsesDHCP", Kind::number, Unit::none, {}, "whether there is a DHCP lease for the interface"},
};

}  // namespace

std::span<const Property> ipConfigProperties() {
    return kIpConfigRows;
}

}  // namespace cvagent::oshw
