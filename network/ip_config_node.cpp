// The read side of an interface's IP configuration. The write side is ip_config_writer.cpp.
#include "network/ip_config_node.h"

#include <utility>

#include "mi/command.h"
#include "mi/log.h"
#include "mi/property_table.h"
#include "mi/text.h"
#include "network/address_queries.h"
#include "network/dhcp_queries.h"
#include "network/dns.h"
#include "network/ip_facts.h"
#include "network/ip_origin.h"
#include "network/link_codes.h"
#include "network/link_queries.h"
#include "network/route_queries.h"

namespace IC {

namespace {

using Config = IPConfigNode;

Error readOrigin(const Config& config, PropertyValue& out) {
    std::string keyword;
    getBootProto(config.name(), keyword);
    out = {EnumValue(originOfKeyword(keyword)), true};
    return {};
}

/// An interface without any address reads as "0.0.0.0", one that carries IPv6 alone as empty.
/// @param found whether address and mask were both read
/// @param text what was read, even if the other half could not be
std::string orUnset(const Config& config, bool found, const std::string& text) {
    if (found) {
        return text;
    }
    unsigned int code = 0;
    getProtocolIIFType(config.name(), code);
    return text.empty() && code == ProtocolCode::ipv4 ? "0.0.0.0" : text;
}

Error readIPv4Address(const Config& config, PropertyValue& out) {
    std::string address;
    std::string mask;
    const bool found = getIPv4Details(config.name(), address, mask);
    out = {orUnset(config, found, address), true};
    return {};
}

Error readSubnetMask(const Config& config, PropertyValue& out) {
    std::string address;
    std::string mask;
    const bool found = getIPv4Details(config.name(), address, mask);
    out = {orUnset(config, found, mask), true};
    return {};
}

Error readIPv6Address(const Config& config, PropertyValue& out) {
    std::string address;
    unsigned int prefixLength = 0;
    getIPv6Address(config.name(), address, prefixLength);
    out = {address, true};
    return {};
}

Error readIPv6PrefixLength(const Config& config, PropertyValue& out) {
    std::string address;
    unsigned int prefixLength = 0;
    getIPv6Address(config.name(), address, prefixLength);
    out = {Number(prefixLength), true};
    return {};
}

Error readIPv6AddressType(const Config& config, PropertyValue& out) {
    unsigned int kind = 0;
    if (getIPv6AddressType(config.name(), kind)) {
        out = {EnumValue(kind), true};
    }
    return {};
}

Error readProtocol(const Config& config, PropertyValue& out) {
    unsigned int code = 0;
    getProtocolIIFType(config.name(), code);
    out = {Number(code), true};
    return {};
}

Error readDnsServers(const Config&, PropertyValue& out) {
    std::vector<std::string> servers;
    std::vector<std::string> suffixes;
    getDNSDetails(servers, suffixes);
    out = {servers, true};
    return {};
}

Error readDnsSuffixes(const Config&, PropertyValue& out) {
    std::vector<std::string> servers;
    std::vector<std::string> suffixes;
    getDNSDetails(servers, suffixes);
    out = {suffixes, true};
    return {};
}

Error readHostName(const Config&, PropertyValue& out) {
    const FirstLine answer = firstLine(formatCommand("hostname -s 2> /dev/null"));
    out = {trimEnd(answer.line.value_or("")), true};
    return {};
}

Error readDomainName(const Config&, PropertyValue& out) {
    const FirstLine answer = firstLine(formatCommand("hostname -d 2> /dev/null"));
    const std::string domain = trimEnd(answer.line.value_or(""));
    // A host that does not know its domain has none, as opposed to one with an empty name.
    out =
        contains(domain, "Unknown") ? PropertyValue(PropertyValue::text, true) : PropertyValue(domain, true);
    return {};
}

Error readIPv4Gateway(const Config& config, PropertyValue& out) {
    std::string gateway;
    getIPV4Gateway(config.name(), gateway);
    out = {gateway, true};
    return {};
}

Error readIPv6Gateway(const Config& config, PropertyValue& out) {
    out = {preferredIPv6Gateway(config.name()), true};
    return {};
}

bool isListed(const std::string& bond) {
    return firstLine(HostCommand::fromText(textCommand("ifconfig | grep %s 2> /dev/null", bond)))
        .line.has_value();
}

Error readLinkState(const Config& config, PropertyValue& out) {
    const std::string& name = config.name();
    const bool isUp = contains(name, "bond") ? isListed(name) : isNICUp(name);
    out = {Number(isUp ? LinkCode::up : LinkCode::down), true};
    return {};
}

Error readUsesDhcp(const Config& config, PropertyValue& out) {
    out = {Number(checkIsDhcp(config.name())), true};
    return {};
}

constexpr Property<Config> kConfigProperties[] = {
    {Config::ipOrigin, "IP origin", readOrigin},
    {Config::ipv4Address, "IPv4 address", readIPv4Address},
    {Config::subnetMask, "subnet mask", readSubnetMask},
    {Config::ipv6Address, "IPv6 address", readIPv6Address},
    {Config::ipv6AddressType, "IPv6 address type", readIPv6AddressType},
    {Config::protocol, "protocol", readProtocol},
    {Config::dnsServers, "DNS servers", readDnsServers},
    {Config::hostName, "host name", readHostName},
    {Config::domainName, "domain name", readDomainName},
    {Config::dnsSuffixes, "DNS suffixes", readDnsSuffixes},
    {Config::ipv4Gateway, "IPv4 gateway", readIPv4Gateway},
    {Config::ipv6Gateway, "IPv6 gateway", readIPv6Gateway},
    {Config::ipv6PrefixLength, "IPv6 prefix length", readIPv6PrefixLength},
    {Config::linkState, "link state", readLinkState},
    {Config::usesDhcp, "uses DHCP", readUsesDhcp},
};
static_assert(idsAscend(kConfigProperties));

struct Keyword {
    const char* text;
    unsigned int origin;
};
constexpr Keyword kKeywords[] = {
    {"dhcp", IPOrigin::dhcp},  {"dhcp4", IPOrigin::dhcp},  {"static", IPOrigin::fixed},
    {"none", IPOrigin::fixed}, {"bootp", IPOrigin::bootp},
};

}  // namespace

unsigned int originOfKeyword(const std::string& keyword) {
    for (const Keyword& known : kKeywords) {
        if (keyword == known.text) {
            return known.origin;
        }
    }
    return 0;
}

IPConfigNode::IPConfigNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                           unsigned int nodeType, unsigned int index, std::string name)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index), name_(std::move(name)) {
    const LogScope scope("IPConfigNode::IPConfigNode");
}

IPConfigNode::~IPConfigNode() {
    const LogScope scope("IPConfigNode::~IPConfigNode");
}

Error IPConfigNode::getProperty(unsigned int id, PropertyValue& value) const {
    const LogScope scope("IPConfigNode::getProperty");
    const auto* live = findProperty(kConfigProperties, id);
    return live != nullptr ? live->read(*this, value) : MutableNode::getProperty(id, value);
}

}  // namespace IC
