#include "agent/change/settled.h"

#include <linux/rtnetlink.h>

#include <algorithm>
#include <chrono>
#include <thread>

#include "agent/keep/manager.h"
#include "agent/undo/renewed_lease.h"

namespace cvagent::change {

namespace {

class Settling {
public:
    Settling(const keep::Link& link, const keep::Wish& wish, const KernelNetwork& before)
        : link_(link), wish_(wish), before_(before) {}

    bool isSet() const {
        const KernelNetwork now = KernelNetwork::read();
        return isOn(now, wish_.ipv4, isFixed()) && isOn(now, wish_.ipv6, false) &&
               (!endsLease() || hasDoneWithout(now)) && (!isByDhcp() || hasLease(now));
    }

    bool isByDhcp() const { return wish_.dhcp.value_or(false); }

    bool endsLease() const { return isFixed() && wish_.ipv4.address && hasLeasedAddress(before_); }

    bool hasAnyAddress() const {
        return hasAddress(KernelNetwork::read(), [](const KernelAddress&) { return true; });
    }

private:
    bool isFixed() const { return wish_.dhcp && !*wish_.dhcp; }

    /// @param fitting of those of IPv4
    template <class Fitting>
    bool hasAddress(const KernelNetwork& network, Fitting fitting) const {
        return std::ranges::any_of(network.addresses, [&](const KernelAddress& each) {
            return each.link == link_.index && !each.ip.isIpv6 && each.isGlobal && fitting(each);
        });
    }

    bool hasLeasedAddress(const KernelNetwork& network) const {
        return hasAddress(network, [](const KernelAddress& each) { return !each.isPermanent; });
    }

    bool isOn(const KernelNetwork& now, const keep::FamilyWish& wish, bool isToStay) const {
        const auto ip = wish.address ? Ip::parse(*wish.address) : std::nullopt;
        return !ip || std::ranges::any_of(now.addresses, [&](const KernelAddress& each) {
            const bool isIt = each.link == link_.index && each.ip == *ip;
            return isIt && (!wish.prefix || each.prefix == *wish.prefix) && (!isToStay || each.isPermanent);
        });
    }

    /// The address of the lease is gone, and its gateway is somebody else's.
    bool hasDoneWithout(const KernelNetwork& now) const {
        const auto& text = wish_.ipv4.likelyGateway;
        const auto gateway = text ? Ip::parse(*text) : std::nullopt;
        const bool hasGateway = std::ranges::any_of(now.routes, [&](const KernelRoute& each) {
            return each.isDefault() && each.link == link_.index && each.gateway == gateway &&
                   each.protocol != RTPROT_DHCP;
        });
        return !hasLeasedAddress(now) && (!gateway || hasGateway);
    }

    /// A client may set it for ever, too.
    bool hasLease(const KernelNetwork& now) const {
        return hasAddress(now, [this](const KernelAddress& each) {
            return !each.isPermanent || before_.find(link_.index, each.ip, each.prefix) == nullptr;
        });
    }

    const keep::Link& link_;
    const keep::Wish& wish_;
    const KernelNetwork& before_;
};

}  // namespace

Settled settled(const keep::Link& link, const keep::Wish& wish, const KernelNetwork& before) {
    constexpr std::chrono::milliseconds kBetweenSettledLooks{20};
    constexpr std::chrono::seconds kLongest{5};
    constexpr std::chrono::seconds kLongestForLease{10};
    const Settling settling(link, wish, before);
    const auto end = std::chrono::steady_clock::now() + (settling.isByDhcp() ? kLongestForLease : kLongest);
    const KernelLink* kernels = before.link(link.name);
    const bool isWaitedFor = kernels != nullptr && kernels->isRunning;
    while (isWaitedFor && !settling.isSet() && std::chrono::steady_clock::now() < end) {
        std::this_thread::sleep_for(kBetweenSettledLooks);
    }
    if (settling.isByDhcp() && !settling.hasAnyAddress()) {
        return {"no address has come by DHCP yet", true};
    }
    return {settling.endsLease() ? "name servers of the lease may go with it" : "", false};
}

void goWithLease(const keep::Way& way, const keep::Link& link) {
    const bool isReapplied =
        std::ranges::find(way.callsAfter, undo::kReapply + (" " + link.name)) != way.callsAfter.end();
    if (!isReapplied || way.isEmpty() || keep::toldInstead() != nullptr) {
        keep::go(way);
        return;
    }
    const undo::RenewedLease lease(link.name);
    keep::go(way);
    lease.wait();
}

bool goesWithLease(const KernelRoute& route, const KernelNetwork& now) {
    return route.protocol == RTPROT_DHCP &&
           (!route.isDefault() || std::ranges::any_of(now.routes, [&route](const KernelRoute& each) {
               return each.isDefault() && each.link == route.link && each.gateway == route.gateway;
           }));
}

}  // namespace cvagent::change
