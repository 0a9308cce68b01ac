#include "agent/verify/kernel.h"

#include <linux/ethtool.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <algorithm>
#include <sstream>

#include "hosttools/addresses.h"
#include "hosttools/descriptor.h"
#include "hosttools/files.h"

#ifndef IFF_LOWER_UP
#define IFF_LOWER_UP 0x10000
#endif

namespace cvagent::verify {

namespace {

constexpr unsigned kGlobalScope = 0;

}  // namespace

Kernel::Kernel() : problem_(hosttools::readInterfaces({}, interfaces_)) {}

const hosttools::Link* Kernel::link(const std::string& name) const {
    const auto found = std::ranges::find(interfaces_.links, name, &hosttools::Link::name);
    return found == interfaces_.links.end() ? nullptr : &*found;
}

bool Kernel::hasCarrier(const std::string& name) const {
    const hosttools::Link* found = link(name);
    return found != nullptr && (found->flags & IFF_LOWER_UP) != 0;
}

Kernel::LinkMode Kernel::modeOf(const std::string& name) {
    const hosttools::Descriptor socket(::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    ethtool_cmd settings{};
    settings.cmd = ETHTOOL_GSET;
    ifreq request{};
    name.copy(request.ifr_name, IFNAMSIZ - 1);
    request.ifr_data = reinterpret_cast<char*>(&settings);
    if (!socket.isOpen() || name.size() >= IFNAMSIZ || ioctl(socket.get(), SIOCETHTOOL, &request) != 0) {
        return {};
    }
    constexpr unsigned kUnknown = 0xFFFF;  // of its lower half, too
    const unsigned speed = ethtool_cmd_speed(&settings);
    return {speed == kUnknown || speed == ~0U ? 0 : speed, settings.duplex == DUPLEX_FULL};
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
    std::istringstream lines(hosttools::readFile("/proc/net/route").value_or(""));
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

}  // namespace cvagent::verify
