#include "framework/netinfo/sysfs.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <fstream>
#include <string_view>

#include "framework/qx/whole_number.h"

namespace netinfo {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kEthernet = "1";  // ARPHRD_ETHER
constexpr unsigned long kInterfaceUp = 0x1;  // IFF_UP

// Kinds by the DEVTYPE of uevent. Others (dsa, gadget) are ports of their own.
constexpr std::array<std::string_view, 14> kUpperTypes{"bond",    "bridge",  "vlan",   "wlan",     "wwan",
                                                       "macvlan", "macvtap", "ipvlan", "vxlan",    "geneve",
                                                       "macsec",  "hsr",     "batadv", "bluetooth"};
// Kinds by a file or directory that only they have.
constexpr std::array<std::string_view, 5> kUpperMarks{"bonding", "bridge", "tun_flags", "phy80211",
                                                      "wireless"};

std::string firstLine(const fs::path& file) {
    std::ifstream in(file);
    std::string line;
    std::getline(in, line);
    return line;
}

bool isThere(const fs::path& path) {
    std::error_code ignored;
    return fs::exists(path, ignored);
}

std::string deviceType(const fs::path& link) {
    constexpr std::string_view kKey = "DEVTYPE=";
    std::ifstream in(link / "uevent");
    for (std::string line; std::getline(in, line);) {
        if (line.starts_with(kKey)) {
            return line.substr(kKey.size());
        }
    }
    return {};
}

/// A link below it marks VLANs, teams and the like, whatever their type says. A port of a built-in switch has
/// one too, but is hardware.
bool hasLower(const fs::path& link) {
    std::error_code ignored;
    for (fs::directory_iterator entry(link, ignored), end; entry != end; entry.increment(ignored)) {
        if (entry->path().filename().string().starts_with("lower_")) {
            return true;
        }
    }
    return false;
}

bool isUpper(const fs::path& link, const std::string& type, bool hardware) {
    return std::ranges::find(kUpperTypes, type) != kUpperTypes.end() ||
           std::ranges::any_of(kUpperMarks, [&](std::string_view mark) { return isThere(link / mark); }) ||
           (!hardware && hasLower(link));
}

bool isUp(const fs::path& link) {
    const std::string text = firstLine(link / "flags");  // 0x1003
    const auto flags =
        text.starts_with("0x") ? QX::wholeNumber<unsigned long>(text.substr(2), 16) : std::nullopt;
    return (flags.value_or(0) & kInterfaceUp) != 0;
}

/// The members of a bond all show the bond's address; what they had before is kept aside.
std::string permanentAddress(const fs::path& link) {
    std::string kept = firstLine(link / "bonding_slave" / "perm_hwaddr");
    if (!kept.empty()) {
        return kept;
    }
    const bool original = firstLine(link / "addr_assign_type") == "0";
    return original ? firstLine(link / "address") : "";
}

/// One end of a pair points to the other one's index; a dummy points to itself.
bool isPaired(const fs::path& link) {
    const std::string peer = firstLine(link / "iflink");
    return !peer.empty() && peer != "0" && peer != firstLine(link / "ifindex");
}

Link describe(const fs::path& path) {
    Link link;
    link.name = path.filename().string();
    const std::string type = deviceType(path);
    std::error_code noDevice;
    const fs::path device = fs::read_symlink(path / "device", noDevice);
    link.hardware = !noDevice;
    link.controller = link.hardware ? device.filename().string() : link.name;
    link.vlan = type == "vlan";
    link.upper = isUpper(path, type, link.hardware);
    link.paired = !link.hardware && !link.upper && isPaired(path);
    link.up = isUp(path);
    link.permanentAddress = permanentAddress(path);
    return link;
}

}  // namespace

std::optional<std::vector<Link>> readLinks(const std::string& directory) {
    std::error_code problem;
    fs::directory_iterator entry(directory, problem);
    std::vector<Link> links;
    for (const fs::directory_iterator end; !problem && entry != end; entry.increment(problem)) {
        if (firstLine(entry->path() / "type") == kEthernet) {
            links.push_back(describe(entry->path()));
        }
    }
    if (problem) {
        return {};
    }
    std::ranges::sort(links, {}, &Link::name);
    return links;
}

std::string readAttribute(const std::string& directory, const std::string& link,
                          const std::string& attribute) {
    if (link.empty() || link.front() == '.' || link.find('/') != std::string::npos) {
        return {};
    }
    return firstLine(fs::path(directory) / link / attribute);
}

}  // namespace netinfo
