#include "agent/undo/network_messages.h"

#include <linux/fib_rules.h>
#include <linux/neighbour.h>
#include <linux/nexthop.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>

namespace cvagent::undo {

namespace {

using hosttools::bytesOf;

constexpr int kAttempts = 3;  // the network can change while it is read

void append(std::vector<NetworkMessage>& all, std::vector<NetworkMessage> more) {
    all.insert(all.end(), std::make_move_iterator(more.begin()), std::make_move_iterator(more.end()));
}

/// Reads lists one after the other and notes what kept one of them from being whole.
class Dumps {
public:
    Dumps(hosttools::NetlinkSocket& socket, int& problem) : socket_(socket), problem_(problem) {}

    std::vector<NetworkMessage> all(unsigned type, std::string_view asked) {
        std::vector<NetworkMessage> found;
        int problem = EINTR;
        for (int attempt = 0; problem == EINTR && attempt < kAttempts; ++attempt) {
            found.clear();
            problem = socket_.ask(hosttools::makeRequest(type, NLM_F_DUMP, asked),
                                  [&found](unsigned answered, std::string_view body) {
                                      found.push_back({answered, std::string(body)});
                                  });
        }
        const bool isUnknown = problem == EOPNOTSUPP;  // to this kernel: there is none of that kind
        problem_ = problem_ == 0 && !isUnknown ? problem : problem_;
        return found;
    }

    /// Of IPv4, then of IPv6.
    template <class Asked>
    std::vector<NetworkMessage> both(unsigned type, unsigned char Asked::*family) {
        std::vector<NetworkMessage> found;
        for (const unsigned char each : {AF_INET, AF_INET6}) {
            Asked asked{};
            asked.*family = each;
            append(found, all(type, bytesOf(asked)));
        }
        return found;
    }

private:
    hosttools::NetlinkSocket& socket_;
    int& problem_;
};

/// The local tables come with the addresses, and copies of routes with their use.
bool isKernelsOwn(const NetworkMessage& message) {
    const auto route = hosttools::readPlain<rtmsg>(message.body);
    return !route || route->rtm_table == RT_TABLE_LOCAL || (route->rtm_flags & RTM_F_CLONED) != 0;
}

}  // namespace

NetworkMessages readNetwork(hosttools::NetlinkSocket& socket) {
    NetworkMessages network;
    Dumps dumps(socket, network.problem);
    network.links = dumps.all(RTM_GETLINK, bytesOf(ifinfomsg{}));
    network.addresses = dumps.both(RTM_GETADDR, &ifaddrmsg::ifa_family);
    network.nextHops = dumps.all(RTM_GETNEXTHOP, bytesOf(nhmsg{}));
    network.routes = dumps.both(RTM_GETROUTE, &rtmsg::rtm_family);
    std::erase_if(network.routes, isKernelsOwn);
    network.rules = dumps.both(RTM_GETRULE, &fib_rule_hdr::family);
    return network;
}

std::vector<NetworkMessage> readPermanentNeighbours(hosttools::NetlinkSocket& socket, int& problem) {
    auto neighbours = Dumps(socket, problem).both(RTM_GETNEIGH, &ndmsg::ndm_family);
    std::erase_if(neighbours, [](const NetworkMessage& message) {
        const auto neighbour = hosttools::readPlain<ndmsg>(message.body);
        return !neighbour || (neighbour->ndm_state & NUD_PERMANENT) == 0;
    });
    return neighbours;
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

}  // namespace cvagent::undo
