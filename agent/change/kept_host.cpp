#include "agent/change/kept_host.h"

#include <sys/utsname.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <iterator>
#include <thread>

#include "agent/change/interface_settings.h"
#include "agent/change/kernel_network.h"
#include "agent/change/settled.h"
#include "agent/core/command_deadline.h"
#include "agent/keep/host_settings.h"
#include "framework/qx/whole_number.h"
#include "framework/qx/zone_table.h"

namespace cvagent::change {

namespace {

using keep::CannotKeep;
using keep::Way;
using keep::Wish;

constexpr const char* kZoneLink = "/etc/localtime";

struct HostsValue {
    const IC::PropertyValue& value;
    std::string interface;  ///< of the node that was written to
    bool isNameInOldFile;   ///< see keep/host_settings.h; before the write
    bool isTried;

    std::string text() const { return static_cast<std::string>(value); }
};

Kept keptIn(const Way& way, std::string places) {
    for (const keep::FileEdit& each : way.files) {
        places += each.after ? (places.empty() ? "" : " and ") + each.path : "";
    }
    const std::string by = way.system.empty() ? "" : " by " + way.system + ",";
    return {!way.callsAfter.empty(), "kept over a restart" + by + " in " + places};
}

std::string kernelsName() {
    utsname names{};
    return uname(&names) == 0 ? static_cast<const char*>(names.nodename) : "";
}

/// By the file alone where systemd-hostnamed does not answer after all.
Kept keepName(const std::string& name, const HostsValue& written) {
    if (written.isNameInOldFile) {
        return {false, "kept over a restart in " + keep::oldNameFileWith(name)};
    }
    Way way = keep::wayOfHostName(name);
    try {
        keep::go(way);
    } catch (const CannotKeep&) {
        if (way.callsBefore.empty()) {
            throw;
        }
        way.callsBefore.clear();
        way.system.clear();
        keep::go(way);
    }
    return keptIn(way, "");
}

Kept keepHostName(const HostsValue& written) {
    const std::string name = kernelsName();
    if (name != written.text() && !name.starts_with(written.text() + ".")) {
        throw CannotKeep("the running host has another name");
    }
    return keepName(name, written);
}

Kept keepDomainName(const HostsValue& written) {
    const std::string name = kernelsName();
    const std::string domain = written.text();
    if (domain.empty() ? name.find('.') != std::string::npos : !name.ends_with("." + domain)) {
        throw CannotKeep("the running host has another name");
    }
    return keepName(name, written);
}

Kept keepZone(const HostsValue& written) {
    const auto minutes = QX::wholeNumber<int>(written.text());
    const QX::Zone* zone = minutes ? QX::findZone(static_cast<unsigned int>(*minutes)) : nullptr;
    if (zone == nullptr) {
        return {};
    }
    const Way way = keep::wayOfZone(zone->file);
    keep::go(way);
    return keptIn(way, kZoneLink);
}

Wish wishOfLists(unsigned int property, const IC::PropertyValue& value) {
    constexpr unsigned int kListOfServers = 94;
    const auto* texts = value.asTexts();
    Wish wish;
    (property == kListOfServers ? wish.nameServers : wish.searchDomains) =
        texts != nullptr ? *texts : std::vector<std::string>();
    return wish;
}

/// It has been told and has answered by now; what is left to it is to write its file.
bool comesIntoForce(const keep::Resolver& resolver, const Wish& wish) {
    constexpr std::chrono::milliseconds kLook{50};
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(2);
    while (!keep::hasInForce(resolver, wish)) {
        if (std::chrono::steady_clock::now() >= end) {
            return false;
        }
        std::this_thread::sleep_for(kLook);
    }
    return true;
}

/// It has them with the interfaces that it keeps, or netplan for it; those of a lease stand behind them.
Kept keepWithInterface(const keep::Resolver& resolver, const HostsValue& written, const Wish& wish) {
    const std::string& interface = written.interface;
    const std::string& obstacle = resolver.obstacle;
    const KernelNetwork network = KernelNetwork::read();
    const KernelLink* link = network.link(interface);
    const keep::Link kernels = link == nullptr ? keep::Link() : keep::Link{link->name, link->index};
    const keep::Keeper keeper = link == nullptr ? keep::Keeper() : keep::keeperOf(kernels);
    if (keeper.system() != "NetworkManager" && keeper.system() != "netplan") {
        throw CannotKeep(obstacle + ", and does not keep '" + interface + "'");
    }
    try {
        const Way way = keep::wayToKeep(kernels, keeper, wish);
        goWithLease(way, kernels);
        return {true, keptIn(way, "").note, written.isTried || comesIntoForce(resolver, wish)};
    } catch (const CannotKeep& cannot) {
        throw CannotKeep(obstacle + ": " + cannot.what());
    }
}

template <unsigned int property>
Kept keepLists(const HostsValue& written) {
    const Wish wish = wishOfLists(property, written.value);
    const keep::Resolver resolver = keep::resolverOfHost();
    if (resolver.isWithInterface()) {
        return keepWithInterface(resolver, written, wish);
    }
    const Way way = keep::wayOfResolver(resolver, wish);
    keep::go(way);
    if (resolver.isFileItself()) {
        if (!keep::hasInForce(resolver, wish)) {
            throw CannotKeep("/etc/resolv.conf does not have it");
        }
        return keptIn(way, "/etc/resolv.conf");
    }
    Kept kept = keptIn(way, "");
    kept.isInForce = written.isTried || comesIntoForce(resolver, wish);
    if (kept.isInForce && !keep::hasInForce(keep::Resolver(), wish)) {
        kept.note += "; it uses them now, and /etc/resolv.conf goes on naming only systemd-resolved";
    }
    return kept;
}

struct HostsProperty {
    NodeType type;
    unsigned int property;
    Kept (*keep)(const HostsValue& written);
};
constexpr HostsProperty kHosts[] = {{NodeType::ipConfig, 94, keepLists<94>},
                                    {NodeType::ipConfig, 97, keepHostName},
                                    {NodeType::ipConfig, 98, keepDomainName},
                                    {NodeType::ipConfig, 99, keepLists<99>},
                                    {NodeType::computer, 127, keepZone}};

const HostsProperty* hostsProperty(const Property& row) {
    const auto* found = std::ranges::find_if(kHosts, [&row](const HostsProperty& each) {
        return each.type == row.type && each.property == row.id;
    });
    return found == std::end(kHosts) ? nullptr : found;
}

bool isOfResolver(const Property& row) {
    return row.type == NodeType::ipConfig && (row.id == 94 || row.id == 99);
}

}  // namespace

std::function<Kept()> keepingOfHost(const IC::MutableNode& node, const Property& row,
                                    const IC::PropertyValue& value, bool isTried) {
    const HostsProperty* property = hostsProperty(row);
    if (property == nullptr) {
        return nullptr;
    }
    return [value, interface = interfaceNameOf(node), isNameInOldFile = keep::isNameInOldFile(), isTried,
            keep = property->keep]() -> Kept {
        try {
            const CommandScope scope(CommandScope::write);
            return keep({value, interface, isNameInOldFile, isTried});
        } catch (const CannotKeep& cannot) {
            return {false, "not kept over a restart: " + std::string(cannot.what())};
        }
    };
}

void addCallsOfHost(const std::vector<MeantChange>& changes, undo::KeeperCalls& calls) {
    const bool isAny =
        std::ranges::any_of(changes, [](const MeantChange& each) { return isOfResolver(*each.row); });
    const keep::Resolver resolver = isAny ? keep::resolverOfHost() : keep::Resolver();
    if (!isAny || !resolver.obstacle.empty()) {
        return;
    }
    const Way way = keep::wayOfResolver(resolver, {});
    for (const keep::FileEdit& each : way.files) {
        const std::filesystem::path directory = std::filesystem::path(each.path).parent_path();
        if (!std::filesystem::exists(directory)) {
            calls.files.push_back(directory);
        }
        calls.files.push_back(each.path);
    }
    calls.after.insert(calls.after.end(), way.callsAfter.begin(), way.callsAfter.end());
}

bool isKeptWithInterface(const Property& row) {
    return isOfResolver(row) && keep::resolverOfHost().isWithInterface();
}

bool isInForceBySystem(const Property& row, const IC::PropertyValue& value) {
    if (!isOfResolver(row)) {
        return false;
    }
    const keep::Resolver resolver = keep::resolverOfHost();
    return (resolver.isWithInterface() || (!resolver.system.empty() && resolver.obstacle.empty())) &&
           keep::hasInForce(resolver, wishOfLists(row.id, value));
}

}  // namespace cvagent::change
