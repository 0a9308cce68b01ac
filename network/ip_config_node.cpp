#include "network/ip_config_node.h"

#include "framework/ic/link_state.h"
#include "mi/command.h"
#include "mi/globals.h"
#include "mi/host_name.h"
#include "mi/text.h"
#include "network/address_queries.h"
#include "network/dhcp_queries.h"
#include "network/dns.h"
#include "network/esx.h"
#include "network/ip_facts.h"
#include "network/ip_origin.h"
#include "network/ipv4_writer.h"
#include "network/ipv6_writer.h"
#include "network/link_queries.h"
#include "network/network_builder.h"
#include "network/route_queries.h"

namespace IC {

namespace {

namespace ConfigId {
enum : unsigned int {
    ipOrigin = 24,              ///< enumeration: IPOrigin code; writing 1 or 3 edits the interface file
    ipv4Address = 25,           ///< text
    subnetMask = 26,            ///< text
    ipv6Address = 27,           ///< text
    ipv6AddressType = 28,       ///< enumeration
    ipv6InterfaceId = 29,       ///< text: fourth group of the IPv6 address
    protocol = 47,              ///< number: ProtocolCode
    reenumeratePorts = 74,      ///< number: writing 1 looks for new interfaces; never stored then
    dhcpServers = 93,           ///< list of texts
    dnsServers = 94,            ///< list of texts, the host's
    originsSupported = 95,      ///< list of numbers: 1, 3
    addressOrigin = 96,         ///< enumeration: 1 with a DHCP lease, else 3
    hostName = 97,              ///< text, the host's
    domainName = 98,            ///< text, the host's
    dnsSuffixes = 99,           ///< list of texts, the host's
    ipv4Gateway = 100,          ///< text
    ipv6Gateway = 101,          ///< text
    ipv6PrefixLength = 102,     ///< number of bits
    interfaceName = 108,        ///< text
    interfaceLabel = 121,       ///< text: the name again
    linkState = 123,            ///< number: LinkState
    linkStatesSupported = 125,  ///< list of numbers: 0, up, down
    usesDhcp = 186,             ///< boolean: a DHCP lease file exists
};
}  // namespace ConfigId

using Settings = std::map<std::string, std::string>;

// What the host says.

PropertyValue originValue(const std::string& keyword) {
    return {EnumValue(originOfKeyword(keyword)), true};
}

PropertyValue originOf(const std::string& name) {
    return originValue(bootProtoOf(name));
}

PropertyValue protocolOf(const std::string& name) {
    unsigned int code = 0;
    getProtocolIIFType(name, code);
    return {Number(code), true};
}

/// The address or the mask. An interface without any address reads as "0.0.0.0", one that carries IPv6 alone
/// as empty.
template <std::string IPv4::*text>
PropertyValue ipv4ValueOf(const std::string& name) {
    const IPv4 ip = ipv4Of(name);
    const bool isUnset = !ip.isWhole && protocolOf(name) == PropertyValue(Number(ProtocolCode::ipv4), true);
    return {isUnset && (ip.*text).empty() ? "0.0.0.0" : ip.*text, true};
}

PropertyValue ipv6AddressOf(const std::string& name) {
    return {ipv6Of(name).address, true};
}

PropertyValue prefixLengthOf(const std::string& name) {
    return {Number(ipv6Of(name).prefixLength), true};
}

PropertyValue ipv6TypeOf(const std::string& name) {
    unsigned int type = 0;
    return getIPv6AddressType(name, type) ? PropertyValue(EnumValue(type), true) : PropertyValue();
}

PropertyValue dnsServersOf(const std::string&) {
    HostFacts host;
    getDNSDetails(host.dnsServers, host.dnsSuffixes);
    return {host.dnsServers, true};
}

PropertyValue dnsSuffixesOf(const std::string&) {
    HostFacts host;
    getDNSDetails(host.dnsServers, host.dnsSuffixes);
    return {host.dnsSuffixes, true};
}

PropertyValue shortHostNameOf(const std::string&) {
    return {trimEnd(firstLine("hostname -s 2> /dev/null").line.value_or("")), true};
}

PropertyValue domainNameOf(const std::string&) {
    const std::string domain = trimEnd(firstLine("hostname -d 2> /dev/null").line.value_or(""));
    // A host that does not know its domain has none, as opposed to one with an empty name.
    return contains(domain, "Unknown") ? PropertyValue(PropertyValue::text, true)
                                       : PropertyValue(domain, true);
}

PropertyValue ipv4GatewayOf(const std::string& name) {
    std::string gateway;
    getIPV4Gateway(name, gateway);
    return {gateway, true};
}

PropertyValue ipv6GatewayOf(const std::string& name) {
    return {preferredIPv6Gateway(name), true};
}

PropertyValue stateValue(bool isUp) {
    return {Number(isUp ? LinkState::up : LinkState::down), true};
}

PropertyValue configStateOf(const std::string& name) {
    return stateValue(contains(name, "bond") ? isBondListed(name) : isNICUp(name));
}

PropertyValue usesDhcp(const std::string& name) {
    return {Number(checkIsDhcp(name)), true};
}

// What changes the host.

void writeIPv4Address(Change& change) {
    setIPv4Address(change.name, change.text(), change.mac);
}

void writeSubnetMask(Change& change) {
    setSubnetMask(change.name, change.text(), change.mac);
}

void writeIPv6Address(Change& change) {
    setIPv6Address(change.name, change.text(), change.mac);
    // The host's entry in /etc/hosts moves to the new address.
    const std::string host = change.current(ConfigId::hostName);
    executeDomainandHostnameChanges(host, change.current(ConfigId::domainName), false, change.text());
}

void writeIPv4Gateway(Change& change) {
    log(kProgress) << "Gateway :: " << change.value;
    setIPV4Gateway(change.name, change.current(ConfigId::ipv4Address), change.text());
}

void writeIPv6Gateway(Change& change) {
    if (!change.text().empty()) {
        // Asked for twice: whether the route could be added is told nobody, and the second call tries again.
        setIPv6Gateway(change.name, change.text(), "");
        setIPv6Gateway(change.name, change.text(), change.current(ConfigId::ipv6Address));
    }
}

void writeIPv6PrefixLength(Change& change) {
    setIPv6PrefixLength(change.name, change.number(), change.mac);
}

void writeOrigin(Change& change) {
    disableNetConfigDNSPolicy(change.value);
    setIPOrigin(change.name, change.value, change.mac);
}

void reenumerate(Change& change) {
    log(kProgress) << "IPConfigNode::CreateUser :setProperty:";
    log(kProgress) << "IPConfigNode::CreateUser :PropertyValue:" << change.number();
    if (change.number() == 1) {
        static_cast<const IPConfigNode&>(change.node).builder()->createNetworkPortNodes(true);
        change.isStored = false;
    }
}

template <bool areServers>
void writeDns(Change& change) {
    const std::vector<std::string> texts = change.texts();
    disablePeerDNS(change.name);
    executeDNSChanges(texts, areServers);
}

void writeHostName(Change& change) {
    const std::string address = change.current(ConfigId::ipv4Address);
    const std::string domain = change.current(ConfigId::domainName);
    log(kProgress) << "HostName :" << change.value;
    executeDomainandHostnameChanges(change.text(), domain, false, address);
}

void writeDomainName(Change& change) {
    const std::string address = change.current(ConfigId::ipv4Address);
    const std::string host = change.current(ConfigId::hostName);
    log(kProgress) << "DomainName :" << change.value;
    executeDomainandHostnameChanges(host, change.text(), true, address);
}

void writeLinkState(Change& change) {
    setInterfaceStatus(change.name, change.number());
}

constexpr bool kNeedsFixedOrigin = true;

constexpr Property kConfigProperties[] = {
    {ConfigId::ipOrigin, originOf, writeOrigin},
    {ConfigId::ipv4Address, ipv4ValueOf<&IPv4::address>, writeIPv4Address, kNeedsFixedOrigin},
    {ConfigId::subnetMask, ipv4ValueOf<&IPv4::mask>, writeSubnetMask, kNeedsFixedOrigin},
    {ConfigId::ipv6Address, ipv6AddressOf, writeIPv6Address, kNeedsFixedOrigin},
    {ConfigId::ipv6AddressType, ipv6TypeOf},
    {ConfigId::protocol, protocolOf},
    {ConfigId::reenumeratePorts, nullptr, reenumerate},
    {ConfigId::dnsServers, dnsServersOf, writeDns<true>},
    {ConfigId::hostName, shortHostNameOf, writeHostName},
    {ConfigId::domainName, domainNameOf, writeDomainName},
    {ConfigId::dnsSuffixes, dnsSuffixesOf, writeDns<false>},
    {ConfigId::ipv4Gateway, ipv4GatewayOf, writeIPv4Gateway, kNeedsFixedOrigin},
    {ConfigId::ipv6Gateway, ipv6GatewayOf, writeIPv6Gateway, kNeedsFixedOrigin},
    {ConfigId::ipv6PrefixLength, prefixLengthOf, writeIPv6PrefixLength, kNeedsFixedOrigin},
    {ConfigId::linkState, configStateOf, writeLinkState},
    {ConfigId::usesDhcp, usesDhcp},
};
static_assert(idsAscend(kConfigProperties));

/// Acts on the host; what goes wrong is logged and changes nothing of the agent's answer.
void act(unsigned int id, bool originIsFixed, Change& change) {
    const Property* row = ipConfigClass.find(id);
    if (row == nullptr || row->write == nullptr || (row->needsFixedOrigin && !originIsFixed)) {
        return;
    }
    try {
        row->write(change);
    } catch (const std::exception& failure) {
        log(kError) << "IPConfigNode::setProperty: property " << id << ": " << failure.what();
    }
}

// What is stored when the node is made.

void fillNames(IPConfigNode& node) {
    node.setProperty(ConfigId::interfaceName, {node.name(), true});
    node.setProperty(ConfigId::interfaceLabel, {node.name(), true});
}

void fillLink(IPConfigNode& node) {
    // The listing that the walk has to hand decides; a later read asks for the link itself.
    const PropertyValue state = stateValue(isInterfaceUP(node.name()));
    node.setStatus(static_cast<unsigned int>(state));
    node.setProperty(ConfigId::linkState, state);
    node.setProperty(ConfigId::linkStatesSupported,
                     {std::vector<Number>{0U, LinkState::up, LinkState::down}, true});
    fillNames(node);
}

/// What an interface without an address shows until it is asked: the protocols are not known yet.
std::string orZeros(const std::string& address) {
    return address.empty() ? "0.0.0.0" : address;
}

void fillIPv4(IPConfigNode& node, Settings& settings) {
    const IPv4 ip = ipv4Of(node.name());
    node.setProperty(ConfigId::ipv4Address, {orZeros(ip.address), true});
    node.setProperty(ConfigId::subnetMask, {orZeros(ip.mask), true});
    settings.emplace("IPv4ADDR", orZeros(ip.address));
    settings.emplace("NETMASK", orZeros(ip.mask));
}

void fillIPv6(IPConfigNode& node, Settings& settings) {
    node.setProperty(ConfigId::protocol, protocolOf(node.name()));
    const IPv6 ip = ipv6Of(node.name());
    node.setProperty(ConfigId::ipv6PrefixLength, {Number(ip.prefixLength), true});
    node.setProperty(ConfigId::ipv6Address, {ip.address, true});
    node.setProperty(ConfigId::ipv6InterfaceId, {ipv6InterfaceIdOf(ip.address), true});
    const PropertyValue type = ipv6TypeOf(node.name());
    // What is not told is stored all the same: the agent lists the properties that are stored.
    node.setProperty(ConfigId::ipv6AddressType, type.empty() ? PropertyValue(EnumValue(0), true) : type);
    settings.emplace("IPV6ADDR", ip.address);
    settings.emplace("PREFIX", signedDecimal(ip.prefixLength));
}

void fillHost(IPConfigNode& node, const HostFacts& host) {
    node.setProperty(ConfigId::hostName, {host.hostName, true});
    node.setProperty(ConfigId::domainName, {host.domainName, true});
    node.setProperty(ConfigId::dnsServers, {host.dnsServers, true});
    node.setProperty(ConfigId::dnsSuffixes, {host.dnsSuffixes, true});
}

void fillOrigin(IPConfigNode& node, Settings& settings) {
    const std::string keyword = bootProtoOf(node.name());
    node.setProperty(ConfigId::ipOrigin, originValue(keyword));
    const bool hasLease = checkIsDhcp(node.name());
    node.setProperty(ConfigId::addressOrigin, {EnumValue(hasLease ? IPOrigin::dhcp : IPOrigin::fixed), true});
    node.setProperty(ConfigId::originsSupported,
                     {std::vector<Number>{IPOrigin::dhcp, IPOrigin::fixed}, true});
    node.setProperty(ConfigId::usesDhcp, {Number(hasLease), true});
    node.setProperty(ConfigId::dhcpServers, {dhcpServersOf(node.name()), true});
    settings.emplace("BOOTPROTO", keyword);
}

void fillGateways(IPConfigNode& node, Settings& settings) {
    const PropertyValue ipv4 = ipv4GatewayOf(node.name());
    const PropertyValue ipv6 = ipv6GatewayOf(node.name());
    node.setProperty(ConfigId::ipv4Gateway, ipv4);
    node.setProperty(ConfigId::ipv6Gateway, ipv6);
    settings.emplace("GATEWAY", static_cast<std::string>(ipv4));
    settings.emplace("IPV6GATEWAY", static_cast<std::string>(ipv6));
}

}  // namespace

constinit const NodeClass ipConfigClass{"~IPConfigNode", kConfigProperties};

Error IPConfigNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope = enter();
    // The origin that counts is the one before this call: to make an address fixed and to set it are two
    // calls.
    PropertyValue origin;
    getProperty(ConfigId::ipOrigin, origin);
    log(kProgress) << "IPConfigNode::setProperty : IPOrigin Value :" << origin;
    Change change{*this, name(), value};
    getHardwareAddress(name(), change.mac);
    if (OSHWMI::bInitflag && builder() != nullptr) {
        act(id, originCode(origin) == IPOrigin::fixed, change);
    }
    if (change.isStored) {
        store(id, value);
    }
    return {};
}

void IPConfigNode::fill(const HostFacts& host, Settings& settings) {
    fillLink(*this);
    fillIPv4(*this, settings);
    fillIPv6(*this, settings);
    fillHost(*this, host);
    fillOrigin(*this, settings);
    fillGateways(*this, settings);
}

void IPConfigNode::fill(const CIPInfo& address) {
    fillNames(*this);
    if (address.ipv6) {
        setProperty(ConfigId::ipv6Address, {address.address, true});
        setProperty(ConfigId::ipv6PrefixLength, {Number(address.prefixLength), true});
    } else {
        setProperty(ConfigId::ipv4Address, {address.address, true});
        setProperty(ConfigId::subnetMask, {address.mask, true});
    }
}

}  // namespace IC
