#include "agent/service/host_watch.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>

#include <utility>

namespace cvagent::service {

namespace {

/// Between two times of taking in; what comes meanwhile is taken together.
constexpr std::chrono::milliseconds kPause{20};
/// After news were lost: asking for everything again and again would add to what there is too much of.
constexpr std::chrono::milliseconds kPauseOfLost{200};

constexpr std::uint32_t group(unsigned int number) {
    return 1U << (number - 1);
}

constexpr std::uint32_t kRouteGroups = group(RTNLGRP_LINK) | group(RTNLGRP_IPV4_IFADDR) |
                                       group(RTNLGRP_IPV6_IFADDR) | group(RTNLGRP_IPV4_ROUTE) |
                                       group(RTNLGRP_IPV6_ROUTE) | group(RTNLGRP_NEXTHOP);
constexpr std::uint32_t kDeviceGroups = 1;  // the kernel's own announcements; udev's are group 2

/// The names of what news are about; a link that is gone has its former one.
HostChange changeOf(const HeardNews& heard, const HostLinks& links) {
    HostChange change;
    for (const auto& [index, concern] : heard.concerned) {
        if (const auto link = links.find(index); link != links.end()) {
            change.names[link->second.name] |= concern;
        }
        if (const auto former = heard.formerNames.find(index); former != heard.formerNames.end()) {
            change.names[former->second] |= concern;
        }
    }
    if (const auto all = heard.concerned.find(0); all != heard.concerned.end()) {
        change.names[""] |= all->second;
    }
    return change;
}

}  // namespace

HostWatch::HostWatch(Loop& loop, Looker& looker)
    : loop_(loop),
      looker_(looker),
      routes_(NETLINK_ROUTE, kRouteGroups),
      devices_(NETLINK_KOBJECT_UEVENT, kDeviceGroups) {
    take();
}

void HostWatch::listen() {
    pause_.reset();
    if (routes_.descriptor() >= 0) {
        routesCome_ = loop_.whenReadable(routes_.descriptor(), [this] { take(); });
    }
    if (devices_.descriptor() >= 0) {
        devicesCome_ = loop_.whenReadable(devices_.descriptor(), [this] { take(); });
    }
}

bool HostWatch::listLinks() {
    HostLinks all;
    HeardNews heard;
    const bool whole = Announcements::askForAll(
        NETLINK_ROUTE, RTM_GETLINK, [&](std::string_view message) { takeRouteNews(message, all, heard); });
    if (whole) {
        links_ = std::move(all);
    }
    return whole;
}

void HostWatch::take() {
    HeardNews heard;
    bool drives = false;
    const bool lost =
        routes_.takeWaiting([&](std::string_view message) { takeRouteNews(message, links_, heard); });
    const bool lostDevices = devices_.takeWaiting(
        [&](std::string_view message) { drives = drives || subsystemOfDevice(message) == "block"; });
    incomplete_ = incomplete_ || lost;
    const bool listed = incomplete_ && listLinks();
    incomplete_ = incomplete_ && !listed;
    HostChange change = changeOf(heard, links_);
    if (listed) {
        change.names[""] = concernsAll;
    }
    change.linksDiffer = heard.linksDiffer || listed;
    change.drives = drives || lostDevices;
    if (change.any()) {
        change.links = std::make_shared<const HostLinks>(links_);
        looker_.hear(change);
    }
    pauseListening(lost || incomplete_ ? kPauseOfLost : kPause);
}

void HostWatch::pauseListening(std::chrono::milliseconds time) {
    routesCome_.reset();
    devicesCome_.reset();
    pause_ = loop_.after(time, [this] {
        if (incomplete_ && routes_.descriptor() >= 0) {
            take();
        } else {
            listen();
        }
    });
}

}  // namespace cvagent::service
