#include "agent/change/checks.h"

#include <linux/rtnetlink.h>

#include <algorithm>
#include <iterator>

#include "agent/change/clock_source.h"

namespace cvagent::change {

namespace {

// Properties of an ip-config.
constexpr unsigned int kIpv4Address = 25;
constexpr unsigned int kMask = 26;
constexpr unsigned int kIpv6Address = 27;
constexpr unsigned int kNameServers = 94;
constexpr unsigned int kIpv4Gateway = 100;
constexpr unsigned int kIpv6Gateway = 101;
constexpr unsigned int kPrefixLength = 102;
// Of a computer.
constexpr unsigned int kClock = 126;

constexpr unsigned kSmallestNetwork = 30;       // an IPv4 subnet with a network and a broadcast address
constexpr unsigned kSmallestIpv6Network = 126;  // one whose first address means any router

/// An address as it will be.
struct PlannedAddress {
    std::string interface;
    Ip ip;
    unsigned prefix = 0;
};

bool hasNetworkAddress(const Ip& ip, unsigned prefix) {
    return prefix <= (ip.isIpv6 ? kSmallestIpv6Network : kSmallestNetwork);
}

/// Why no host can be reached by the address; "" when one can.
std::string misuseOf(const Ip& ip, unsigned prefix) {
    const std::string subnet = ip.first(prefix).text() + "/" + std::to_string(prefix);
    if (!hasNetworkAddress(ip, prefix)) {
        return {};
    }
    if (ip == ip.first(prefix)) {
        return ip.text() + (ip.isIpv6 ? " stands for any router of " : " is the network address of ") +
               subnet;
    }
    return !ip.isIpv6 && ip == ip.last(prefix) ? ip.text() + " is the broadcast address of " + subnet : "";
}

class Checks {
public:
    Checks(const std::vector<Wanted>& changes, const HostFacts& host) : changes_(changes), host_(host) {
        for (const KernelAddress& each : host_.network.addresses) {
            addresses_.push_back({host_.network.nameOf(each.link), each.ip, each.prefix});
        }
        for (const KernelLink& link : host_.network.links) {
            plan(link, false);
            plan(link, true);
        }
    }

    std::vector<Objection> all() {
        for (at_ = 0; at_ < changes_.size(); ++at_) {
            const Wanted& wanted = changes_[at_];
            const bool isOfLink = !wanted.isComputer && host_.network.link(wanted.interface) != nullptr;
            const auto* check = std::ranges::find(kTable, wanted.property, &Row::property);
            if (check != std::end(kTable) && (check->isOfComputer ? wanted.isComputer : isOfLink)) {
                (this->*check->check)(wanted);
            }
        }
        return std::move(objections_);
    }

private:
    struct Row {
        unsigned int property;
        void (Checks::*check)(const Wanted& wanted);
        bool isOfComputer = false;
    };

    const Wanted* find(const std::string& interface, unsigned int property) const {
        const auto found = std::ranges::find_if(changes_, [&](const Wanted& each) {
            return !each.isComputer && each.interface == interface && each.property == property;
        });
        return found == changes_.end() ? nullptr : &*found;
    }

    const InterfaceSettings& fileOf(const std::string& interface) const {
        static const InterfaceSettings none;
        const auto found = host_.files.find(interface);
        return found == host_.files.end() ? none : found->second;
    }

    /// The length that the interface's own address will have; nothing when nobody knows.
    std::optional<unsigned> prefixOf(const KernelLink& link, bool isIpv6) const {
        const Wanted* wanted = find(link.name, isIpv6 ? kPrefixLength : kMask);
        const KernelAddress* running = host_.network.mainAddress(link.index, isIpv6);
        const InterfaceSettings& file = fileOf(link.name);
        if (wanted != nullptr) {
            InterfaceSettings changed;
            changed.prefixLength = wanted->words.front();
            return isIpv6 ? prefixIn(changed) : prefixOfMask(wanted->words.front());
        }
        if (running != nullptr) {
            return running->prefix;
        }
        return isIpv6 ? prefixIn(file) : prefixOfMask(file.mask);
    }

    /// The interface's own address becomes the one that it will have.
    void plan(const KernelLink& link, bool isIpv6) {
        const Wanted* wanted = find(link.name, isIpv6 ? kIpv6Address : kIpv4Address);
        const KernelAddress* running = host_.network.mainAddress(link.index, isIpv6);
        const auto ip = wanted != nullptr    ? Ip::parse(wanted->words.front())
                        : running != nullptr ? std::optional(running->ip)
                                             : std::nullopt;
        const auto prefix = prefixOf(link, isIpv6);
        if (!ip) {
            return;
        }
        if (running != nullptr) {
            std::erase_if(addresses_, [&](const PlannedAddress& each) {
                return each.interface == link.name && each.ip == running->ip;
            });
        }
        addresses_.push_back({link.name, *ip, prefix.value_or(ip->bits())});
    }

    void object(const std::string& reason) { objections_.push_back({at_, reason}); }

    void address(const Wanted& wanted) {
        const auto ip = Ip::parse(wanted.words.front());
        if (!ip) {
            return;
        }
        for (const PlannedAddress& each : addresses_) {
            if (each.ip != *ip) {
                continue;
            }
            if (each.interface != wanted.interface) {
                object(each.ip.text() + " is the address of " + each.interface);
            } else if (const std::string misuse = misuseOf(*ip, each.prefix); !misuse.empty()) {
                object(misuse);
            }
        }
    }

    /// A mask, and an IPv6 prefix length.
    void mask(const Wanted& wanted) {
        const bool isIpv6 = wanted.property == kPrefixLength;
        const InterfaceSettings& file = fileOf(wanted.interface);
        const unsigned link = host_.network.link(wanted.interface)->index;
        const bool hasAddress = find(wanted.interface, isIpv6 ? kIpv6Address : kIpv4Address) != nullptr ||
                                host_.network.mainAddress(link, isIpv6) != nullptr ||
                                !(isIpv6 ? file.ipv6Address : file.ipv4Address).empty();
        if (!hasAddress) {
            object(wanted.interface + " has no address that it could belong to");
            return;
        }
        if (find(wanted.interface, isIpv6 ? kIpv6Address : kIpv4Address) != nullptr) {
            return;  // said of the address
        }
        for (const PlannedAddress& each : addresses_) {
            const KernelAddress* running = host_.network.mainAddress(link, isIpv6);
            if (each.interface == wanted.interface && running != nullptr && each.ip == running->ip) {
                if (const std::string misuse = misuseOf(each.ip, each.prefix); !misuse.empty()) {
                    object("with it, " + misuse);
                }
            }
        }
    }

    void gateway(const Wanted& wanted) {
        const auto ip = Ip::parse(wanted.words.front());
        if (!ip || ip->isLinkLocal()) {
            return;
        }
        bool isReached = std::ranges::any_of(host_.network.routes, [&ip](const KernelRoute& each) {
            // one that somebody has laid to it, without a gateway
            return each.protocol != RTPROT_KERNEL && each.type == RTN_UNICAST && !each.gateway &&
                   !each.isDefault() && each.destination.sharesPrefix(*ip, each.prefix);
        });
        for (const PlannedAddress& each : addresses_) {
            if (!each.ip.sharesPrefix(*ip, each.prefix)) {
                continue;
            }
            isReached = true;
            const Ip gatewayIp = *ip;
            if (each.ip == gatewayIp) {
                object(gatewayIp.text() + " is the address of " + each.interface + " itself");
            } else if (const std::string misuse = misuseOf(gatewayIp, each.prefix); !misuse.empty()) {
                object(misuse);
            }
        }
        if (!isReached) {
            object(ip->text() + " is in no subnet of this host");
        }
    }

    void nameServers(const Wanted& wanted) {
        for (const std::string& word : wanted.words) {
            const auto ip = Ip::parse(word);
            for (const PlannedAddress& each : addresses_) {
                const bool isThere = ip && each.ip.sharesPrefix(*ip, each.prefix) && each.interface != "lo";
                if (const std::string misuse = isThere ? misuseOf(*ip, each.prefix) : ""; !misuse.empty()) {
                    object("no name server can be there: " + misuse);
                }
            }
        }
    }

    void clock(const Wanted& /*wanted*/) {
        if (!host_.clockSteeredBy.empty()) {
            object(host_.clockSteeredBy + " keeps the clock in step with others and would set it back");
        }
    }

    static const Row kTable[8];

    const std::vector<Wanted>& changes_;
    const HostFacts& host_;
    std::vector<PlannedAddress> addresses_;  // of the whole host, as they will be
    std::size_t at_ = 0;
    std::vector<Objection> objections_;
};

const Checks::Row Checks::kTable[8] = {
    {kIpv4Address, &Checks::address},     {kIpv6Address, &Checks::address}, {kMask, &Checks::mask},
    {kPrefixLength, &Checks::mask},       {kIpv4Gateway, &Checks::gateway}, {kIpv6Gateway, &Checks::gateway},
    {kNameServers, &Checks::nameServers}, {kClock, &Checks::clock, true}};

}  // namespace

HostFacts HostFacts::of(const std::vector<Wanted>& changes) {
    HostFacts host;
    bool isNetwork = false;
    for (const Wanted& each : changes) {
        if (!each.interface.empty()) {
            isNetwork = true;
            host.files.try_emplace(each.interface, settingsOf(each.interface));
        }
        if (each.isComputer && each.property == kClock && host.clockSteeredBy.empty()) {
            host.clockSteeredBy = change::clockSteeredBy();
        }
    }
    if (isNetwork) {
        host.network = KernelNetwork::read();
    }
    return host;
}

std::vector<Objection> objectionsTo(const std::vector<Wanted>& changes, const HostFacts& host) {
    return Checks(changes, host).all();
}

}  // namespace cvagent::change
