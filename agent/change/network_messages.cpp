#include "agent/change/network_messages.h"

#include <linux/fib_rules.h>
#include <linux/nexthop.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>

namespace cvagent::change {

namespace {

using hosttools::bytesOf;

constexpr int kAttempts = 3;  // the network can change while it is read

template <class Fixed>
std::string_view behind(std::string_view body) {
    return body.substr(std::min(body.size(), NLMSG_ALIGN(sizeof(Fixed))));
}

std::vector<NetworkMessage> dump(hosttools::NetlinkSocket& socket, unsigned type, std::string_view asked) {
    std::vector<NetworkMessage> all;
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        all.clear();
        const auto keep = [&all](unsigned answered, std::string_view body) {
            all.push_back({answered, std::string(body)});
        };
        if (socket.ask(hosttools::makeRequest(type, NLM_F_DUMP, asked), keep) != EINTR) {
            break;
        }
    }
    return all;
}

void append(std::vector<NetworkMessage>& all, std::vector<NetworkMessage> more) {
    all.insert(all.end(), std::make_move_iterator(more.begin()), std::make_move_iterator(more.end()));
}

/// The local tables come with the addresses, and copies of routes with their use.
bool isKernelsOwn(const NetworkMessage& message) {
    const auto route = hosttools::readPlain<rtmsg>(message.body);
    return !route || route->rtm_table == RT_TABLE_LOCAL || (route->rtm_flags & RTM_F_CLONED) != 0;
}

template <class Asked>
std::vector<NetworkMessage> dumpBoth(hosttools::NetlinkSocket& socket, unsigned type,
                                     unsigned char Asked::*family) {
    std::vector<NetworkMessage> all;
    for (const unsigned char each : {AF_INET, AF_INET6}) {
        Asked asked{};
        asked.*family = each;
        append(all, dump(socket, type, bytesOf(asked)));
    }
    return all;
}

}  // namespace

NetworkMessages readNetwork(hosttools::NetlinkSocket& socket) {
    NetworkMessages network;
    network.links = dump(socket, RTM_GETLINK, bytesOf(ifinfomsg{}));
    network.addresses = dumpBoth(socket, RTM_GETADDR, &ifaddrmsg::ifa_family);
    network.nextHops = dump(socket, RTM_GETNEXTHOP, bytesOf(nhmsg{}));
    network.routes = dumpBoth(socket, RTM_GETROUTE, &rtmsg::rtm_family);
    std::erase_if(network.routes, isKernelsOwn);
    network.rules = dumpBoth(socket, RTM_GETRULE, &fib_rule_hdr::family);
    return network;
}

std::string attributesOf(std::string_view body, std::size_t fixedPart,
                         const std::function<bool(unsigned, std::string&)>& change) {
    std::string kept;
    hosttools::eachAttribute(body.substr(std::min(body.size(), fixedPart)),
                             [&](unsigned type, std::string_view data) {
                                 std::string own(data);
                                 if (change(type, own)) {
                                     kept += hosttools::makeAttribute(type, own);
                                 }
                             });
    return kept;
}

std::string_view attributeOf(std::string_view body, std::size_t fixedPart, unsigned type) {
    std::string_view found;
    hosttools::eachAttribute(
        body.substr(std::min(body.size(), fixedPart)),
        [&found, type](unsigned each, std::string_view data) { found = each == type ? data : found; });
    return found;
}

}  // namespace cvagent::change
