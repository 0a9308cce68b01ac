#include "agent/change/kernel_network.h"

#include <linux/if_addr.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <string_view>

#include "hosttools/netlink.h"

namespace cvagent::change {

namespace {

using hosttools::bytesOf;
using hosttools::makeAttribute;
using hosttools::makeRequest;
using hosttools::readPlain;

constexpr int kReads = 5;  // of what changes meanwhile

std::optional<Ip> ipOf(std::string_view data, bool isIpv6) {
    Ip ip{isIpv6, {}};
    if (data.size() != ip.bits() / 8) {
        return std::nullopt;
    }
    std::ranges::copy(data, ip.bytes.begin());
    return ip;
}

std::string bytesOfIp(const Ip& ip) {
    return {ip.bytes.begin(), ip.bytes.begin() + ip.bits() / 8};
}

unsigned numberIn(std::string_view data) {
    return readPlain<std::uint32_t>(data).value_or(0);
}

/// A text without the zero at its end.
std::string nameIn(std::string_view data) {
    return std::string(data.substr(0, data.find('\0')));
}

void takeLink(KernelNetwork& network, std::string_view message) {
    const auto head = readPlain<ifinfomsg>(message);
    if (!head) {
        return;
    }
    KernelLink link{static_cast<unsigned>(head->ifi_index), "", (head->ifi_flags & IFF_UP) != 0,
                    (head->ifi_flags & IFF_RUNNING) != 0};
    const auto attributes = message.substr(NLMSG_ALIGN(sizeof(ifinfomsg)));
    hosttools::eachAttribute(attributes, [&link](unsigned type, std::string_view data) {
        if (type == IFLA_IFNAME) {
            link.name = nameIn(data);
        }
    });
    network.links.push_back(std::move(link));
}

void takeAddressAttribute(KernelAddress& address, bool isIpv6, unsigned type, std::string_view data) {
    if (type == IFA_LOCAL || (type == IFA_ADDRESS && isIpv6)) {
        address.ip = ipOf(data, isIpv6).value_or(address.ip);
    } else if (type == IFA_LABEL) {
        address.label = nameIn(data);
    } else if (type == IFA_FLAGS) {
        const unsigned flags = numberIn(data);
        address.isPermanent = (flags & IFA_F_PERMANENT) != 0;
        address.hasSubnetRoute = (flags & IFA_F_NOPREFIXROUTE) == 0;
        address.duplicate = (flags & IFA_F_DADFAILED) != 0   ? Duplicate::yes
                            : (flags & IFA_F_TENTATIVE) != 0 ? Duplicate::beingAsked
                                                             : Duplicate::no;
    } else if (type == IFA_PROTO) {
        address.protocol = data.empty() ? 0 : static_cast<unsigned char>(data.front());
    }
}

void takeAddress(KernelNetwork& network, std::string_view message) {
    const auto head = readPlain<ifaddrmsg>(message);
    if (!head || (head->ifa_family != AF_INET && head->ifa_family != AF_INET6)) {
        return;
    }
    const bool isIpv6 = head->ifa_family == AF_INET6;
    KernelAddress address;
    address.link = head->ifa_index;
    address.ip.isIpv6 = isIpv6;
    address.prefix = head->ifa_prefixlen;
    address.isGlobal = head->ifa_scope == RT_SCOPE_UNIVERSE;
    address.message = message;
    hosttools::eachAttribute(
        message.substr(NLMSG_ALIGN(sizeof(ifaddrmsg))),
        [&](unsigned type, std::string_view data) { takeAddressAttribute(address, isIpv6, type, data); });
    network.addresses.push_back(std::move(address));
}

void takeRouteAttribute(KernelRoute& route, bool isIpv6, unsigned type, std::string_view data) {
    switch (type) {
        case RTA_DST:
            route.destination = ipOf(data, isIpv6).value_or(route.destination);
            break;
        case RTA_GATEWAY:
            route.gateway = ipOf(data, isIpv6);
            break;
        case RTA_PREFSRC:
            route.source = ipOf(data, isIpv6);
            break;
        case RTA_OIF:
            route.link = numberIn(data);
            break;
        case RTA_PRIORITY:
            route.metric = numberIn(data);
            break;
        case RTA_TABLE:
            route.table = numberIn(data);
            break;
        default:
            break;
    }
}

void takeRoute(KernelNetwork& network, std::string_view message) {
    const auto head = readPlain<rtmsg>(message);
    if (!head || (head->rtm_family != AF_INET && head->rtm_family != AF_INET6) ||
        (head->rtm_flags & RTM_F_CLONED) != 0) {
        return;
    }
    const bool isIpv6 = head->rtm_family == AF_INET6;
    KernelRoute route;
    route.destination.isIpv6 = isIpv6;
    route.prefix = head->rtm_dst_len;
    route.table = head->rtm_table;
    route.protocol = head->rtm_protocol;
    route.type = head->rtm_type;
    route.message = message;
    hosttools::eachAttribute(
        message.substr(NLMSG_ALIGN(sizeof(rtmsg))),
        [&](unsigned type, std::string_view data) { takeRouteAttribute(route, isIpv6, type, data); });
    network.routes.push_back(std::move(route));
}

KernelNetwork readOnce() {
    KernelNetwork network;
    hosttools::NetlinkSocket socket(NETLINK_ROUTE);
    const auto dump = [&](unsigned question, std::string_view body, unsigned answer, const auto& take) {
        const int problem =
            socket.ask(makeRequest(question, NLM_F_DUMP, body), [&](unsigned type, std::string_view message) {
                if (type == answer) {
                    take(network, message);
                }
            });
        network.problem = network.problem == 0 ? problem : network.problem;
    };
    dump(RTM_GETLINK, bytesOf(ifinfomsg{}), RTM_NEWLINK, takeLink);
    dump(RTM_GETADDR, bytesOf(ifaddrmsg{}), RTM_NEWADDR, takeAddress);
    for (const int family : {AF_INET, AF_INET6}) {
        rtmsg which{};
        which.rtm_family = static_cast<unsigned char>(family);
        dump(RTM_GETROUTE, bytesOf(which), RTM_NEWROUTE, takeRoute);
    }
    return network;
}

int tell(unsigned type, unsigned flags, std::string_view body, std::string_view attributes = {}) {
    hosttools::NetlinkSocket socket(NETLINK_ROUTE);
    return socket.ask(makeRequest(type, flags | NLM_F_ACK, body, attributes), [](auto, auto) {});
}

/// What a route was told with that it cannot be asked for with.
bool isTold(unsigned attribute) {
    return attribute == RTA_CACHEINFO || attribute == RTA_PREFSRC;
}

}  // namespace

KernelNetwork KernelNetwork::read() {
    KernelNetwork network;
    for (int attempt = 0; attempt < kReads; ++attempt) {
        network = readOnce();
        if (network.problem != EINTR) {
            break;
        }
    }
    return network;
}

const KernelLink* KernelNetwork::link(const std::string& name) const {
    const auto found = std::ranges::find(links, name, &KernelLink::name);
    return found == links.end() ? nullptr : &*found;
}

std::string KernelNetwork::nameOf(unsigned link) const {
    const auto found = std::ranges::find(links, link, &KernelLink::index);
    return found == links.end() ? "" : found->name;
}

const KernelAddress* KernelNetwork::mainAddress(unsigned link, bool isIpv6) const {
    const std::string name = nameOf(link);
    const auto found = std::ranges::find_if(addresses, [&](const KernelAddress& address) {
        const bool isInUse = address.isGlobal && address.isPermanent && address.duplicate != Duplicate::yes;
        const bool isKnownBy = isIpv6 ? isInUse : address.label == name;
        return address.link == link && address.ip.isIpv6 == isIpv6 && isKnownBy;
    });
    return found == addresses.end() ? nullptr : &*found;
}

const KernelAddress* KernelNetwork::find(unsigned link, const Ip& ip, unsigned prefix) const {
    const auto found = std::ranges::find_if(addresses, [&](const KernelAddress& address) {
        return address.link == link && address.ip == ip && address.prefix == prefix;
    });
    return found == addresses.end() ? nullptr : &*found;
}

Duplicate duplicateOf(const std::string& link, const Ip& ip) {
    ifaddrmsg asked{};
    asked.ifa_family = AF_INET6;
    KernelNetwork network;
    hosttools::NetlinkSocket socket(NETLINK_ROUTE);
    const int problem = socket.ask(
        makeRequest(RTM_GETADDR, NLM_F_DUMP, bytesOf(asked)),
        [&network](unsigned /*type*/, std::string_view message) { takeAddress(network, message); });
    const unsigned index = problem == 0 || problem == EINTR ? if_nametoindex(link.c_str()) : 0;
    Duplicate found = Duplicate::no;
    for (const KernelAddress& each : network.addresses) {
        found = each.link == index && each.ip == ip ? each.duplicate : found;
    }
    return found;
}

bool KernelNetwork::has(const KernelRoute& route) const {
    return std::ranges::any_of(routes, [&route](const KernelRoute& each) {
        return each.destination == route.destination && each.prefix == route.prefix &&
               each.gateway == route.gateway && each.link == route.link && each.metric == route.metric &&
               each.table == route.table && each.type == route.type;
    });
}

std::string textOf(const KernelRoute& route, const KernelNetwork& network) {
    const std::string target =
        route.isDefault() ? "default" : route.destination.text() + "/" + std::to_string(route.prefix);
    const std::string link = network.nameOf(route.link);
    return target + (route.gateway ? " via " + route.gateway->text() : "") +
           (link.empty() ? "" : " dev " + link);
}

int addAddress(const KernelLink& link, const Ip& ip, unsigned prefix) {
    ifaddrmsg head{};
    head.ifa_family = ip.isIpv6 ? AF_INET6 : AF_INET;
    head.ifa_prefixlen = static_cast<unsigned char>(prefix);
    head.ifa_index = link.index;
    std::string attributes =
        makeAttribute(IFA_LOCAL, bytesOfIp(ip)) + makeAttribute(IFA_ADDRESS, bytesOfIp(ip));
    if (!ip.isIpv6) {
        attributes += makeAttribute(IFA_LABEL, link.name + '\0');
        constexpr unsigned kWithBroadcast = 30;
        if (prefix <= kWithBroadcast) {
            attributes += makeAttribute(IFA_BROADCAST, bytesOfIp(ip.last(prefix)));
        }
    }
    return tell(RTM_NEWADDR, NLM_F_CREATE | NLM_F_REPLACE, bytesOf(head), attributes);
}

int addAgain(const KernelAddress& address) {
    return tell(RTM_NEWADDR, NLM_F_CREATE, address.message);
}

int remove(const KernelAddress& address) {
    return tell(RTM_DELADDR, 0, address.message);
}

int addAgain(const KernelRoute& route, const std::optional<Ip>& source) {
    auto head = readPlain<rtmsg>(route.message);
    if (!head) {
        return EPROTO;
    }
    head->rtm_flags &= RTNH_F_ONLINK;  // the others are states
    std::string attributes;
    hosttools::eachAttribute(std::string_view(route.message).substr(NLMSG_ALIGN(sizeof(rtmsg))),
                             [&attributes](unsigned type, std::string_view data) {
                                 attributes += isTold(type) ? "" : makeAttribute(type, data);
                             });
    const auto preferred = source ? source : route.source;
    attributes += preferred ? makeAttribute(RTA_PREFSRC, bytesOfIp(*preferred)) : "";
    return tell(RTM_NEWROUTE, NLM_F_CREATE | NLM_F_APPEND, bytesOf(*head), attributes);
}

int setDefaultRoute(const Ip& gateway, unsigned link, unsigned metric) {
    rtmsg head{};
    head.rtm_family = gateway.isIpv6 ? AF_INET6 : AF_INET;
    head.rtm_table = RT_TABLE_MAIN;
    head.rtm_protocol = RTPROT_STATIC;
    head.rtm_scope = RT_SCOPE_UNIVERSE;
    head.rtm_type = RTN_UNICAST;
    std::string attributes =
        makeAttribute(RTA_GATEWAY, bytesOfIp(gateway)) + makeAttribute(RTA_OIF, bytesOf(std::uint32_t{link}));
    if (metric != 0) {
        attributes += makeAttribute(RTA_PRIORITY, bytesOf(std::uint32_t{metric}));
    }
    return tell(RTM_NEWROUTE, NLM_F_CREATE | NLM_F_REPLACE, bytesOf(head), attributes);
}

}  // namespace cvagent::change
