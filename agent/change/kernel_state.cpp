#include "agent/change/kernel_state.h"

#include <arpa/inet.h>
#include <linux/fib_rules.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <sys/utsname.h>

#include <algorithm>
#include <array>
#include <iterator>
#include <map>
#include <string_view>

#include "agent/core/text.h"

namespace cvagent::change {

namespace {

using hosttools::readPlain;
using undo::attributeOf;
using undo::NetworkMessage;
using undo::NetworkMessages;
using undo::readNetwork;
using Names = std::map<unsigned, std::string>;

constexpr std::size_t kIpv4Bits = 32;
constexpr std::size_t kIpv6Bits = 128;

std::string textOf(std::string_view data) {
    return printable(std::string(data.substr(0, data.find('\0'))));
}

std::string addressText(int family, std::string_view data) {
    std::array<char, INET6_ADDRSTRLEN> text{};
    const std::size_t size = family == AF_INET ? sizeof(in_addr) : sizeof(in6_addr);
    const bool fits = data.size() == size;
    return fits && inet_ntop(family, data.data(), text.data(), text.size()) != nullptr ? text.data() : "?";
}

std::string networkText(int family, std::string_view data, unsigned bits) {
    const std::size_t whole = family == AF_INET ? kIpv4Bits : kIpv6Bits;
    return addressText(family, data) + (bits == whole ? "" : "/" + std::to_string(bits));
}

std::string tableText(unsigned table) {
    static const std::map<unsigned, std::string> kNames{
        {RT_TABLE_MAIN, "main"}, {RT_TABLE_DEFAULT, "default"}, {RT_TABLE_LOCAL, "local"}};
    const auto name = kNames.find(table);
    return name != kNames.end() ? name->second : std::to_string(table);
}

unsigned numberOf(std::string_view data) {
    return readPlain<std::uint32_t>(data).value_or(0);
}

std::string nameOf(const Names& names, unsigned index) {
    const auto name = names.find(index);
    return name != names.end() ? name->second : "?" + std::to_string(index);
}

/// Shows the parts of a message with one kind of fixed part.
template <class Fixed>
class Parts {
public:
    explicit Parts(std::string_view body) : body_(body) {}
    std::string_view operator[](unsigned type) const {
        return attributeOf(body_, NLMSG_ALIGN(sizeof(Fixed)), type);
    }
    bool has(unsigned type) const { return (*this)[type].data() != nullptr; }

private:
    std::string_view body_;
};

std::string hardwareText(std::string_view data) {
    static constexpr std::string_view kHexDigits = "0123456789abcdef";
    std::string text;
    for (const char each : data) {
        const auto byte = static_cast<unsigned char>(each);
        text += (text.empty() ? "" : ":");
        text += {kHexDigits[byte >> 4U], kHexDigits[byte & 15U]};
    }
    return text;
}

std::string linkLine(std::string_view body, const Names& names) {
    const auto fixed = readPlain<ifinfomsg>(body).value_or(ifinfomsg{});
    const Parts<ifinfomsg> parts(body);
    std::string line = "link " + textOf(parts[IFLA_IFNAME]) + " mtu " +
                       std::to_string(numberOf(parts[IFLA_MTU])) +
                       ((fixed.ifi_flags & IFF_UP) != 0 ? " up" : " down");
    if (parts.has(IFLA_ADDRESS)) {
        line += " address " + hardwareText(parts[IFLA_ADDRESS]);
    }
    if (parts.has(IFLA_MASTER)) {
        line += " member of " + nameOf(names, numberOf(parts[IFLA_MASTER]));
    }
    return line;
}

std::string addressLine(std::string_view body, const Names& names) {
    const auto fixed = readPlain<ifaddrmsg>(body).value_or(ifaddrmsg{});
    const Parts<ifaddrmsg> parts(body);
    const std::string_view local = parts.has(IFA_LOCAL) ? parts[IFA_LOCAL] : parts[IFA_ADDRESS];
    std::string line =
        "address " + nameOf(names, fixed.ifa_index) + " " + addressText(fixed.ifa_family, local);
    if (parts[IFA_ADDRESS] != local) {
        line += " peer " + addressText(fixed.ifa_family, parts[IFA_ADDRESS]);
    }
    line += "/" + std::to_string(fixed.ifa_prefixlen);
    const std::string label = textOf(parts[IFA_LABEL]);
    return label.empty() || label == nameOf(names, fixed.ifa_index) ? line : line + " label " + label;
}

std::string routeTypeText(unsigned type) {
    static const std::map<unsigned, std::string> kNames{
        {RTN_UNICAST, ""},           {RTN_BLACKHOLE, "blackhole "}, {RTN_UNREACHABLE, "unreachable "},
        {RTN_PROHIBIT, "prohibit "}, {RTN_THROW, "throw "},         {RTN_BROADCAST, "broadcast "},
        {RTN_LOCAL, "local "},       {RTN_ANYCAST, "anycast "},     {RTN_MULTICAST, "multicast "}};
    const auto name = kNames.find(type);
    return name != kNames.end() ? name->second : "type " + std::to_string(type) + " ";
}

std::string gatewayText(int family, std::string_view gateway, std::string_view otherFamily) {
    if (otherFamily.size() > sizeof(rtvia)) {
        const auto via = readPlain<std::uint16_t>(otherFamily).value_or(0);
        return " via " + addressText(via, otherFamily.substr(sizeof via));
    }
    return gateway.empty() ? "" : " via " + addressText(family, gateway);
}

/// The ways of a route that has several.
std::string waysText(int family, std::string_view ways, const Names& names) {
    std::string text;
    while (const auto way = readPlain<rtnexthop>(ways)) {
        const std::size_t size = way->rtnh_len;
        if (size < sizeof(rtnexthop) || size > ways.size()) {
            break;
        }
        const std::string_view body = ways.substr(0, size);
        const Parts<rtnexthop> parts(body);
        text += " nexthop" + gatewayText(family, parts[RTA_GATEWAY], parts[RTA_VIA]) + " dev " +
                nameOf(names, static_cast<unsigned>(way->rtnh_ifindex)) + " weight " +
                std::to_string(way->rtnh_hops + 1);
        ways.remove_prefix(std::min(ways.size(), std::size_t{RTNH_ALIGN(size)}));
    }
    return text;
}

std::string routeLine(std::string_view body, const Names& names) {
    const auto fixed = readPlain<rtmsg>(body).value_or(rtmsg{});
    const Parts<rtmsg> parts(body);
    const int family = fixed.rtm_family;
    const unsigned table = parts.has(RTA_TABLE) ? numberOf(parts[RTA_TABLE]) : fixed.rtm_table;
    std::string line = "route " + routeTypeText(fixed.rtm_type);
    line += parts.has(RTA_DST)   ? networkText(family, parts[RTA_DST], fixed.rtm_dst_len)
            : family == AF_INET6 ? "default (IPv6)"
                                 : "default";
    line += gatewayText(family, parts[RTA_GATEWAY], parts[RTA_VIA]);
    if (parts.has(RTA_OIF)) {
        line += " dev " + nameOf(names, numberOf(parts[RTA_OIF]));
    }
    line += waysText(family, parts[RTA_MULTIPATH], names) + " table " + tableText(table);
    if (parts.has(RTA_PRIORITY)) {
        line += " metric " + std::to_string(numberOf(parts[RTA_PRIORITY]));
    }
    return parts.has(RTA_PREFSRC) ? line + " src " + addressText(family, parts[RTA_PREFSRC]) : line;
}

std::string ruleLine(std::string_view body) {
    const auto fixed = readPlain<fib_rule_hdr>(body).value_or(fib_rule_hdr{});
    const Parts<fib_rule_hdr> parts(body);
    const auto end = [&](unsigned type, unsigned bits) {
        return parts.has(type) ? networkText(fixed.family, parts[type], bits) : std::string("all");
    };
    std::string line =
        "rule " + std::to_string(numberOf(parts[FRA_PRIORITY])) + ": from " + end(FRA_SRC, fixed.src_len);
    line += parts.has(FRA_DST) ? " to " + end(FRA_DST, fixed.dst_len) : "";
    line += parts.has(FRA_IIFNAME) ? " iif " + textOf(parts[FRA_IIFNAME]) : "";
    line += parts.has(FRA_OIFNAME) ? " oif " + textOf(parts[FRA_OIFNAME]) : "";
    line += parts.has(FRA_FWMARK) ? " fwmark " + std::to_string(numberOf(parts[FRA_FWMARK])) : "";
    const unsigned table = parts.has(FRA_TABLE) ? numberOf(parts[FRA_TABLE]) : fixed.table;
    line += fixed.action == FR_ACT_TO_TBL ? " lookup " + tableText(table)
                                          : " action " + std::to_string(fixed.action);
    return line + (fixed.family == AF_INET6 ? " (IPv6)" : "");
}

}  // namespace

KernelState linesOf(const NetworkMessages& network) {
    Names names;
    for (const NetworkMessage& link : network.links) {
        const auto fixed = readPlain<ifinfomsg>(link.body).value_or(ifinfomsg{});
        names[static_cast<unsigned>(fixed.ifi_index)] = textOf(Parts<ifinfomsg>(link.body)[IFLA_IFNAME]);
    }
    KernelState lines;
    for (const NetworkMessage& link : network.links) {
        lines.push_back(linkLine(link.body, names));
    }
    for (const NetworkMessage& address : network.addresses) {
        lines.push_back(addressLine(address.body, names));
    }
    for (const NetworkMessage& route : network.routes) {
        lines.push_back(routeLine(route.body, names));
    }
    for (const NetworkMessage& rule : network.rules) {
        lines.push_back(ruleLine(rule.body));
    }
    std::ranges::sort(lines);
    return lines;
}

KernelState readKernelState() {
    hosttools::NetlinkSocket socket(NETLINK_ROUTE);
    KernelState lines = linesOf(readNetwork(socket));
    utsname names{};
    if (uname(&names) == 0) {
        lines.push_back("host name " + textOf(static_cast<const char*>(names.nodename)));
        lines.push_back("domain name " + textOf(static_cast<const char*>(names.domainname)));
    }
    std::ranges::sort(lines);
    return lines;
}

KernelState missingFrom(const KernelState& other, const KernelState& state) {
    KernelState missing;
    std::ranges::set_difference(state, other, std::back_inserter(missing));
    return missing;
}

}  // namespace cvagent::change
