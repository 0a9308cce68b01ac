// The write side of an interface's IP configuration: which writer a property goes to.
#include "mi/globals.h"
#include "mi/host_name.h"
#include "mi/log.h"
#include "mi/property_table.h"
#include "network/dns.h"
#include "network/esx.h"
#include "network/ip_config_node.h"
#include "network/ip_origin.h"
#include "network/ipv4_writer.h"
#include "network/ipv6_writer.h"
#include "network/link_queries.h"
#include "network/network_builder.h"

namespace IC {

namespace {

using Config = IPConfigNode;

enum class Then { store, forget };

/// A change that the agent asks for.
struct Change {
    const Config& config;
    const PropertyValue& value;
    const std::string& mac;

    std::string text() const { return static_cast<std::string>(value); }
    unsigned int number() const { return static_cast<unsigned int>(value); }
    std::vector<std::string> texts() const { return static_cast<std::vector<std::string>>(value); }
    const std::string& interface() const { return config.name(); }
    /// What the node says of another property now.
    std::string current(unsigned int id) const {
        PropertyValue now;
        config.getProperty(id, now);
        return static_cast<std::string>(now);
    }
};

Then writeIPv4Address(const Change& change) {
    setIPv4Address(change.interface(), change.text(), change.mac);
    return Then::store;
}

Then writeSubnetMask(const Change& change) {
    setSubnetMask(change.interface(), change.text(), change.mac);
    return Then::store;
}

Then writeIPv6Address(const Change& change) {
    setIPv6Address(change.interface(), change.text(), change.mac);
    // The host's entry in /etc/hosts moves to the new address.
    const std::string host = change.current(Config::hostName);
    executeDomainandHostnameChanges(host, change.current(Config::domainName), false, change.text());
    return Then::store;
}

Then writeIPv4Gateway(const Change& change) {
    log(kProgress) << "Gateway :: " << change.value;
    setIPV4Gateway(change.interface(), change.current(Config::ipv4Address), change.text());
    return Then::store;
}

Then writeIPv6Gateway(const Change& change) {
    if (!change.text().empty()) {
        // The second finds the route that the first has made. Readers of the log expect both.
        setIPv6Gateway(change.interface(), change.text(), "");
        setIPv6Gateway(change.interface(), change.text(), change.current(Config::ipv6Address));
    }
    return Then::store;
}

Then writeIPv6PrefixLength(const Change& change) {
    setIPv6PrefixLength(change.interface(), change.number(), change.mac);
    return Then::store;
}

Then writeOrigin(const Change& change) {
    disableNetConfigDNSPolicy(change.value);
    setIPOrigin(change.interface(), change.value, change.mac);
    return Then::store;
}

Then reenumerate(const Change& change) {
    log(kProgress) << "IPConfigNode::CreateUser :setProperty:";
    log(kProgress) << "IPConfigNode::CreateUser :PropertyValue:" << change.number();
    if (change.number() != 1) {
        return Then::store;
    }
    change.config.builder()->createNetworkPortNodes(true);
    return Then::forget;
}

Then writeDnsServers(const Change& change) {
    const std::vector<std::string> servers = change.texts();
    disablePeerDNS(change.interface());
    executeDNSChanges(servers, true);
    return Then::store;
}

Then writeDnsSuffixes(const Change& change) {
    const std::vector<std::string> suffixes = change.texts();
    disablePeerDNS(change.interface());
    executeDNSChanges(suffixes, false);
    return Then::store;
}

Then writeHostName(const Change& change) {
    const std::string address = change.current(Config::ipv4Address);
    const std::string domain = change.current(Config::domainName);
    log(kProgress) << "HostName :" << change.value;
    executeDomainandHostnameChanges(change.text(), domain, false, address);
    return Then::store;
}

Then writeDomainName(const Change& change) {
    const std::string address = change.current(Config::ipv4Address);
    const std::string host = change.current(Config::hostName);
    log(kProgress) << "DomainName :" << change.value;
    executeDomainandHostnameChanges(host, change.text(), true, address);
    return Then::store;
}

Then writeLinkState(const Change& change) {
    setInterfaceStatus(change.interface(), change.number());
    return Then::store;
}

struct Writer {
    unsigned int id;
    bool needsFixedOrigin;  ///< acts only while the interface has its address from its file
    Then (*write)(const Change& change);
};

constexpr Writer kWriters[] = {
    {Config::ipOrigin, false, writeOrigin},         {Config::ipv4Address, true, writeIPv4Address},
    {Config::subnetMask, true, writeSubnetMask},    {Config::ipv6Address, true, writeIPv6Address},
    {Config::reenumeratePorts, false, reenumerate}, {Config::dnsServers, false, writeDnsServers},
    {Config::hostName, false, writeHostName},       {Config::domainName, false, writeDomainName},
    {Config::dnsSuffixes, false, writeDnsSuffixes}, {Config::ipv4Gateway, true, writeIPv4Gateway},
    {Config::ipv6Gateway, true, writeIPv6Gateway},  {Config::ipv6PrefixLength, true, writeIPv6PrefixLength},
    {Config::linkState, false, writeLinkState},
};
static_assert(idsAscend(kWriters));

/// Acts on the host; what goes wrong is logged and changes nothing of the agent's answer.
Then act(unsigned int id, bool originIsFixed, const Change& change) {
    const Writer* writer = findProperty(kWriters, id);
    if (writer == nullptr || (writer->needsFixedOrigin && !originIsFixed)) {
        return Then::store;
    }
    try {
        return writer->write(change);
    } catch (const std::exception& failure) {
        log(kError) << "IPConfigNode::setProperty: property " << id << ": " << failure.what();
        return Then::store;
    }
}

}  // namespace

Error IPConfigNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("IPConfigNode::setProperty");
    // The origin that counts is the one before this call: to make an address fixed and to set it are two
    // calls.
    PropertyValue origin;
    getProperty(ipOrigin, origin);
    log(kProgress) << "IPConfigNode::setProperty : IPOrigin Value :" << origin;
    std::string mac;
    getHardwareAddress(name_, mac);
    const bool acts = OSHWMI::bInitflag && builder() != nullptr;
    if (!acts || act(id, originCode(origin) == IPOrigin::fixed, {*this, value, mac}) == Then::store) {
        MutableNode::setProperty(id, value);
    }
    return {};
}

}  // namespace IC
