#include "agent/undo/route_makers.h"

#include <linux/if_addr.h>
#include <linux/rtnetlink.h>

#include <algorithm>

#include "agent/undo/message_parts.h"

namespace cvagent::undo {

namespace {

/// What leads to a subnet at once, without a gateway: "LINK BITS NETWORK".
std::string subnetKey(unsigned link, unsigned bits, std::string_view ip) {
    constexpr unsigned kByte = 8;
    std::string network(ip);
    for (std::size_t i = 0; i < network.size(); ++i) {
        const auto whole = static_cast<unsigned>(i) * kByte;
        const unsigned left = bits <= whole ? 0 : std::min(bits - whole, kByte);
        network[i] = static_cast<char>(static_cast<unsigned char>(network[i]) & (0xFF00U >> left));
    }
    return std::to_string(link) + " " + std::to_string(bits) + " " + network;
}

}  // namespace

bool isOfRoutingProgram(const NetworkMessage& route) {
    static const std::set<unsigned> kPrograms{RTPROT_GATED, RTPROT_MRT,   RTPROT_ZEBRA, RTPROT_BIRD,
                                              RTPROT_XORP,  RTPROT_BABEL, RTPROT_BGP,   RTPROT_ISIS,
                                              RTPROT_OSPF,  RTPROT_RIP,   RTPROT_EIGRP};
    return kPrograms.contains(Parts<rtmsg>(route).fixed().rtm_protocol);
}

std::set<std::string> subnetsOfSomebody(const NetworkMessages& network) {
    std::set<std::string> found;
    for (const NetworkMessage& message : network.addresses) {
        const Parts<ifaddrmsg> parts(message);
        if ((parts.number(IFA_FLAGS) & IFA_F_NOPREFIXROUTE) != 0 &&
            parts.fixed().ifa_scope != RT_SCOPE_LINK) {
            found.insert(subnetKey(parts.fixed().ifa_index, parts.fixed().ifa_prefixlen, parts[IFA_ADDRESS]));
        }
    }
    return found;
}

bool isOfOthers(const NetworkMessage& route, const std::set<std::string>& ofSomebody) {
    const Parts<rtmsg> parts(route);
    const unsigned protocol = parts.fixed().rtm_protocol;
    if (protocol == RTPROT_KERNEL) {
        return !ofSomebody.contains(
            subnetKey(parts.number(RTA_OIF), parts.fixed().rtm_dst_len, parts[RTA_DST]));
    }
    return protocol == RTPROT_REDIRECT || protocol == RTPROT_RA || isOfRoutingProgram(route);
}

}  // namespace cvagent::undo
