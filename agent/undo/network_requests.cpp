#include "agent/undo/network_requests.h"

#include <linux/if_addr.h>
#include <linux/nexthop.h>
#include <linux/rtnetlink.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <set>

namespace cvagent::undo {

namespace {

using hosttools::bytesOf;
using hosttools::makeAttribute;
using hosttools::makeRequest;
using hosttools::readPlain;

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

}  // namespace

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
            static const std::set<unsigned> kTaken{IFA_ADDRESS,   IFA_LOCAL,       IFA_BROADCAST, IFA_LABEL,
                                                   IFA_CACHEINFO, IFA_RT_PRIORITY, IFA_PROTO};
            return kTaken.contains(type);
        });
    flags = (flags & kKeptFlags) | more;
    fixed.ifa_flags = static_cast<std::uint8_t>(flags);
    return makeRequest(RTM_NEWADDR, how, bytesOf(fixed),
                       attributes + makeAttribute(IFA_FLAGS, bytesOf(std::uint32_t{flags})));
}

std::string routeRequest(const NetworkMessage& message, unsigned how) {
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
    return makeRequest(RTM_NEWROUTE, how, bytesOf(fixed), attributes);
}

std::string nextHopRequest(const NetworkMessage& message, unsigned how) {
    auto fixed = readPlain<nhmsg>(message.body).value_or(nhmsg{});
    fixed.nh_flags &= RTNH_F_ONLINK;
    fixed.nh_scope = 0;
    std::string attributes;
    const auto body =
        std::string_view(message.body).substr(std::min(message.body.size(), NLMSG_ALIGN(sizeof(nhmsg))));
    hosttools::eachAttribute(body, [&attributes](unsigned type, std::string_view data) {
        const bool isNested = type == NHA_ENCAP || type == NHA_RES_GROUP;
        attributes += type <= NHA_RES_GROUP ? makeAttribute(type | (isNested ? NLA_F_NESTED : 0U), data) : "";
    });
    return makeRequest(RTM_NEWNEXTHOP, how, bytesOf(fixed), attributes);
}

}  // namespace cvagent::undo
