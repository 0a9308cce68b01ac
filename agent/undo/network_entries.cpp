#include "agent/undo/network_entries.h"

#include <arpa/inet.h>
#include <linux/fib_rules.h>
#include <linux/if_addr.h>
#include <linux/neighbour.h>
#include <linux/nexthop.h>
#include <linux/rtnetlink.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <set>

#include "agent/undo/message_parts.h"
#include "agent/undo/network_requests.h"
#include "agent/undo/route_makers.h"

namespace cvagent::undo {

namespace {

using hosttools::bytesOf;
using hosttools::makeAttribute;
using hosttools::makeRequest;
using hosttools::NetlinkSocket;
using hosttools::readPlain;

constexpr unsigned kAdd = NLM_F_CREATE | NLM_F_EXCL | NLM_F_ACK;
constexpr std::uint32_t kForEver = 0xFFFFFFFFU;
// The numbers of IFA_PROTO that the kernel gives to what it makes itself.
constexpr unsigned kLastOfKernel = 3;

int tell(NetlinkSocket& socket, const std::string& request) {
    return socket.ask(request, [](unsigned, std::string_view) {});
}

/// The same request with another type, and nothing but a receipt asked for.
std::string asRemoval(std::string request, unsigned type) {
    auto header = readPlain<nlmsghdr>(request).value_or(nlmsghdr{});
    header.nlmsg_type = static_cast<std::uint16_t>(type);
    header.nlmsg_flags = NLM_F_REQUEST | NLM_F_ACK;
    return request.replace(0, sizeof header, bytesOf(header));
}

std::string bodyOf(const std::string& request) {
    return request.substr(NLMSG_HDRLEN);
}

std::string ipText(int family, std::string_view data) {
    std::array<char, INET6_ADDRSTRLEN> text{};
    const std::size_t size = family == AF_INET ? sizeof(in_addr) : sizeof(in6_addr);
    const bool isOne = data.size() == size;
    return isOne && inet_ntop(family, data.data(), text.data(), text.size()) != nullptr ? text.data() : "?";
}

bool isKnown(const std::vector<unsigned>& links, unsigned link) {
    return link == 0 || std::ranges::find(links, link) != links.end();
}

// Addresses.

std::uint32_t flagsOf(const Parts<ifaddrmsg>& parts) {
    return parts.has(IFA_FLAGS) ? parts.number(IFA_FLAGS) : parts.fixed().ifa_flags;
}

bool comesByItself(const Parts<ifaddrmsg>& parts) {
    const bool isIpv6 = parts.fixed().ifa_family == AF_INET6;
    const auto protocol = readPlain<std::uint8_t>(parts[IFA_PROTO]).value_or(0);
    const bool isNear =
        isIpv6 && parts.fixed().ifa_scope != RT_SCOPE_UNIVERSE && parts.fixed().ifa_scope != RT_SCOPE_SITE;
    const bool isOfKernel = isIpv6 && protocol != 0 && protocol <= kLastOfKernel;
    return isNear || isOfKernel || (isIpv6 && (flagsOf(parts) & IFA_F_TEMPORARY) != 0);
}

std::optional<ifa_cacheinfo> lifetimeOf(const Parts<ifaddrmsg>& parts) {
    const auto lifetime = readPlain<ifa_cacheinfo>(parts[IFA_CACHEINFO]);
    return lifetime && lifetime->ifa_valid != kForEver ? lifetime : std::nullopt;
}

/// What is left of a lifetime says nothing.
std::string sameAddress(const NetworkMessage& message) {
    constexpr std::size_t kFixed = NLMSG_ALIGN(sizeof(ifaddrmsg));
    const std::string body = bodyOf(addressRequest(message, kAdd, 0));
    const bool isForEver = !lifetimeOf(Parts<ifaddrmsg>(message));
    return body.substr(0, kFixed) + (isForEver ? '+' : '-') +
           attributesOf(body, kFixed,
                        [](unsigned type, const std::string&) { return type != IFA_CACHEINFO; });
}

std::string addressText(const NetworkMessage& message, const NetworkMessages& network) {
    const Parts<ifaddrmsg> parts(message);
    const ifaddrmsg fixed = parts.fixed();
    const std::string_view local = parts.has(IFA_LOCAL) ? parts[IFA_LOCAL] : parts[IFA_ADDRESS];
    return "the address " + ipText(fixed.ifa_family, local) + "/" + std::to_string(fixed.ifa_prefixlen) +
           " of " + linkName(network, fixed.ifa_index);
}

std::vector<Entry> addressEntries(const NetworkState& state, const std::vector<unsigned>& links) {
    std::vector<Entry> entries;
    for (const NetworkMessage& message : state.network.addresses) {
        const Parts<ifaddrmsg> parts(message);
        const ifaddrmsg fixed = parts.fixed();
        if (!comesByItself(parts) && isKnown(links, fixed.ifa_index)) {
            entries.push_back({std::to_string(fixed.ifa_family) + " " + std::to_string(fixed.ifa_index),
                               sameAddress(message), addressText(message, {}), message});
        }
    }
    // Of IPv6 the kernel tells the newest one first.
    const auto firstOfIpv6 = std::ranges::find_if(
        entries, [](const Entry& each) { return each.group.starts_with(std::to_string(AF_INET6) + " "); });
    std::reverse(firstOfIpv6, entries.end());
    return entries;
}

/// An IPv6 address is there at once, for routes to count on, when nobody is asked whether he has it.
int addOneAddress(NetlinkSocket& socket, const NetworkMessage& message) {
    if (Parts<ifaddrmsg>(message).fixed().ifa_family == AF_INET) {
        return tell(socket, addressRequest(message, kAdd, 0));
    }
    const int problem = tell(socket, addressRequest(message, kAdd, IFA_F_NODAD));
    return problem != 0 ? problem : tell(socket, addressRequest(message, NLM_F_REPLACE | NLM_F_ACK, 0));
}

int removeOneAddress(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, asRemoval(addressRequest(message, kAdd, 0), RTM_DELADDR));
}

/// One for a time.
bool isLeasedAddress(const NetworkMessage& message, const NetworkMessages& /*network*/) {
    return lifetimeOf(Parts<ifaddrmsg>(message)).has_value();
}

// Next hops.

std::vector<Entry> nextHopEntries(const NetworkState& state, const std::vector<unsigned>& links) {
    std::vector<Entry> entries;
    for (const NetworkMessage& message : state.network.nextHops) {
        const Parts<nhmsg> parts(message);
        if (parts.fixed().nh_protocol != RTPROT_KERNEL && isKnown(links, parts.number(NHA_OIF))) {
            entries.push_back({std::to_string(parts.number(NHA_ID)), bodyOf(nextHopRequest(message, kAdd)),
                               std::to_string(parts.number(NHA_ID)), message, parts.has(NHA_GROUP) ? 1 : 0});
        }
    }
    return entries;
}

int addNextHop(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, nextHopRequest(message, kAdd));
}

/// The kernel takes nothing but the number here.
int removeNextHop(NetlinkSocket& socket, const NetworkMessage& message) {
    const Parts<nhmsg> parts(message);
    nhmsg which{};
    which.nh_family = parts.fixed().nh_family;
    return tell(socket,
                makeRequest(RTM_DELNEXTHOP, NLM_F_ACK, bytesOf(which), makeAttribute(NHA_ID, parts[NHA_ID])));
}

std::string nextHopText(const NetworkMessage& message, const NetworkMessages& /*network*/) {
    return "the next hop " + std::to_string(Parts<nhmsg>(message).number(NHA_ID));
}

// Routes.

unsigned tableOf(const Parts<rtmsg>& parts) {
    return parts.has(RTA_TABLE) ? parts.number(RTA_TABLE) : parts.fixed().rtm_table;
}

std::string destinationOf(const Parts<rtmsg>& parts) {
    const rtmsg fixed = parts.fixed();
    const std::string network =
        ipText(fixed.rtm_family, parts[RTA_DST]) + "/" + std::to_string(fixed.rtm_dst_len);
    return parts.has(RTA_DST) ? network : fixed.rtm_family == AF_INET6 ? "default (IPv6)" : "default";
}

std::vector<Entry> routeEntries(const NetworkState& state, const std::vector<unsigned>& links) {
    std::vector<Entry> entries;
    const auto ofSomebody = subnetsOfSomebody(state.network);
    for (const NetworkMessage& message : state.network.routes) {
        const Parts<rtmsg> parts(message);
        if (isOfOthers(message, ofSomebody) || !isKnown(links, parts.number(RTA_OIF))) {
            continue;
        }
        const bool leadsOn =
            parts.has(RTA_GATEWAY) || parts.has(RTA_VIA) || parts.has(RTA_MULTIPATH) || parts.has(RTA_NH_ID);
        const std::string group = std::to_string(tableOf(parts)) + " " + destinationOf(parts) + " " +
                                  std::to_string(parts.fixed().rtm_tos) + " " +
                                  std::to_string(parts.number(RTA_PRIORITY));
        const std::string same = bodyOf(routeRequest(message, kAdd));
        entries.push_back({group, same, same, message, leadsOn ? 1 : 0});
    }
    return entries;
}

/// The gateway itself, as near by its link.
std::string wayToGateway(const Parts<rtmsg>& route) {
    rtmsg near{};
    near.rtm_family = route.fixed().rtm_family;
    near.rtm_dst_len = static_cast<unsigned char>(8 * route[RTA_GATEWAY].size());
    near.rtm_table = RT_TABLE_MAIN;
    near.rtm_protocol = RTPROT_STATIC;
    near.rtm_scope = RT_SCOPE_LINK;
    near.rtm_type = RTN_UNICAST;
    return makeRequest(RTM_NEWROUTE, kAdd, bytesOf(near),
                       makeAttribute(RTA_DST, route[RTA_GATEWAY]) + makeAttribute(RTA_OIF, route[RTA_OIF]));
}

/// A route whose gateway is nowhere near any more stays in the kernel, but is taken only while it is near.
int addFarRoute(NetlinkSocket& socket, const NetworkMessage& message, int problem) {
    const Parts<rtmsg> parts(message);
    const bool isFar = problem == ENETUNREACH || problem == EHOSTUNREACH;
    if (!isFar || !parts.has(RTA_GATEWAY) || !parts.has(RTA_OIF)) {
        return problem;
    }
    const std::string way = wayToGateway(parts);
    const int added = tell(socket, way);
    if (added != 0 && added != EEXIST) {  // of one who was killed at it
        return problem;
    }
    const int again = tell(socket, routeRequest(message, kAdd));
    tell(socket, asRemoval(way, RTM_DELROUTE));
    return again;
}

/// Several to the same place stand one behind the other.
int addRoute(NetlinkSocket& socket, const NetworkMessage& message) {
    const int problem = addFarRoute(socket, message, tell(socket, routeRequest(message, kAdd)));
    return problem != EEXIST ? problem
                             : tell(socket, routeRequest(message, NLM_F_CREATE | NLM_F_APPEND | NLM_F_ACK));
}

int removeRoute(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, asRemoval(routeRequest(message, kAdd), RTM_DELROUTE));
}

std::string routeText(const NetworkMessage& message, const NetworkMessages& network) {
    const Parts<rtmsg> parts(message);
    const int family = parts.fixed().rtm_family;
    std::string text = "the route " + destinationOf(parts);
    text += parts.has(RTA_GATEWAY) ? " via " + ipText(family, parts[RTA_GATEWAY]) : "";
    text += parts.has(RTA_OIF) ? " dev " + linkName(network, parts.number(RTA_OIF)) : "";
    return tableOf(parts) == RT_TABLE_MAIN ? text : text + " table " + std::to_string(tableOf(parts));
}

/// NetworkManager lays the one to the subnet itself.
bool isLeasedRoute(const NetworkMessage& message, const NetworkMessages& network) {
    return Parts<rtmsg>(message).fixed().rtm_protocol == RTPROT_DHCP ||
           std::ranges::any_of(network.addresses, [&](const NetworkMessage& each) {
               return isLeasedAddress(each, network) && prefers(message, each);
           });
}

// Rules.

std::vector<Entry> ruleEntries(const NetworkState& state, const std::vector<unsigned>& /*links*/) {
    std::vector<Entry> entries;
    for (const NetworkMessage& message : state.network.rules) {
        entries.push_back({message.body, message.body, message.body, message});
    }
    return entries;
}

int addRule(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, makeRequest(RTM_NEWRULE, kAdd, message.body));
}

int removeRule(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, makeRequest(RTM_DELRULE, NLM_F_ACK, message.body));
}

std::string ruleText(const NetworkMessage& message, const NetworkMessages& /*network*/) {
    return "the rule " + std::to_string(Parts<fib_rule_hdr>(message).number(FRA_PRIORITY));
}

// Neighbours.

std::string neighbourRequest(const NetworkMessage& message, unsigned how) {
    constexpr std::size_t kFixed = NLMSG_ALIGN(sizeof(ndmsg));
    return makeRequest(RTM_NEWNEIGH, how, bytesOf(Parts<ndmsg>(message).fixed()),
                       attributesOf(message.body, kFixed, [](unsigned type, const std::string&) {
                           return type == NDA_DST || type == NDA_LLADDR || type == NDA_PROTOCOL;
                       }));
}

std::string neighbourPlace(const Parts<ndmsg>& parts) {
    return ipText(parts.fixed().ndm_family, parts[NDA_DST]);
}

std::vector<Entry> neighbourEntries(const NetworkState& state, const std::vector<unsigned>& links) {
    std::vector<Entry> entries;
    for (const NetworkMessage& message : state.neighbours) {
        const Parts<ndmsg> parts(message);
        const auto link = static_cast<unsigned>(parts.fixed().ndm_ifindex);
        if (isKnown(links, link)) {
            const std::string place = std::to_string(link) + " " + neighbourPlace(parts);
            entries.push_back({place, bodyOf(neighbourRequest(message, kAdd)), place, message});
        }
    }
    return entries;
}

int addNeighbour(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, neighbourRequest(message, NLM_F_CREATE | NLM_F_REPLACE | NLM_F_ACK));
}

int removeNeighbour(NetlinkSocket& socket, const NetworkMessage& message) {
    return tell(socket, asRemoval(neighbourRequest(message, 0), RTM_DELNEIGH));
}

std::string neighbourText(const NetworkMessage& message, const NetworkMessages& network) {
    const Parts<ndmsg> parts(message);
    return "the neighbour " + neighbourPlace(parts) + " of " +
           linkName(network, static_cast<unsigned>(parts.fixed().ndm_ifindex));
}

}  // namespace

const std::vector<EntryKind>& entryKinds() {
    static const std::vector<EntryKind> kKinds{
        {false, addressEntries, addOneAddress, removeOneAddress, addressText, isLeasedAddress},
        {true, nextHopEntries, addNextHop, removeNextHop, nextHopText, nullptr},
        {true, routeEntries, addRoute, removeRoute, routeText, isLeasedRoute},
        {false, ruleEntries, addRule, removeRule, ruleText, nullptr},
        {true, neighbourEntries, addNeighbour, removeNeighbour, neighbourText, nullptr},
    };
    return kKinds;
}

std::vector<std::string> routesOfOthers(const NetworkMessages& network) {
    std::vector<std::string> texts;
    const auto ofSomebody = subnetsOfSomebody(network);
    for (const NetworkMessage& route : network.routes) {
        if (isOfOthers(route, ofSomebody)) {
            texts.push_back(routeText(route, network));
        }
    }
    std::ranges::sort(texts);
    return texts;
}

bool prefers(const NetworkMessage& route, const NetworkMessage& address) {
    const Parts<ifaddrmsg> parts(address);
    const std::string_view source = Parts<rtmsg>(route)[RTA_PREFSRC];
    return !source.empty() && source == (parts.has(IFA_LOCAL) ? parts[IFA_LOCAL] : parts[IFA_ADDRESS]);
}

bool age(NetworkMessage& address, std::uint64_t seconds) {
    const auto lifetime = lifetimeOf(Parts<ifaddrmsg>(address));
    if (!lifetime) {
        return true;
    }
    if (lifetime->ifa_valid <= seconds) {
        return false;
    }
    constexpr std::size_t kFixed = NLMSG_ALIGN(sizeof(ifaddrmsg));
    ifa_cacheinfo left = *lifetime;
    left.ifa_valid -= static_cast<std::uint32_t>(seconds);
    left.ifa_prefered -= static_cast<std::uint32_t>(std::min<std::uint64_t>(left.ifa_prefered, seconds));
    address.body = address.body.substr(0, kFixed) +
                   attributesOf(address.body, kFixed, [&left](unsigned type, std::string& data) {
                       data = type == IFA_CACHEINFO ? std::string(bytesOf(left)) : data;
                       return true;
                   });
    return true;
}

std::string linkName(const NetworkMessages& network, unsigned index) {
    for (const NetworkMessage& link : network.links) {
        const Parts<ifinfomsg> parts(link);
        if (static_cast<unsigned>(parts.fixed().ifi_index) == index) {
            const std::string_view name = parts[IFLA_IFNAME];
            return std::string(name.substr(0, name.find('\0')));
        }
    }
    return "?" + std::to_string(index);
}

}  // namespace cvagent::undo
