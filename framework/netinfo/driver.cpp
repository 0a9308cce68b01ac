#include "framework/netinfo/driver.h"

#include <linux/ethtool.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <new>

namespace netinfo {
namespace {

constexpr unsigned int addressLength = 6;

/// Asks the driver; `request` starts with the number of the question and takes the answer.
bool ask(const std::string& interface, void* request) {
    ifreq frame{};
    if (interface.size() >= sizeof(frame.ifr_name)) {
        return false;
    }
    interface.copy(frame.ifr_name, sizeof(frame.ifr_name) - 1);
    frame.ifr_data = static_cast<char*>(request);
    const int channel = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (channel < 0) {
        return false;
    }
    const bool answered = ioctl(channel, SIOCETHTOOL, &frame) == 0;
    close(channel);
    return answered;
}

}  // namespace

std::string driverName(const std::string& interface) {
    ethtool_drvinfo information{};
    information.cmd = ETHTOOL_GDRVINFO;
    if (!ask(interface, &information)) {
        return {};
    }
    return {information.driver, strnlen(information.driver, sizeof(information.driver))};
}

std::string driverPermanentAddress(const std::string& interface) {
    constexpr std::size_t room = 32;
    alignas(ethtool_perm_addr) std::array<unsigned char, sizeof(ethtool_perm_addr) + room> buffer{};
    auto* const request = new (buffer.data()) ethtool_perm_addr{};
    request->cmd = ETHTOOL_GPERMADDR;
    request->size = room;
    if (!ask(interface, request) || request->size != addressLength) {
        return {};
    }
    std::string text;
    for (unsigned int index = 0; index < addressLength; ++index) {
        std::array<char, 4> digits{};
        const unsigned int byte = buffer[sizeof(ethtool_perm_addr) + index];
        std::snprintf(digits.data(), digits.size(), "%s%02x", index == 0 ? "" : ":", byte);
        text += digits.data();
    }
    return text;
}

}  // namespace netinfo
