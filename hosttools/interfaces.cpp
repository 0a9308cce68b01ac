#include "hosttools/interfaces.h"

#include <linux/if_addr.h>
#include <linux/if_link.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <algorithm>
#include <cerrno>
#include <map>

#include "hosttools/addresses.h"
#include "hosttools/files.h"
#include "hosttools/netlink.h"

namespace hosttools {
namespace {

// A listing that changes faster than it can be read is shown as it was read last.
constexpr int mostAttempts = 4;

std::string_view untilZero(std::string_view bytes) {
    return bytes.substr(0, bytes.find('\0'));
}

void setCounters(const rtnl_link_stats64& stats, Link& link) {
    link.received.packets = stats.rx_packets;
    link.received.bytes = stats.rx_bytes;
    link.received.errors = stats.rx_errors;
    link.received.dropped = stats.rx_dropped + stats.rx_missed_errors;
    link.received.overruns = stats.rx_fifo_errors;
    link.received.framing =
        stats.rx_length_errors + stats.rx_over_errors + stats.rx_crc_errors + stats.rx_frame_errors;
    link.received.compressed = stats.rx_compressed;
    link.sent.packets = stats.tx_packets;
    link.sent.bytes = stats.tx_bytes;
    link.sent.errors = stats.tx_errors;
    link.sent.dropped = stats.tx_dropped;
    link.sent.overruns = stats.tx_fifo_errors;
    link.sent.framing = stats.tx_carrier_errors + stats.tx_aborted_errors + stats.tx_window_errors +
                        stats.tx_heartbeat_errors;
    link.sent.compressed = stats.tx_compressed;
    link.collisions = stats.collisions;
}

/// The classic call has narrower fields than netlink; what does not fit is cut off there, so it is here.
void setCard(const rtnl_link_ifmap& map, CardMap& card) {
    card.memoryStart = map.mem_start;
    card.memoryEnd = map.mem_end;
    card.baseAddress = static_cast<std::uint16_t>(map.base_addr);
    card.interrupt = static_cast<std::uint8_t>(map.irq);
    card.dma = map.dma;
}

void setKinds(std::string_view attributes, Link& link) {
    eachAttribute(attributes, [&](unsigned type, std::string_view data) {
        if (type == IFLA_INFO_KIND) link.kind = untilZero(data);
        if (type == IFLA_INFO_SLAVE_KIND) link.memberOf = untilZero(data);
    });
}

void setLinkAttribute(unsigned type, std::string_view data, Link& link) {
    switch (type) {
        case IFLA_IFNAME:
            link.name = untilZero(data);
            break;
        case IFLA_ADDRESS:
            link.hardware = readPadded<decltype(link.hardware)>(data);
            break;
        case IFLA_MTU:
            link.mtu = readPadded<std::uint32_t>(data);
            break;
        case IFLA_TXQLEN:
            link.queueLength = readPadded<std::uint32_t>(data);
            break;
        case IFLA_MAP:
            setCard(readPadded<rtnl_link_ifmap>(data), link.card);
            break;
        case IFLA_LINKINFO:
            setKinds(data, link);
            break;
        case IFLA_STATS64:
            setCounters(readPadded<rtnl_link_stats64>(data), link);
            break;
        default:
            break;
    }
}

void setInetAttribute(unsigned type, std::string_view data, InetAddress& address) {
    switch (type) {
        case IFA_LABEL:
            address.label = untilZero(data);
            break;
        case IFA_LOCAL:
            address.local = readPadded<in_addr>(data);
            break;
        case IFA_ADDRESS:
            address.peer = readPadded<in_addr>(data);
            break;
        case IFA_BROADCAST:
            address.broadcast = readPadded<in_addr>(data);
            break;
        default:
            break;
    }
}

int readLinks(Netlink& netlink, std::string_view only, std::vector<Link>& links) {
    links.clear();
    const auto visit = [&](unsigned type, std::string_view message) {
        if (type == RTM_NEWLINK) links.push_back(parseLink(message));
    };
    return only.empty() ? netlink.links(visit) : netlink.link(only, visit);
}

int readInetAddresses(Netlink& netlink, int link, std::vector<InetAddress>& addresses) {
    addresses.clear();
    return netlink.addresses(link, [&](unsigned type, std::string_view message) {
        if (type == RTM_NEWADDR) addresses.push_back(parseInetAddress(message));
    });
}

bool parseInet6Line(std::string_view line, Inet6Address& address) {
    if (!parsePlainInet6(takeWord(line), address.address)) return false;
    takeWord(line);  // index of the link
    const auto prefix = parseNumber(takeWord(line), 16);
    const auto scope = parseNumber(takeWord(line), 16);
    takeWord(line);  // flags
    address.link = takeWord(line);
    if (!prefix || !scope || address.link.empty()) return false;
    address.prefix = static_cast<unsigned>(*prefix);
    address.scope = static_cast<unsigned>(*scope);
    return true;
}

bool isAlias(std::string_view label) {
    return label.find(':') != std::string_view::npos;
}

/// The stanzas of a listing by name. Built in one walk over each list.
class StanzaList {
public:
    explicit StanzaList(const Interfaces& interfaces) {
        for (const Link& link : interfaces.links) addLink(link);
        for (const InetAddress& address : interfaces.inet) addInet(address);
        for (const Inet6Address& address : interfaces.inet6) addInet6(address);
    }
    std::vector<Stanza> take() {
        std::vector<Stanza> stanzas;
        stanzas.reserve(byName_.size());
        for (auto& [name, stanza] : byName_) stanzas.push_back(std::move(stanza));
        return stanzas;
    }

private:
    void addLink(const Link& link) {
        byName_[link.name] = {link.name, &link};
        byIndex_[link.index] = &link;
    }
    void addInet(const InetAddress& address) {
        const auto link = byIndex_.find(address.link);
        if (link == byIndex_.end()) return;
        if (isAlias(address.label)) {
            byName_.try_emplace(address.label, Stanza{address.label, link->second, nullptr, {}, true});
        }
        const auto stanza = byName_.find(address.label);
        if (stanza != byName_.end() && stanza->second.inet == nullptr) stanza->second.inet = &address;
    }
    void addInet6(const Inet6Address& address) {
        const auto stanza = byName_.find(address.link);
        if (stanza != byName_.end()) stanza->second.inet6.push_back(&address);
    }

    std::map<std::string, Stanza, std::less<>> byName_;
    std::map<int, const Link*> byIndex_;
};

}  // namespace

Link parseLink(std::string_view message) {
    Link link;
    const auto header = readPlain<ifinfomsg>(message);
    if (!header) return link;
    link.index = header->ifi_index;
    link.flags = header->ifi_flags;
    link.type = header->ifi_type;
    eachAttribute(message.substr(sizeof(ifinfomsg)),
                  [&](unsigned type, std::string_view data) { setLinkAttribute(type, data, link); });
    return link;
}

InetAddress parseInetAddress(std::string_view message) {
    InetAddress address;
    const auto header = readPlain<ifaddrmsg>(message);
    if (!header) return address;
    address.link = static_cast<int>(header->ifa_index);
    address.prefix = header->ifa_prefixlen;
    eachAttribute(message.substr(sizeof(ifaddrmsg)),
                  [&](unsigned type, std::string_view data) { setInetAttribute(type, data, address); });
    return address;
}

std::vector<Inet6Address> parseInet6Addresses(std::string_view text) {
    std::vector<Inet6Address> addresses;
    while (!text.empty()) {
        Inet6Address address;
        if (parseInet6Line(takeLine(text), address)) addresses.push_back(std::move(address));
    }
    return addresses;
}

int readInterfaces(std::string_view only, Interfaces& interfaces) {
    Netlink netlink;
    int error = EINTR;
    for (int attempt = 0; attempt < mostAttempts && error == EINTR; ++attempt) {
        error = readLinks(netlink, only, interfaces.links);
        const int link = only.empty() || interfaces.links.empty() ? 0 : interfaces.links.front().index;
        if (error == 0) error = readInetAddresses(netlink, link, interfaces.inet);
    }
    interfaces.inet6 = parseInet6Addresses(readFile("/proc/net/if_inet6").value_or(""));
    return error == EINTR ? 0 : error;
}

std::vector<Stanza> listStanzas(const Interfaces& interfaces) {
    return StanzaList(interfaces).take();
}

std::optional<Stanza> makeStanza(const Interfaces& interfaces, std::string_view name) {
    auto link = std::ranges::find(interfaces.links, name.substr(0, name.find(':')), &Link::name);
    // The only one that was read can have been asked for by another of its names.
    if (interfaces.links.size() == 1) link = interfaces.links.begin();
    if (link == interfaces.links.end()) return std::nullopt;
    Stanza stanza{std::string(name), &*link, nullptr, {}, isAlias(name)};
    const auto inet = std::ranges::find_if(interfaces.inet, [&](const InetAddress& address) {
        return address.link == stanza.link->index && address.label == name;
    });
    if (inet != interfaces.inet.end()) stanza.inet = &*inet;
    for (const Inet6Address& address : interfaces.inet6) {
        if (address.link == name) stanza.inet6.push_back(&address);
    }
    return stanza;
}

}  // namespace hosttools
