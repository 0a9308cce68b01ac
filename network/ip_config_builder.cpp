#include "network/ip_config_builder.h"

#include "mi/text.h"
#include "network/address_queries.h"
#include "network/dhcp_queries.h"
#include "network/ip_facts.h"
#include "network/ip_origin.h"
#include "network/link_codes.h"
#include "network/link_queries.h"
#include "network/route_queries.h"

namespace IC {

namespace {

using Config = IPConfigNode;
using Settings = std::map<std::string, std::string>;

PropertyValue text(const std::string& value) {
    return {value, true};
}
PropertyValue texts(const std::vector<std::string>& values) {
    return {values, true};
}
PropertyValue number(unsigned int value) {
    return {Number(value), true};
}

/// An interface without an address shows this one.
std::string orZeros(const std::string& address) {
    return address.empty() ? "0.0.0.0" : address;
}

void fillLink(Config& node) {
    const unsigned int state = isInterfaceUP(node.name()) ? LinkCode::up : LinkCode::down;
    node.setStatus(state);
    node.setProperty(Config::linkState, number(state));
    node.setProperty(Config::linkStatesSupported,
                     {std::vector<Number>{0U, LinkCode::up, LinkCode::down}, true});
    node.setProperty(Config::interfaceName, text(node.name()));
    node.setProperty(Config::interfaceLabel, text(node.name()));
}

void fillIPv4(Config& node, Settings& settings) {
    std::string address;
    std::string mask;
    getIPv4Details(node.name(), address, mask);
    node.setProperty(Config::ipv4Address, text(orZeros(address)));
    node.setProperty(Config::subnetMask, text(orZeros(mask)));
    settings.emplace("IPv4ADDR", orZeros(address));
    settings.emplace("NETMASK", orZeros(mask));
}

void fillIPv6(Config& node, Settings& settings) {
    unsigned int code = ProtocolCode::ipv4;
    getProtocolIIFType(node.name(), code);
    node.setProperty(Config::protocol, number(code));
    std::string address;
    unsigned int prefixLength = 0;
    getIPv6Address(node.name(), address, prefixLength);
    node.setProperty(Config::ipv6PrefixLength, number(prefixLength));
    node.setProperty(Config::ipv6Address, text(address));
    node.setProperty(Config::ipv6InterfaceId, text(ipv6InterfaceIdOf(address)));
    unsigned int kind = 0;
    getIPv6AddressType(node.name(), kind);
    node.setProperty(Config::ipv6AddressType, {EnumValue(kind), true});
    settings.emplace("IPV6ADDR", address);
    settings.emplace("PREFIX", signedDecimal(prefixLength));
}

void fillNames(Config& node, const HostFacts& host) {
    node.setProperty(Config::hostName, text(host.hostName));
    node.setProperty(Config::domainName, text(host.domainName));
    node.setProperty(Config::dnsServers, texts(host.dnsServers));
    node.setProperty(Config::dnsSuffixes, texts(host.dnsSuffixes));
}

void fillOrigin(Config& node, Settings& settings) {
    std::string keyword;
    getBootProto(node.name(), keyword);
    node.setProperty(Config::ipOrigin, {EnumValue(originOfKeyword(keyword)), true});
    const bool hasLease = checkIsDhcp(node.name());
    node.setProperty(Config::addressOrigin, {EnumValue(hasLease ? IPOrigin::dhcp : IPOrigin::fixed), true});
    node.setProperty(Config::originsSupported, {std::vector<Number>{IPOrigin::dhcp, IPOrigin::fixed}, true});
    node.setProperty(Config::usesDhcp, {Number(hasLease), true});
    node.setProperty(Config::dhcpServers, texts(dhcpServersOf(node.name())));
    settings.emplace("BOOTPROTO", keyword);
}

void fillGateways(Config& node, Settings& settings) {
    std::string gateway;
    getIPV4Gateway(node.name(), gateway);
    const std::string ipv6Gateway = preferredIPv6Gateway(node.name());
    node.setProperty(Config::ipv4Gateway, text(gateway));
    node.setProperty(Config::ipv6Gateway, text(ipv6Gateway));
    settings.emplace("GATEWAY", gateway);
    settings.emplace("IPV6GATEWAY", ipv6Gateway);
}

}  // namespace

void fillIPConfig(IPConfigNode& node, const HostFacts& host, Settings& settings) {
    fillLink(node);
    fillIPv4(node, settings);
    fillIPv6(node, settings);
    fillNames(node, host);
    fillOrigin(node, settings);
    fillGateways(node, settings);
}

}  // namespace IC
