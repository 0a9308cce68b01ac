#include "agent/verify/kernel.h"

#include <net/if.h>
#include <net/route.h>

#include <algorithm>
#include <filesystem>
#include <system_error>

#include "agent/core/host_file.h"
#include "hosttools/addresses.h"
#include "hosttools/files.h"

#ifndef IFF_LOWER_UP
#define IFF_LOWER_UP 0x10000
#endif

namespace cvagent::verify {

namespace {

constexpr unsigned kGlobalScope = 0;

std::string placeOf(const std::string& name, const std::string& file) {
    return "/sys/class/net/" + name + "/" + file;
}

}  // namespace

std::istringstream linesOf(const std::string& path) {
    return std::istringstream(contentOf(path).value_or(""));
}

Kernel::Kernel() : problem_(hosttools::readInterfaces({}, interfaces_)) {}

const hosttools::Link* Kernel::link(const std::string& name) const {
    const auto found = std::ranges::find(interfaces_.links, name, &hosttools::Link::name);
    return found == interfaces_.links.end() ? nullptr : &*found;
}

bool Kernel::hasCarrier(const std::string& name) const {
    const hosttools::Link* found = link(name);
    return found != nullptr && (found->flags & IFF_LOWER_UP) != 0;
}

bool Kernel::isUp(const std::string& name) const {
    const hosttools::Link* found = link(name);
    return found != nullptr && (found->flags & IFF_UP) != 0;
}

std::string Kernel::attribute(const std::string& name, const std::string& file) {
    return hosttools::readFirstLine(placeOf(name, file));
}

std::string Kernel::bondOf(const std::string& name) {
    std::error_code unknown;
    const bool isMember = std::filesystem::is_directory(placeOf(name, "bonding_slave"), unknown);
    return isMember ? std::filesystem::read_symlink(placeOf(name, "master"), unknown).filename().string()
                    : "";
}

std::optional<hosttools::LinkSettings> Kernel::settingsOf(const std::string& name) {
    hosttools::LinkSettings settings;
    return settings.read(hosttools::DriverCalls(name)) == 0 ? std::optional(settings) : std::nullopt;
}

bool Kernel::tellsWakeOnLan(const std::string& name) {
    ethtool_wolinfo told{};
    told.cmd = ETHTOOL_GWOL;
    return hosttools::DriverCalls(name).ask(&told) == 0;
}

const hosttools::InetAddress* Kernel::inet(const std::string& name) const {
    const auto found = std::ranges::find(interfaces_.inet, name, &hosttools::InetAddress::label);
    return found == interfaces_.inet.end() ? nullptr : &*found;
}

std::vector<std::pair<std::string, unsigned>> Kernel::inet6(const std::string& name) const {
    std::vector<std::pair<std::string, unsigned>> found;
    for (const hosttools::Inet6Address& address : interfaces_.inet6) {
        if (address.link == name && address.scope == kGlobalScope) {
            found.emplace_back(hosttools::textOf(address.address), address.prefix);
        }
    }
    return found;
}

std::vector<std::string> Kernel::gateways(const std::string& name) {
    std::istringstream lines = linesOf("/proc/net/route");
    std::vector<std::string> found;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string link;
        std::string destination;
        unsigned gateway = 0;
        if (words >> link >> destination >> std::hex >> gateway && destination == "00000000" &&
            gateway != 0 && (name.empty() || link == name)) {
            found.push_back(hosttools::textOf(in_addr{gateway}));
        }
    }
    return found;
}

std::vector<std::string> Kernel::inet6Gateways(const std::string& name) {
    std::istringstream lines = linesOf("/proc/net/ipv6_route");
    std::vector<std::string> found;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string skipped;
        std::string gateway;
        std::string link;
        unsigned flags = 0;
        in6_addr address{};
        // destination, length, source, length, gateway, metric, references, use, flags, link
        words >> skipped >> skipped >> skipped >> skipped >> gateway >> skipped >> skipped >> skipped;
        if (words >> std::hex >> flags >> link && link == name && (flags & RTF_GATEWAY) != 0 &&
            hosttools::parsePlainInet6(gateway, address)) {
            found.push_back(hosttools::textOf(address));
        }
    }
    return found;
}

}  // namespace cvagent::verify
