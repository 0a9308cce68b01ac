#include "agent/service/host_links.h"

#include <linux/if_link.h>
#include <linux/rtnetlink.h>
#include <net/if.h>

#include <algorithm>
#include <cstring>
#include <optional>

namespace cvagent::service {

namespace {

constexpr unsigned short kEthernetAddress = 6;

/// The attributes behind the fixed part of a message, or within another attribute.
class Attributes {
public:
    Attributes(const void* begin, std::size_t size)
        : begin_(static_cast<const rtattr*>(begin)), size_(static_cast<int>(size)) {}

    /// Its content; nothing when there is none.
    std::optional<std::string_view> find(unsigned short wanted) const {
        int left = size_;  // below zero behind the last one
        for (const rtattr* each = begin_; RTA_OK(each, left); each = RTA_NEXT(each, left)) {
            if ((each->rta_type & NLA_TYPE_MASK) == wanted) {
                return std::string_view(static_cast<const char*>(RTA_DATA(each)), RTA_PAYLOAD(each));
            }
        }
        return std::nullopt;
    }
    std::string text(unsigned short wanted) const {
        const std::string_view content = find(wanted).value_or("");
        return std::string(content.substr(0, content.find('\0')));
    }
    int number(unsigned short wanted) const {
        const std::string_view content = find(wanted).value_or("");
        int number = 0;
        if (content.size() >= sizeof number) {
            std::memcpy(&number, content.data(), sizeof number);
        }
        return number;
    }

private:
    const rtattr* begin_;
    int size_;
};

/// The fixed part of a message, and its attributes.
template <class Fixed>
std::optional<std::pair<Fixed, Attributes>> partsOf(const nlmsghdr& header) {
    const unsigned int size = header.nlmsg_len - NLMSG_HDRLEN;
    if (header.nlmsg_len < NLMSG_LENGTH(sizeof(Fixed))) {
        return std::nullopt;
    }
    Fixed fixed{};
    // NLMSG_DATA takes the constness away.
    const char* const content = reinterpret_cast<const char*>(&header) + NLMSG_HDRLEN;
    std::memcpy(&fixed, content, sizeof fixed);
    return std::pair(fixed, Attributes(content + NLMSG_ALIGN(sizeof fixed),
                                       size - std::min<std::size_t>(size, NLMSG_ALIGN(sizeof fixed))));
}

HostLink linkOf(const ifinfomsg& fixed, const Attributes& attributes) {
    const std::string_view kinds = attributes.find(IFLA_LINKINFO).value_or("");
    const Attributes info(kinds.data(), kinds.size());
    const std::string_view address = attributes.find(IFLA_ADDRESS).value_or("");
    HostLink link;
    link.name = attributes.text(IFLA_IFNAME);
    link.master = attributes.number(IFLA_MASTER);
    link.ofBridge = info.text(IFLA_INFO_SLAVE_KIND) == "bridge";
    link.isBond = info.text(IFLA_INFO_KIND) == "bond";
    link.zeroAddress = address.size() == kEthernetAddress &&
                       std::ranges::all_of(address, [](char byte) { return byte == '\0'; });
    link.isLoopback = (fixed.ifi_flags & IFF_LOOPBACK) != 0;
    link.isUp = (fixed.ifi_flags & IFF_UP) != 0;
    return link;
}

/// Whether plug-ins show another thing, or none, after the change.
bool isAnother(HostLink before, const HostLink& after) {
    before.isUp = after.isUp;
    return before != after;
}

/// A bond's facts are those of its members, and theirs its.
void noteBond(int master, const HostLinks& links, HeardNews& heard) {
    const auto bond = links.find(master);
    if (bond == links.end() || !bond->second.isBond) {
        return;
    }
    heard.concerned[master] |= concernsLink;
    for (const auto& [index, link] : links) {
        if (link.master == master) {
            heard.concerned[index] |= concernsLink;
        }
    }
}

void noteLink(int index, const HostLinks& links, HeardNews& heard) {
    heard.concerned[index] |= concernsAll;  // routes go with a link that goes down, and nobody says so
    noteBond(index, links, heard);
    if (const auto link = links.find(index); link != links.end()) {
        noteBond(link->second.master, links, heard);
    }
}

void takeLink(const nlmsghdr& header, HostLinks& links, HeardNews& heard) {
    const auto parts = partsOf<ifinfomsg>(header);
    if (!parts) {
        return;
    }
    const auto& [fixed, attributes] = *parts;
    const auto known = links.find(fixed.ifi_index);
    noteLink(fixed.ifi_index, links, heard);  // as it was
    // A bridge and a wireless driver announce only their own part of a link.
    const bool whole = fixed.ifi_family == AF_UNSPEC && !attributes.find(IFLA_WIRELESS);
    if (header.nlmsg_type == RTM_DELLINK && whole) {
        if (known != links.end()) {
            heard.formerNames[fixed.ifi_index] = known->second.name;
            links.erase(known);
            heard.linksDiffer = true;
        }
    } else if (HostLink link = linkOf(fixed, attributes); whole && !link.name.empty()) {
        if (known != links.end() && known->second.name != link.name) {
            heard.formerNames[fixed.ifi_index] = known->second.name;
        }
        heard.linksDiffer = heard.linksDiffer || known == links.end() || isAnother(known->second, link);
        links[fixed.ifi_index] = std::move(link);
        noteLink(fixed.ifi_index, links, heard);
    }
}

void takeAddress(const nlmsghdr& header, HostLinks& /*links*/, HeardNews& heard) {
    if (const auto parts = partsOf<ifaddrmsg>(header)) {
        heard.concerned[static_cast<int>(parts->first.ifa_index)] |= concernsAddress | concernsRoute;
    }
}

/// A route of several ways, or of none, names no link.
void takeRoute(const nlmsghdr& header, HostLinks& /*links*/, HeardNews& heard) {
    if (const auto parts = partsOf<rtmsg>(header)) {
        heard.concerned[parts->second.number(RTA_OIF)] |= concernsRoute;
    }
}

void takeNextHop(const nlmsghdr& /*header*/, HostLinks& /*links*/, HeardNews& heard) {
    heard.concerned[0] |= concernsRoute;
}

struct NewsRow {
    unsigned short type;
    void (*take)(const nlmsghdr& header, HostLinks& links, HeardNews& heard);
};

constexpr NewsRow kNewsRows[] = {
    {RTM_NEWLINK, takeLink},       {RTM_DELLINK, takeLink},       {RTM_NEWADDR, takeAddress},
    {RTM_DELADDR, takeAddress},    {RTM_NEWROUTE, takeRoute},     {RTM_DELROUTE, takeRoute},
    {RTM_NEWNEXTHOP, takeNextHop}, {RTM_DELNEXTHOP, takeNextHop},
};

}  // namespace

LinkIndices linkIndices() {
    struct Free {
        void operator()(struct if_nameindex* names) const { if_freenameindex(names); }
    };
    LinkIndices indices;
    const std::unique_ptr<struct if_nameindex, Free> names(if_nameindex());
    for (const struct if_nameindex* each = names.get(); each != nullptr && each->if_index != 0; ++each) {
        indices.emplace(each->if_name, static_cast<int>(each->if_index));
    }
    return indices;
}

/// The first plug-in finds a link's lines by its name anywhere in them: what is of eth10 is eth1's as well.
unsigned int HostChange::concernOf(const std::string& name) const {
    unsigned int concern = 0;
    for (const auto& [changed, what] : names) {
        concern |= changed.empty() || (!name.empty() && changed.find(name) != std::string::npos) ? what : 0;
    }
    return concern;
}

void HostChange::add(const HostChange& later) {
    for (const auto& [name, concern] : later.names) {
        names[name] |= concern;
    }
    linksDiffer = linksDiffer || later.linksDiffer;
    drives = drives || later.drives;
    links = later.links;
}

void takeRouteNews(std::string_view message, HostLinks& links, HeardNews& heard) {
    auto left = static_cast<int>(message.size());
    for (const auto* header = reinterpret_cast<const nlmsghdr*>(message.data()); NLMSG_OK(header, left);
         header = NLMSG_NEXT(header, left)) {
        const auto* const row = std::ranges::find(kNewsRows, header->nlmsg_type, &NewsRow::type);
        if (row != std::end(kNewsRows)) {
            row->take(*header, links, heard);
        }
    }
}

std::string subsystemOfDevice(std::string_view message) {
    constexpr std::string_view kKey("\0SUBSYSTEM=", 11);
    const std::size_t found = message.find(kKey);
    if (found == std::string_view::npos) {
        return "";
    }
    const std::string_view rest = message.substr(found + kKey.size());
    return std::string(rest.substr(0, rest.find('\0')));
}

}  // namespace cvagent::service
