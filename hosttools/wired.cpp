#include "hosttools/wired.h"

#include <net/if_arp.h>
#include <sys/stat.h>
#include <unistd.h>
#include <algorithm>
#include <array>
#include <functional>
#include <map>
#include <span>

#include "hosttools/files.h"

namespace hosttools {
namespace {

using Names = std::span<const std::string_view>;

enum class Standing { wired, byName, out };

constexpr auto classicParts = std::to_array<std::string_view>({"eth", "bond", "usb"});

// By the kind that netlink tells or the DEVTYPE of uevent: either can be missing.
constexpr auto wirelessTypes = std::to_array<std::string_view>({"wlan", "wwan", "wimax", "bluetooth"});
constexpr auto tunnelTypes = std::to_array<std::string_view>(
    {"tun",    "gre",       "gretap",  "erspan", "ip6gre", "ip6gretap", "ip6erspan", "ipip",
     "ip6tnl", "sit",       "vti",     "vti6",   "xfrm",   "vxlan",     "geneve",    "bareudp",
     "gtp",    "wireguard", "l2tpeth", "ppp",    "amt",    "ovpn"});
constexpr auto wiredTypes = std::to_array<std::string_view>({"vlan", "bond"});
constexpr std::uint64_t hardwareIp6Gre = 823;  // not among the C library's
constexpr auto tunnelHardware =
    std::to_array<std::uint64_t>({ARPHRD_TUNNEL, ARPHRD_TUNNEL6, ARPHRD_SIT, ARPHRD_IPGRE, hardwareIp6Gre,
                                  ARPHRD_PPP, ARPHRD_SLIP, ARPHRD_NONE, ARPHRD_RAWIP});

bool isAmong(Names names, std::string_view name) {
    return std::ranges::find(names, name) != names.end();
}

/// One interface, asked for what tells its kind.
class Interface {
public:
    Interface(const std::string& directory, const Link* link) : directory_(directory), link_(link) {
        const std::string text = readFile(directory + "/uevent").value_or("");
        for (std::string_view rest = text; !rest.empty();) {
            const std::string_view line = takeLine(rest);
            if (line.starts_with("DEVTYPE=")) type_ = line.substr(line.find('=') + 1);
        }
        hardware_ = readNumber(directory + "/type");
    }

    Standing standing() const {
        if (is(wirelessTypes) || has("phy80211") || has("wireless")) return Standing::out;
        if (is(tunnelTypes) || has("tun_flags")) return Standing::out;
        if (std::ranges::find(tunnelHardware, hardware_) != tunnelHardware.end()) return Standing::out;
        if (is(wiredTypes) || has("bonding")) return Standing::wired;
        if (hardware_ != ARPHRD_ETHER) return Standing::byName;
        if (has("device")) return Standing::wired;
        if (!isVeth()) return Standing::byName;
        return isBridged() ? Standing::out : Standing::wired;
    }

private:
    bool has(const char* name) const {
        struct stat there {};
        return lstat((directory_ + "/" + name).c_str(), &there) == 0;
    }
    bool is(Names types) const {
        return isAmong(types, type_) || (link_ != nullptr && isAmong(types, link_->kind));
    }
    /// Without word from netlink: one end of a pair points to the other one's index; a dummy points to
    /// itself, and an interface on top of another has that one's name in a link.
    bool isVeth() const {
        if (link_ != nullptr && !link_->kind.empty()) return link_->kind == "veth";
        const std::uint64_t peer = readNumber(directory_ + "/iflink");
        const auto names = listDirectory(directory_);
        return type_.empty() && peer != 0 && peer != readNumber(directory_ + "/ifindex") &&
               std::ranges::none_of(names,
                                    [](const std::string& name) { return name.starts_with("lower_"); });
    }
    bool isBridged() const {
        return has("brport") ||
               (link_ != nullptr && (link_->memberOf == "bridge" || link_->memberOf == "openvswitch"));
    }

    const std::string& directory_;
    const Link* link_;
    std::string type_;
    std::uint64_t hardware_ = 0;
};

/// Calls visit(line, name, standing) for each interface of /proc/net/dev.
void eachInterface(std::string_view devices, const std::string& sysfs, const Interfaces& known,
                   const std::function<void(std::string_view, std::string_view, Standing)>& visit) {
    std::map<std::string_view, const Link*> links;
    for (const Link& link : known.links) links[link.name] = &link;
    while (!devices.empty()) {
        const std::string_view line = takeLine(devices);
        const std::size_t colon = line.find(':');
        std::string_view before = line.substr(0, colon);
        const std::string_view name = takeWord(before);
        const bool isPath = name == "." || name == ".." || name.find('/') != name.npos;
        if (colon == line.npos || name.empty() || isPath) continue;
        const auto link = links.find(name);
        const std::string directory = sysfs + "/" + std::string(name);
        visit(line, name, Interface(directory, link != links.end() ? link->second : nullptr).standing());
    }
}

}  // namespace

bool isClassicName(std::string_view name) {
    return std::ranges::any_of(classicParts,
                               [&](std::string_view part) { return name.find(part) != name.npos; });
}

std::string wiredLines(std::string_view devices, const std::string& sysfs, const Interfaces& known) {
    std::string lines;
    eachInterface(
        devices, sysfs, known, [&](std::string_view line, std::string_view name, Standing standing) {
            if (standing == Standing::wired || (standing == Standing::byName && isClassicName(name))) {
                lines.append(line).append("\n");
            }
        });
    return lines;
}

bool haveClassicNames(std::string_view devices, const std::string& sysfs, const Interfaces& known) {
    bool classic = true;
    eachInterface(devices, sysfs, known, [&](std::string_view, std::string_view name, Standing standing) {
        classic = classic && (standing != Standing::wired || isClassicName(name));
    });
    return classic;
}

}  // namespace hosttools
