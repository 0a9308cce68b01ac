#include "framework/netinfo/driver.h"

#include <linux/ethtool.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <new>

#include "framework/qx/hex.h"

namespace netinfo {
namespace {

constexpr unsigned int kAddressLength = 6;

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
    constexpr std::size_t kRoom = 32;
    alignas(ethtool_perm_addr) std::array<unsigned char, sizeof(ethtool_perm_addr) + kRoom> buffer{};
    auto* const request = new (buffer.data()) ethtool_perm_addr{};
    request->cmd = ETHTOOL_GPERMADDR;
    request->size = kRoom;
    if (!ask(interface, request) || request->size != kAddressLength) {
        return {};
    }
    std::string text;
    for (unsigned int index = 0; index < kAddressLength; ++index) {
        const unsigned int byte = buffer[sizeof(ethtool_perm_addr) + index];
        text += {QX::kHexDigits[byte >> 4U], QX::kHexDigits[byte & 0xfU], ':'};
    }
    text.pop_back();
    return text;
}

}  // namespace netinfo
