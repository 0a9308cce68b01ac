#include "agent/change/kept.h"

#include <linux/rtnetlink.h>

#include <algorithm>
#include <iterator>
#include <set>

#include "agent/change/interface_settings.h"
#include "agent/change/kept_host.h"
#include "agent/change/kernel_network.h"
#include "agent/change/settled.h"
#include "agent/core/command_deadline.h"
#include "agent/keep/way.h"
#include "agent/undo/networkd_links.h"
#include "framework/qx/whole_number.h"

namespace cvagent::change {

namespace {

using keep::Wish;

constexpr const char* kDhcp = "1";
constexpr const char* kStatic = "static";

/// What the plug-in has written, with what is known of the interface.
struct Written {
    std::string value;
    InterfaceSettings file;
    keep::AddressText running;  ///< of IPv4; "" for none
    keep::AddressText running6;
    std::optional<Ip> runningGateway;  ///< of IPv4, on this link

    /// The plug-in passes a write over while its file says that the address comes by DHCP. Where there is no
    /// file it has none to pass over.
    bool is(const std::string& inFile) const { return file.origin.empty() || inFile == value; }
};

// One function a property: what is to be kept. An empty wish when the plug-in has not written it.

Wish wishOfOrigin(const Written& written) {
    Wish wish;
    const bool isDhcp = written.value == kDhcp;
    if (written.file.origin.empty() || written.file.origin.starts_with(isDhcp ? "dhcp" : kStatic)) {
        wish.dhcp = isDhcp;
    }
    return wish;
}

/// The running one where the new address can reach it: a lease takes its gateway along.
std::optional<std::string> likelyGateway(const Written& written, std::optional<unsigned> prefix) {
    const auto address = Ip::parse(written.value);
    const auto& gateway = written.runningGateway;
    const bool isNear =
        address && gateway && prefix && *address != *gateway && address->sharesPrefix(*gateway, *prefix);
    return isNear ? std::optional(gateway->text()) : std::nullopt;
}

Wish wishOfAddress(const Written& written) {
    Wish wish;
    if (written.is(written.file.ipv4Address)) {
        wish.dhcp = false;
        wish.ipv4.address = written.value;
        const auto inFile = prefixOfMask(written.file.mask);
        wish.ipv4.likelyPrefix = written.running.prefix ? written.running.prefix : inFile;
        wish.ipv4.likelyOld = written.running.address;
        wish.ipv4.likelyGateway = likelyGateway(written, wish.ipv4.likelyPrefix);
    }
    return wish;
}

Wish wishOfMask(const Written& written) {
    Wish wish;
    if (written.is(written.file.mask)) {
        wish.ipv4.prefix = prefixOfMask(written.value);
        wish.ipv4.likelyOld = written.running.address;
    }
    return wish;
}

Wish wishOfGateway(const Written& written) {
    Wish wish;
    if (written.file.origin.empty() || isDefaultInRoutesFile(written.value)) {
        wish.ipv4.gateway = written.value;
    }
    return wish;
}

Wish wishOfIpv6Address(const Written& written) {
    Wish wish;
    if (written.is(written.file.ipv6Address)) {
        wish.ipv6.address = written.value;
        const auto inFile = prefixIn(written.file);
        wish.ipv6.likelyPrefix = inFile ? inFile : written.running6.prefix;
        wish.ipv6.likelyOld = written.running6.address;
    }
    return wish;
}

Wish wishOfPrefixLength(const Written& written) {
    Wish wish;
    if (written.is(written.file.prefixLength)) {
        wish.ipv6.prefix = prefixLengthIn(written.value);
        wish.ipv6.likelyOld = written.running6.address;
    }
    return wish;
}

/// The plug-in writes it while the address is static, to a file that tells nothing else of it.
Wish wishOfIpv6Gateway(const Written& written) {
    Wish wish;
    if (written.file.origin.empty() || written.file.origin.starts_with(kStatic)) {
        wish.ipv6.gateway = written.value;
    }
    return wish;
}

// Whether the running host alone is to have it where nobody keeps the interface: what the agent brings there
// itself, and no file of the plug-in's has.

bool never(const Written& /*written*/) {
    return false;
}

bool hasNoFile(const Written& written) {
    return !written.file.isThere;
}

bool hasNoRoute(const Written& written) {
    return !written.file.isThere && !isDefaultInRoutesFile(written.value);
}

struct KeptProperty {
    unsigned int property;
    Wish (*wish)(const Written& written);
    bool (*isForNow)(const Written& written);
};
constexpr KeptProperty kKept[] = {{24, wishOfOrigin, never},           {25, wishOfAddress, hasNoFile},
                                  {26, wishOfMask, hasNoFile},         {27, wishOfIpv6Address, hasNoFile},
                                  {100, wishOfGateway, hasNoRoute},    {101, wishOfIpv6Gateway, never},
                                  {102, wishOfPrefixLength, hasNoFile}};

keep::AddressText runningOn(const KernelNetwork& network, unsigned link, bool isIpv6) {
    const KernelAddress* address = network.mainAddress(link, isIpv6);
    return address == nullptr ? keep::AddressText{"", std::nullopt}
                              : keep::AddressText{address->ip.text(), address->prefix};
}

std::optional<Ip> gatewayOn(const KernelNetwork& network, unsigned link) {
    const KernelRoute* best = nullptr;
    for (const KernelRoute& each : network.routes) {
        const bool isOne = each.link == link && !each.destination.isIpv6 && each.isDefault() &&
                           each.gateway && each.table == RT_TABLE_MAIN && each.type == RTN_UNICAST;
        best = isOne && (best == nullptr || each.metric < best->metric) ? &each : best;
    }
    return best == nullptr ? std::nullopt : best->gateway;
}

std::string placesOf(const keep::Way& way) {
    std::string places;
    for (const keep::FileEdit& each : way.files) {
        if (each.after) {
            places += (places.empty() ? "" : " and ") + each.path;
        }
    }
    return places.empty() ? "" : ", in " + places;
}

/// @return what a person should know of it, behind where it is kept
std::string waitUntilInForce(const keep::Way& way, const keep::Link& link, const Wish& wish,
                             const KernelNetwork& before, const undo::NetworkdLinks& links) {
    const Settled now = settled(link, wish, before);
    const bool isReload = std::ranges::find(way.callsAfter, undo::kNetworkdReload) != way.callsAfter.end();
    const bool isLate = isReload && !now.lacksLease && !links.waitUntilSetUp();
    return (isLate ? ", but systemd-networkd has not set the interface up in time" : "") +
           (now.note.empty() ? "" : "; " + now.note);
}

bool isNobody(const keep::Keeper& keeper) {
    return keeper.claims.empty() && keeper.unknown.empty();
}

struct Terms {
    bool isTried;   ///< nobody is reached, and waited for
    bool isForNow;  ///< where nobody keeps the interface the running host alone is to have the value
};
/// What is done with what is to be kept.
using Act = Kept (*)(const keep::Link& link, const Wish& wish, const Terms& terms);

Kept keepWith(const keep::Link& link, const Wish& wish, const Terms& terms) {
    const keep::Keeper keeper = keep::keeperOf(link);
    if (isNobody(keeper)) {
        return terms.isForNow
                   ? Kept{false, "not kept over a restart: nobody is known who keeps '" + link.name + "'",
                          false, true}
                   : Kept();
    }
    try {
        const keep::Way way = keep::wayToKeep(link, keeper, wish);
        const CommandScope scope(
            CommandScope::write);  // its commands have a write's time, and are told as its
        const KernelNetwork before = KernelNetwork::read();
        const undo::NetworkdLinks links(link.index);
        goWithLease(way, link);
        const bool isWaitedFor = !terms.isTried && !way.isEmpty();
        const std::string note = isWaitedFor ? waitUntilInForce(way, link, wish, before, links) : "";
        return {true, "kept over a restart by " + way.system + placesOf(way) + note, terms.isTried};
    } catch (const keep::CannotKeep& cannot) {
        return {false, "not kept over a restart: " + std::string(cannot.what())};
    }
}

/// Whether nothing would have to be changed for it.
Kept keptAlready(const keep::Link& link, const Wish& wish, const Terms& terms) {
    try {
        const keep::Keeper keeper = keep::keeperOf(link);
        return {(isNobody(keeper) && terms.isForNow) || keep::wayToKeep(link, keeper, wish).isEmpty(), {}};
    } catch (const keep::CannotKeep&) {
        return {};
    }
}

const KeptProperty* keptProperty(const Property& row) {
    const auto* found = std::ranges::find(kKept, row.id, &KeptProperty::property);
    return row.type == NodeType::ipConfig && found != std::end(kKept) ? found : nullptr;
}

void addOnce(const std::vector<std::string>& some, std::vector<std::string>& all) {
    std::ranges::copy_if(some, std::back_inserter(all), [&all](const std::string& each) {
        return std::ranges::find(all, each) == all.end();
    });
}

/// None where the system could not be asked to keep anything of the link.
void addCallsOf(const keep::Link& link, undo::KeeperCalls& calls) {
    try {
        const keep::Way way = keep::wayToKeep(link, keep::keeperOf(link), {});
        std::vector<std::string> files;
        std::ranges::transform(way.files, std::back_inserter(files), &keep::FileEdit::path);
        addOnce(files, calls.files);
        addOnce(way.callsBefore, calls.before);
        addOnce(way.callsAfter, calls.after);
    } catch (const keep::CannotKeep&) {
        return;
    }
}

}  // namespace

undo::KeeperCalls keeperCallsFor(const std::vector<MeantChange>& changes) {
    std::set<std::string> interfaces;
    for (const MeantChange& change : changes) {
        if (keptProperty(*change.row) != nullptr || isKeptWithInterface(*change.row)) {
            interfaces.insert(interfaceNameOf(*change.node));
        }
    }
    const KernelNetwork network = interfaces.empty() ? KernelNetwork() : KernelNetwork::read();
    undo::KeeperCalls calls;
    for (const std::string& interface : interfaces) {
        if (const KernelLink* link = network.link(interface); link != nullptr) {
            addCallsOf({link->name, link->index}, calls);
        }
    }
    addCallsOfHost(changes, calls);
    return calls;
}

namespace {

/// @return does something with what is to be kept of the value, unless the plug-in's file says otherwise by
/// then; none for what is not about an interface of the kernel's
std::function<Kept()> withWish(const IC::MutableNode& node, const Property& row,
                               const IC::PropertyValue& value, Act act, bool isTried) {
    const KeptProperty* kept = keptProperty(row);
    if (kept == nullptr) {
        return nullptr;
    }
    const KernelNetwork network = KernelNetwork::read();
    const KernelLink* link = network.link(interfaceNameOf(node));
    if (link == nullptr) {
        return nullptr;
    }
    Written before{static_cast<std::string>(value),
                   {},
                   runningOn(network, link->index, false),
                   runningOn(network, link->index, true),
                   gatewayOn(network, link->index)};
    return [link = keep::Link{link->name, link->index}, written = std::move(before), kept, act, isTried] {
        Written now = written;
        now.file = settingsOf(link.name);
        const Wish wish = kept->wish(now);
        return wish.isEmpty() ? Kept() : act(link, wish, {isTried, kept->isForNow(now)});
    };
}

}  // namespace

std::function<Kept()> keepingOverRestart(const IC::MutableNode& node, const Property& row,
                                         const IC::PropertyValue& value, bool isTried) {
    return withWish(node, row, value, keepWith, isTried);
}

bool isKeptAlready(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value) {
    const std::function<Kept()> look = withWish(node, row, value, keptAlready, false);
    return look && look().isKept;
}

}  // namespace cvagent::change
