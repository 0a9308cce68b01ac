#include "agent/undo/link_restore.h"

#include <linux/if_link.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>

#include <cerrno>
#include <map>

namespace cvagent::undo {

namespace {

using hosttools::bytesOf;
using hosttools::makeAttribute;
using hosttools::makeRequest;
using hosttools::NetlinkSocket;
using hosttools::readPlain;

constexpr unsigned kFlags = IFF_UP | IFF_NOARP | IFF_MULTICAST | IFF_ALLMULTI | IFF_PROMISC;

constexpr unsigned kUnknown = 256;  // without IPv6, as below its smallest size

struct LinkState {
    std::string name;
    unsigned size = 0;
    unsigned flags = 0;
    unsigned ownAddresses = kUnknown;  ///< of IPv6: how the kernel makes them
};
using Links = std::map<int, LinkState>;

Links linksIn(const NetworkState& state) {
    Links links;
    for (const NetworkMessage& message : state.network.links) {
        constexpr std::size_t kFixed = NLMSG_ALIGN(sizeof(ifinfomsg));
        const auto fixed = readPlain<ifinfomsg>(message.body).value_or(ifinfomsg{});
        const std::string_view name = attributeOf(message.body, kFixed, IFLA_IFNAME);
        const std::string_view size = attributeOf(message.body, kFixed, IFLA_MTU);
        const std::string_view ofIpv6 =
            attributeOf(attributeOf(message.body, kFixed, IFLA_AF_SPEC), 0, AF_INET6);
        const auto mode = readPlain<std::uint8_t>(attributeOf(ofIpv6, 0, IFLA_INET6_ADDR_GEN_MODE));
        links[fixed.ifi_index] = {std::string(name.substr(0, name.find('\0'))),
                                  readPlain<std::uint32_t>(size).value_or(0), fixed.ifi_flags & kFlags,
                                  mode ? *mode : kUnknown};
    }
    return links;
}

/// The old value where the change has touched it and nobody else since, otherwise what is so now.
template <class Value>
Value wantedValue(const Value& before, const Value& left, const Value& began, const Value& now) {
    return before != left && began == left ? before : now;
}

/// What is to be so of a link that is as told.
LinkState wantedLink(const LinkState& before, const LinkState& left, const LinkState& began,
                     const LinkState& now) {
    LinkState wanted;
    wanted.name = wantedValue(before.name, left.name, began.name, now.name);
    wanted.size = wantedValue(before.size, left.size, began.size, now.size);
    const bool canHaveThem = now.ownAddresses != kUnknown && before.ownAddresses != kUnknown;
    wanted.ownAddresses = canHaveThem ? wantedValue(before.ownAddresses, left.ownAddresses,
                                                    began.ownAddresses, now.ownAddresses)
                                      : now.ownAddresses;
    for (unsigned flag = 1; flag <= kFlags; flag <<= 1U) {
        wanted.flags |=
            wantedValue(before.flags & flag, left.flags & flag, began.flags & flag, now.flags & flag);
    }
    return wanted;
}

/// Calls visit(index, now, wanted) for each link that was there before and is there still.
template <class Visit>
void eachLink(const NetworkChange& change, const NetworkState& now, Visit visit) {
    const Links before = linksIn(change.before);
    const Links began = linksIn(change.now);
    const Links left = change.left != nullptr ? linksIn(*change.left) : began;
    for (const auto& [index, is] : linksIn(now)) {
        if (before.contains(index) && left.contains(index) && began.contains(index)) {
            visit(index, is, wantedLink(before.at(index), left.at(index), began.at(index), is));
        }
    }
}

int setLink(NetlinkSocket& socket, int index, unsigned changed, unsigned flags,
            const std::string& attributes) {
    ifinfomsg wanted{};
    wanted.ifi_index = index;
    wanted.ifi_change = changed;
    wanted.ifi_flags = flags;
    return socket.ask(makeRequest(RTM_NEWLINK, NLM_F_ACK, bytesOf(wanted), attributes), [](auto, auto) {});
}

/// Older kernels rename only what is down.
void rename(NetlinkSocket& socket, int index, const LinkState& is, const std::string& name) {
    const std::string attribute = makeAttribute(IFLA_IFNAME, name + '\0');
    if (setLink(socket, index, 0, 0, attribute) == EBUSY) {
        setLink(socket, index, IFF_UP, 0, "");
        setLink(socket, index, 0, 0, attribute);
        setLink(socket, index, IFF_UP, is.flags & IFF_UP, "");
    }
}

void setOwnAddresses(NetlinkSocket& socket, int index, unsigned mode) {
    const std::string one = makeAttribute(IFLA_INET6_ADDR_GEN_MODE, bytesOf(static_cast<std::uint8_t>(mode)));
    const std::string ofIpv6 = makeAttribute(AF_INET6 | NLA_F_NESTED, one);
    setLink(socket, index, 0, 0, makeAttribute(IFLA_AF_SPEC | NLA_F_NESTED, ofIpv6));
}

}  // namespace

void putBackLinks(NetlinkSocket& socket, const NetworkChange& change) {
    eachLink(change, NetworkState::read(), [&](int index, const LinkState& is, const LinkState& wanted) {
        if (is.name != wanted.name) {
            rename(socket, index, is, wanted.name);
        }
        if (is.size != wanted.size) {
            setLink(socket, index, 0, 0, makeAttribute(IFLA_MTU, bytesOf(std::uint32_t{wanted.size})));
        }
        if (is.ownAddresses != wanted.ownAddresses) {
            setOwnAddresses(socket, index, wanted.ownAddresses);
        }
        if (is.flags != wanted.flags) {
            setLink(socket, index, is.flags ^ wanted.flags, wanted.flags, "");
        }
    });
}

std::vector<std::string> linksToPutBack(const NetworkChange& change, const NetworkState& now) {
    std::vector<std::string> texts;
    eachLink(change, now, [&texts](int, const LinkState& is, const LinkState& wanted) {
        const std::string of = " of " + is.name;
        if (is.name != wanted.name) {
            texts.push_back("the name " + wanted.name + of);
        }
        if (is.size != wanted.size) {
            texts.push_back("the packet size" + of);
        }
        if (is.ownAddresses != wanted.ownAddresses) {
            texts.push_back("the way of making own IPv6 addresses" + of);
        }
        if (is.flags != wanted.flags) {
            texts.push_back("the state" + of);
        }
    });
    return texts;
}

}  // namespace cvagent::undo
