#include "agent/change/network_builder.h"

#include <linux/fib_rules.h>
#include <linux/if_addr.h>
#include <linux/if_link.h>
#include <linux/netlink.h>
#include <linux/nexthop.h>
#include <linux/rtnetlink.h>
#include <linux/veth.h>
#include <net/if.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>
#include <string>
#include <vector>

namespace cvagent::change {

namespace {

using hosttools::bytesOf;
using hosttools::makeAttribute;
using hosttools::makeRequest;
using hosttools::NetlinkSocket;
using hosttools::readPlain;

constexpr unsigned kNew = NLM_F_CREATE | NLM_F_EXCL | NLM_F_ACK;
constexpr std::size_t kMostRoutes = 10'000;  // a router's table would take seconds

bool isThere(int error) {
    return error == 0 || error == EEXIST;
}

int tell(NetlinkSocket& socket, const std::string& request) {
    return socket.ask(request, [](unsigned, std::string_view) {});
}

/// Sends what depends on each other, again and again while that helps.
void tellAll(NetlinkSocket& socket, std::vector<std::string> requests) {
    for (std::size_t left = requests.size() + 1; !requests.empty() && requests.size() < left;) {
        left = requests.size();
        std::erase_if(requests,
                      [&socket](const std::string& request) { return isThere(tell(socket, request)); });
    }
}

template <class Plain>
std::string attribute(unsigned type, const Plain& value) {
    return makeAttribute(type, bytesOf(value));
}

std::string nested(unsigned type, std::string_view attributes) {
    return makeAttribute(type | NLA_F_NESTED, attributes);
}

/// A link of the network that is to be copied.
class Model {
public:
    explicit Model(const NetworkMessage& message)
        : fixed_(readPlain<ifinfomsg>(message.body).value_or(ifinfomsg{})), body_(message.body) {}

    int index() const { return fixed_.ifi_index; }
    bool isUp() const { return (fixed_.ifi_flags & IFF_UP) != 0; }
    bool isLoopback() const { return (fixed_.ifi_flags & IFF_LOOPBACK) != 0; }
    std::string_view part(unsigned type) const {
        return attributeOf(body_, NLMSG_ALIGN(sizeof(ifinfomsg)), type);
    }
    std::string kind() const {
        const std::string_view kind = attributeOf(part(IFLA_LINKINFO), 0, IFLA_INFO_KIND);
        return std::string(kind.substr(0, kind.find('\0')));
    }
    std::string_view kindData() const { return attributeOf(part(IFLA_LINKINFO), 0, IFLA_INFO_DATA); }

    /// What every link has, be it of another kind.
    std::string common() const {
        std::string all;
        for (const unsigned type : {IFLA_IFNAME, IFLA_MTU, IFLA_ADDRESS, IFLA_TXQLEN, IFLA_IFALIAS}) {
            if (!part(type).empty()) {
                all += makeAttribute(type, part(type));
            }
        }
        return all;
    }

private:
    ifinfomsg fixed_;
    std::string_view body_;
};

std::string linkInfo(const std::string& kind, std::string_view data) {
    std::string info = makeAttribute(IFLA_INFO_KIND, kind + '\0');
    info += data.empty() ? "" : nested(IFLA_INFO_DATA, data);
    return nested(IFLA_LINKINFO, info);
}

/// Of a bond what can be set while it has no members.
std::string bondData(std::string_view data) {
    return attributesOf(data, 0, [](unsigned type, const std::string&) {
        return type == IFLA_BOND_MODE || type == IFLA_BOND_MIIMON;
    });
}

std::string requestFor(const Model& link, const std::string& more) {
    ifinfomsg wanted{};
    wanted.ifi_index = link.index();
    return makeRequest(RTM_NEWLINK, kNew, bytesOf(wanted), link.common() + more);
}

/// @return whether one of the link's own kind could be made
bool makeAlike(NetlinkSocket& socket, const Model& link) {
    const std::string kind = link.kind();
    std::string more;
    if (kind == "vlan") {
        more = makeAttribute(IFLA_LINK, link.part(IFLA_LINK)) + linkInfo(kind, link.kindData());
    } else if (kind == "bond") {
        more = linkInfo(kind, bondData(link.kindData()));
    } else if (kind == "bridge" || kind == "dummy") {
        more = linkInfo(kind, {});
    } else {
        return false;
    }
    return isThere(tell(socket, requestFor(link, more)));
}

/// The other end of a cable, in another network. Its driver makes no links by itself when the kernel has to
/// load it, as that of dummies would in the host's network.
std::string cable(int peers) {
    return linkInfo("veth", makeAttribute(VETH_INFO_PEER, std::string(bytesOf(ifinfomsg{})) +
                                                              attribute(IFLA_NET_NS_FD, peers)));
}

void makeSubstitute(NetlinkSocket& socket, const Model& link, int peers) {
    if (!isThere(tell(socket, requestFor(link, cable(peers))))) {
        tell(socket, requestFor(link, linkInfo("bridge", {})));
    }
}

/// One VLAN may lie on another one.
void makeLinks(NetlinkSocket& socket, const std::vector<Model>& links, int peers) {
    std::vector<const Model*> later;
    for (const Model& link : links) {
        if (!link.isLoopback() && link.kind() == "vlan") {
            later.push_back(&link);
        } else if (!link.isLoopback() && !makeAlike(socket, link)) {
            makeSubstitute(socket, link, peers);
        }
    }
    for (std::size_t left = later.size() + 1; !later.empty() && later.size() < left;) {
        left = later.size();
        std::erase_if(later, [&socket](const Model* link) { return makeAlike(socket, *link); });
    }
    for (const Model* link : later) {
        makeSubstitute(socket, *link, peers);
    }
}

int set(NetlinkSocket& socket, const Model& link, const std::string& attributes, bool up = false) {
    ifinfomsg wanted{};
    wanted.ifi_index = link.index();
    wanted.ifi_change = up ? IFF_UP : 0;
    wanted.ifi_flags = up ? IFF_UP : 0;
    return tell(socket, makeRequest(RTM_NEWLINK, NLM_F_ACK, bytesOf(wanted), attributes));
}

void setOwnAddresses(NetlinkSocket& socket, const Model& link, std::uint8_t mode) {
    set(socket, link, nested(IFLA_AF_SPEC, nested(AF_INET6, attribute(IFLA_INET6_ADDR_GEN_MODE, mode))));
}

/// The addresses that the kernel would make by itself come from the copied network; only what is raised later
/// gets its own again.
void makeNoAddresses(NetlinkSocket& socket, const Model& link) {
    setOwnAddresses(socket, link, IN6_ADDR_GEN_MODE_NONE);
}
void makeAddressesLater(NetlinkSocket& socket, const Model& link) {
    const std::string_view ofIpv6 = attributeOf(link.part(IFLA_AF_SPEC), 0, AF_INET6);
    const std::string_view mode = attributeOf(ofIpv6, 0, IFLA_INET6_ADDR_GEN_MODE);
    setOwnAddresses(socket, link, readPlain<std::uint8_t>(mode).value_or(IN6_ADDR_GEN_MODE_EUI64));
}

void joinAndRaise(NetlinkSocket& socket, const std::vector<Model>& links) {
    for (const Model& link : links) {
        makeNoAddresses(socket, link);
        if (!link.part(IFLA_MASTER).empty()) {
            set(socket, link, makeAttribute(IFLA_MASTER, link.part(IFLA_MASTER)));
        }
    }
    for (const Model& link : links) {
        if (!link.isLoopback()) {  // a bond has taken its first member's
            set(socket, link, makeAttribute(IFLA_ADDRESS, link.part(IFLA_ADDRESS)));
        }
        if (link.isUp()) {
            set(socket, link, "", true);
        }
    }
}

/// A link whose other end is up is in use as soon as it is raised itself.
void raiseAll(NetlinkSocket& socket) {
    for (const NetworkMessage& message : readNetwork(socket).links) {
        const Model link(message);
        makeNoAddresses(socket, link);
        set(socket, link, "", true);
    }
}

/// @param flags on top of those that the address has
std::string addressRequest(const NetworkMessage& message, unsigned how, unsigned more) {
    constexpr std::size_t kFixed = NLMSG_ALIGN(sizeof(ifaddrmsg));
    constexpr unsigned kKeptFlags =
        IFA_F_NOPREFIXROUTE | IFA_F_HOMEADDRESS | IFA_F_NODAD | IFA_F_MANAGETEMPADDR;
    auto fixed = readPlain<ifaddrmsg>(message.body).value_or(ifaddrmsg{});
    unsigned flags = fixed.ifa_flags;
    const std::string attributes =
        attributesOf(message.body, kFixed, [&flags](unsigned type, const std::string& data) {
            if (type == IFA_FLAGS) {
                flags = readPlain<std::uint32_t>(data).value_or(0);
            }
            static const std::set<unsigned> kTaken{IFA_ADDRESS, IFA_LOCAL,     IFA_BROADCAST,
                                                   IFA_LABEL,   IFA_CACHEINFO, IFA_RT_PRIORITY};
            return kTaken.contains(type);
        });
    flags = (flags & kKeptFlags) | more;
    fixed.ifa_flags = static_cast<std::uint8_t>(flags);
    return makeRequest(RTM_NEWADDR, how, bytesOf(fixed), attributes + attribute(IFA_FLAGS, flags));
}

template <class Request>
std::vector<std::string> requests(const std::vector<NetworkMessage>& messages, Request make) {
    std::vector<std::string> all;
    all.reserve(messages.size());
    for (const NetworkMessage& message : messages) {
        all.push_back(make(message));
    }
    return all;
}

/// An IPv6 address is there at once when nobody is asked whether he has it; afterwards it is one like any
/// other.
void copyAddresses(NetlinkSocket& socket, const std::vector<NetworkMessage>& addresses) {
    tellAll(socket, requests(addresses, [](const NetworkMessage& message) {
                return addressRequest(message, kNew, IFA_F_NODAD);
            }));
    for (const NetworkMessage& message : addresses) {
        const auto fixed = readPlain<ifaddrmsg>(message.body).value_or(ifaddrmsg{});
        if (fixed.ifa_family == AF_INET6 && fixed.ifa_scope != RT_SCOPE_HOST) {
            tell(socket, addressRequest(message, NLM_F_REPLACE | NLM_F_ACK, 0));
        }
    }
}

/// What the kernel tells of a way's state cannot be asked for.
void forgetStates(std::string& ways) {
    for (std::size_t at = 0; at + sizeof(rtnexthop) <= ways.size();) {
        rtnexthop way{};
        std::memcpy(&way, ways.data() + at, sizeof way);
        way.rtnh_flags &= RTNH_F_ONLINK;
        std::memcpy(ways.data() + at, &way, sizeof way);
        if (way.rtnh_len < sizeof way) {
            return;
        }
        at += RTNH_ALIGN(way.rtnh_len);
    }
}

std::string routeRequest(const NetworkMessage& message) {
    constexpr std::size_t kFixed = NLMSG_ALIGN(sizeof(rtmsg));
    auto fixed = readPlain<rtmsg>(message.body).value_or(rtmsg{});
    fixed.rtm_flags &= RTNH_F_ONLINK;
    const bool byNumber = !attributeOf(message.body, kFixed, RTA_NH_ID).empty();
    const std::string attributes =
        attributesOf(message.body, kFixed, [byNumber](unsigned type, std::string& data) {
            if (type == RTA_MULTIPATH) {
                forgetStates(data);
            }
            static const std::set<unsigned> kStates{RTA_CACHEINFO, RTA_UID, RTA_EXPIRES, RTA_MARK};
            static const std::set<unsigned> kWays{RTA_OIF, RTA_GATEWAY, RTA_MULTIPATH, RTA_VIA};
            return !kStates.contains(type) && !(byNumber && kWays.contains(type));
        });
    // One IPv6 route more to the same place is another way of it.
    const unsigned how = fixed.rtm_family == AF_INET6 ? NLM_F_CREATE | NLM_F_ACK | NLM_F_EXCL : kNew;
    return makeRequest(RTM_NEWROUTE, how, bytesOf(fixed), attributes);
}

std::string nextHopRequest(const NetworkMessage& message) {
    auto fixed = readPlain<nhmsg>(message.body).value_or(nhmsg{});
    fixed.nh_flags &= RTNH_F_ONLINK;
    return makeRequest(RTM_NEWNEXTHOP, kNew, bytesOf(fixed),
                       attributesOf(message.body, NLMSG_ALIGN(sizeof(nhmsg)),
                                    [](unsigned, const std::string&) { return true; }));
}

/// The rules that every new network has are taken away where the other one has not.
void copyRules(NetlinkSocket& socket, const std::vector<NetworkMessage>& wanted) {
    std::set<std::string> missing;
    for (const NetworkMessage& rule : wanted) {
        missing.insert(rule.body);
    }
    for (const NetworkMessage& rule : readNetwork(socket).rules) {
        if (missing.erase(rule.body) == 0) {
            tell(socket, makeRequest(RTM_DELRULE, NLM_F_ACK, rule.body));
        }
    }
    for (const std::string& rule : missing) {
        tell(socket, makeRequest(RTM_NEWRULE, kNew, rule));
    }
}

}  // namespace

void buildNetwork(const NetworkMessages& like, const Peers& peers) {
    NetlinkSocket socket(NETLINK_ROUTE);
    std::vector<Model> links;
    for (const NetworkMessage& message : like.links) {
        links.emplace_back(message);
    }
    makeLinks(socket, links, peers.network);
    raiseAll(peers.socket);
    joinAndRaise(socket, links);
    copyAddresses(socket, like.addresses);
    for (const Model& link : links) {
        makeAddressesLater(socket, link);
    }
    tellAll(socket, requests(like.nextHops, nextHopRequest));
    auto routes = requests(like.routes, routeRequest);
    routes.resize(std::min(routes.size(), kMostRoutes));
    tellAll(socket, std::move(routes));
    copyRules(socket, like.rules);
}

}  // namespace cvagent::change
