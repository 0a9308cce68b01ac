#include "agent/change/in_force.h"

#include <linux/rtnetlink.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <iterator>
#include <thread>

#include "agent/change/interface_settings.h"
#include "agent/change/kept.h"
#include "agent/change/kept_host.h"
#include "agent/change/kernel_network.h"
#include "agent/change/settled.h"
#include "agent/change/untouched.h"

namespace cvagent::change {

namespace {

/// A link, and its network before the plug-in wrote.
struct Scene {
    KernelNetwork before;
    KernelLink link;
    std::string value;  ///< that is written
    bool isKept;  ///< by the system that keeps the interface, or by nobody: no file of the plug-in's counts
    Neighbours neighbours = Neighbours::awaited;

    bool isWritten(const std::string& inFile) const { return isKept || inFile == value; }
};

std::string reason(int problem) {
    return std::strerror(problem);
}

class AddressMove {
public:
    AddressMove(const Scene& scene, const Ip& ip, unsigned prefix)
        : scene_(scene),
          ip_(ip),
          prefix_(prefix),
          old_(scene.before.mainAddress(scene.link.index, ip.isIpv6)) {}

    EffectInForce make() {
        if (KernelNetwork::read().find(scene_.link.index, ip_, prefix_) == nullptr && !add()) {
            return effect_;
        }
        if (isAnothers()) {
            effect_.lacking =
                "another host has " + ip_.text() + ", so the running host does not use it; the old one stays";
            return effect_;
        }
        removeOld();
        putFirst();
        putBackAddresses();
        putBackRoutes();
        return effect_;
    }

private:
    bool add() {
        if (ip_.isIpv6) {
            makeRoom();
        }
        const int problem = addAddress(scene_.link, ip_, prefix_);
        if (problem != 0) {
            effect_.lacking =
                "the running host does not take " + shown(ip_, prefix_) + ": " + reason(problem);
        }
        return problem == 0;
    }

    /// The kernel asks a link that has a carrier.
    bool isAnothers() const {
        constexpr std::chrono::milliseconds kBetweenLooks{50};
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(4);
        const bool isAsked = ip_.isIpv6 && scene_.link.isRunning && scene_.neighbours == Neighbours::awaited;
        Duplicate found = isAsked ? Duplicate::beingAsked : Duplicate::no;
        while (isAsked && (found = duplicateOf(scene_.link.name, ip_)) == Duplicate::beingAsked &&
               std::chrono::steady_clock::now() < end) {
            std::this_thread::sleep_for(kBetweenLooks);
        }
        return found == Duplicate::yes;
    }

    /// The kernel keeps one IPv6 address of a kind, with the prefix length that it had first.
    void makeRoom() const {
        for (const KernelAddress& each : KernelNetwork::read().addresses) {
            if (each.link == scene_.link.index && each.ip == ip_) {
                remove(each);
            }
        }
    }

    static std::string shown(const Ip& ip, unsigned prefix) {
        return ip.text() + "/" + std::to_string(prefix);
    }

    bool isWanted(const KernelAddress& address) const {
        return address.ip == ip_ && address.prefix == prefix_;
    }

    bool isOld(const KernelAddress& address) const {
        return old_ != nullptr && address.ip == old_->ip && address.prefix == old_->prefix;
    }

    /// The plug-in gives a running address its mask: the old one may have it by now, or be gone. One that
    /// another host has is of no use either.
    void removeOld() {
        for (const KernelAddress& each : KernelNetwork::read().addresses) {
            const bool isSame = (old_ != nullptr && each.ip == old_->ip) || each.duplicate == Duplicate::yes;
            if (isSame && each.link == scene_.link.index && !isWanted(each)) {
                noteIf(remove(each), "the old address " + shown(each.ip, each.prefix) + " stays");
                if (!each.isPermanent) {
                    effect_.notes.push_back(each.ip.text() +
                                            " was leased: a DHCP client that still runs may bring it back");
                }
            }
        }
    }

    /// A link is known by its first address, and one that was added beside the old one in its subnet has gone
    /// with it or stands behind others.
    void putFirst() {
        if (ip_.isIpv6) {
            return;
        }
        const KernelNetwork now = KernelNetwork::read();
        for (const KernelAddress& each : now.addresses) {
            const bool isRival = each.label == scene_.link.name || each.ip.sharesPrefix(ip_, prefix_);
            const bool isInFront =
                each.link == scene_.link.index && !each.ip.isIpv6 && !isWanted(each) && isRival;
            if (isWanted(each) && each.link == scene_.link.index) {
                break;
            }
            if (isInFront) {
                remove(each);
            }
        }
        if (KernelNetwork::read().find(scene_.link.index, ip_, prefix_) == nullptr) {
            add();
        }
    }

    void putBackAddresses() {
        for (const KernelAddress& each : scene_.before.addresses) {
            const bool isOther = each.link == scene_.link.index && each.ip.isIpv6 == ip_.isIpv6 &&
                                 !isOld(each) && each.ip != ip_ && each.duplicate != Duplicate::yes;
            if (isOther && KernelNetwork::read().find(each.link, each.ip, each.prefix) == nullptr) {
                noteIf(addAgain(each), "the address " + shown(each.ip, each.prefix) + " is gone");
            }
        }
    }

    /// Those that the kernel makes of an address come and go with it, and so does the old one's own.
    bool isMadeOfAddress(const KernelRoute& route, bool isOfOld) const {
        return route.protocol == RTPROT_KERNEL &&
               (isOfOld || std::ranges::none_of(scene_.before.addresses, [&route](const KernelAddress& each) {
                    return each.link == route.link && each.ip == route.source && !each.hasSubnetRoute;
                }));
    }

    bool isOfLease(const KernelRoute& route) const {
        const bool isLeased = scene_.isKept && old_ != nullptr && !old_->isPermanent;
        return isLeased && route.link == scene_.link.index && goesWithLease(route, KernelNetwork::read());
    }

    void putBackRoutes() {
        for (const KernelRoute& each : scene_.before.routes) {
            const bool preferred = old_ != nullptr && each.source == old_->ip;
            const bool isOurs = each.destination.isIpv6 == ip_.isIpv6 && each.table != RT_TABLE_LOCAL &&
                                !isMadeOfAddress(each, preferred) && !isOfLease(each) &&
                                (each.link == scene_.link.index || preferred);
            if (isOurs && !KernelNetwork::read().has(each)) {
                noteIf(addAgain(each, preferred ? std::optional(ip_) : std::nullopt),
                       "the route " + textOf(each, scene_.before) + " is gone");
            }
        }
    }

    void noteIf(int problem, const std::string& what) {
        if (problem != 0) {
            effect_.notes.push_back(what + ": " + reason(problem));
        }
    }

    const Scene& scene_;
    Ip ip_;
    unsigned prefix_;
    const KernelAddress* old_;
    EffectInForce effect_;
};

/// @param keys of the address and of what tells its subnet, in the interface's file
EffectInForce moveAddress(const Scene& scene, const std::optional<Ip>& ip, std::optional<unsigned> prefix) {
    if (!ip) {
        return {};
    }
    if (!prefix) {
        const KernelAddress* old = scene.before.mainAddress(scene.link.index, ip->isIpv6);
        if (old == nullptr) {
            return {"no mask or prefix length is known of it, so the running host has not got it", {}};
        }
        prefix = old->prefix;
    }
    return AddressMove(scene, *ip, *prefix).make();
}

/// Whether the link's own address is another one than the file's: then the file's is not in force, and a
/// change of its mask alone does not bring it there.
bool isForeign(const Scene& scene, const std::optional<Ip>& ip) {
    const KernelAddress* old = ip ? scene.before.mainAddress(scene.link.index, ip->isIpv6) : nullptr;
    return old != nullptr && old->ip != *ip;
}

std::optional<unsigned> runningPrefix(const Scene& scene, bool isIpv6) {
    const KernelAddress* old = scene.before.mainAddress(scene.link.index, isIpv6);
    return old == nullptr ? std::nullopt : std::optional(old->prefix);
}

EffectInForce ipv4Address(const Scene& scene) {
    const InterfaceSettings file = settingsOf(scene.link.name);
    if (!scene.isWritten(file.ipv4Address)) {
        return {};
    }
    const auto running = runningPrefix(scene, false);
    return moveAddress(scene, Ip::parse(scene.value), running ? running : prefixOfMask(file.mask));
}

EffectInForce subnetMask(const Scene& scene) {
    const InterfaceSettings file = settingsOf(scene.link.name);
    const auto ip = Ip::parse(file.ipv4Address);
    if (!scene.isWritten(file.mask)) {
        return {};
    }
    // The plug-in itself gives the running address its mask, and routes go with that.
    const KernelAddress* running = scene.before.mainAddress(scene.link.index, false);
    return moveAddress(scene, running != nullptr ? std::optional(running->ip) : ip,
                       prefixOfMask(scene.value));
}

EffectInForce ipv6Address(const Scene& scene) {
    const InterfaceSettings file = settingsOf(scene.link.name);
    if (!scene.isWritten(file.ipv6Address)) {
        return {};
    }
    const auto inFile = prefixIn(file);
    return moveAddress(scene, Ip::parse(scene.value), inFile ? inFile : runningPrefix(scene, true));
}

EffectInForce prefixLength(const Scene& scene) {
    const InterfaceSettings file = settingsOf(scene.link.name);
    const auto inFile = Ip::parse(file.ipv6Address);
    if (!scene.isWritten(file.prefixLength) || isForeign(scene, inFile)) {
        return {};
    }
    const KernelAddress* running = scene.before.mainAddress(scene.link.index, true);
    const bool isRunning = scene.isKept && running != nullptr;
    return moveAddress(scene, isRunning ? std::optional(running->ip) : inFile, prefixLengthIn(scene.value));
}

/// An address in whose subnet the gateway is, of the given link when it has one; null for none.
const KernelAddress* wayTo(const KernelNetwork& network, const Ip& gateway, unsigned link) {
    const KernelAddress* way = nullptr;
    for (const KernelAddress& each : network.addresses) {
        if (each.ip.sharesPrefix(gateway, each.prefix) && (way == nullptr || each.link == link)) {
            way = &each;
        }
    }
    return way;
}

std::vector<KernelRoute> defaultRoutes(const KernelNetwork& network) {
    std::vector<KernelRoute> found;
    std::ranges::copy_if(network.routes, std::back_inserter(found), [](const KernelRoute& each) {
        return !each.destination.isIpv6 && each.isDefault() && each.table == RT_TABLE_MAIN &&
               each.type == RTN_UNICAST;
    });
    std::ranges::stable_sort(found, {}, &KernelRoute::metric);
    return found;
}

/// The plug-in itself brings it there.
EffectInForce ipv6Gateway(const Scene& /*scene*/) {
    return {};
}

EffectInForce ipv4Gateway(const Scene& scene) {
    const auto gateway = Ip::parse(scene.value);
    const KernelNetwork now = KernelNetwork::read();
    const std::vector<KernelRoute> routes = defaultRoutes(now);
    const bool isThere =
        std::ranges::any_of(routes, [&gateway](const KernelRoute& each) { return each.gateway == gateway; });
    const bool isWritten = scene.isKept || isDefaultInRoutesFile(scene.value);
    if (!gateway || isThere || !isWritten) {
        return {};
    }
    const KernelAddress* way = wayTo(now, *gateway, scene.link.index);
    if (way == nullptr) {
        return {"no interface has a subnet with this gateway, so the running host has not got it", {}};
    }
    const auto own = std::ranges::find(routes, way->link, &KernelRoute::link);
    const auto replaced = own != routes.end() ? own : routes.begin();
    const unsigned metric = replaced != routes.end() ? replaced->metric : 0;
    EffectInForce effect;
    if (const int problem = setDefaultRoute(*gateway, way->link, metric); problem != 0) {
        effect.lacking = "the running host does not take the gateway: " + reason(problem);
    } else if (replaced != routes.end()) {
        effect.notes.push_back("the route " + textOf(*replaced, now) + " is replaced");
    }
    return effect;
}

struct Effector {
    unsigned int property;
    EffectInForce (*act)(const Scene& scene);
    Touched touched{};
};
constexpr Effector kEffectors[] = {{25, ipv4Address},
                                   {26, subnetMask},
                                   {27, ipv6Address, {true, false}},
                                   {100, ipv4Gateway, {false, true}},
                                   {101, ipv6Gateway, {true, true}},
                                   {102, prefixLength, {true, false}}};

/// @return given whether the value is kept; none for what is not about a link of the kernel's
std::function<EffectInForce(bool)> throughNetlink(const IC::MutableNode& node, const Property& row,
                                                  const IC::PropertyValue& value, Neighbours neighbours) {
    const auto* effector = std::ranges::find(kEffectors, row.id, &Effector::property);
    if (row.type != NodeType::ipConfig || effector == std::end(kEffectors)) {
        return nullptr;
    }
    Scene scene{KernelNetwork::read(), {}, static_cast<std::string>(value), false, neighbours};
    const KernelLink* link = scene.before.link(interfaceNameOf(node));
    if (link == nullptr) {
        return nullptr;
    }
    scene.link = *link;
    return [scene = std::move(scene), effector](bool isKept) {
        Scene now = scene;
        now.isKept = isKept;
        std::vector<std::string> notes;
        if (isKept) {
            putBackUntouched(now.before, now.link.index, effector->touched, notes);
        }
        EffectInForce effect = effector->act(now);
        effect.notes.insert(effect.notes.begin(), notes.begin(), notes.end());
        return effect;
    };
}

}  // namespace

/// The system that keeps the interface may set it up anew, and knows nothing of what others have added: what
/// is missing then is put back behind it.
BringIntoForce bringingIntoForce(Neighbours neighbours) {
    return [neighbours](const IC::MutableNode& node, const Property& row,
                        const IC::PropertyValue& value) -> std::function<EffectInForce()> {
        const bool isTried = neighbours == Neighbours::notAsked;
        auto keep = keepingOfHost(node, row, value, isTried);
        if (!keep) {
            keep = keepingOverRestart(node, row, value, isTried);
        }
        auto act = throughNetlink(node, row, value, neighbours);
        if (!keep && !act) {
            return nullptr;
        }
        return [keep = std::move(keep), act = std::move(act)] {
            const Kept kept = keep ? keep() : Kept();
            EffectInForce effect = act ? act(kept.isKept || kept.isForNow) : EffectInForce();
            effect.isKept = kept.isKept;
            effect.isForNow = kept.isForNow;
            effect.isInForce = kept.isInForce;
            if (!kept.note.empty()) {
                effect.notes.push_back(kept.note);
            }
            return effect;
        };
    };
}

}  // namespace cvagent::change
