#include "plugins/hardware/network/link_driver.h"

#include <linux/ethtool.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <string_view>

#include "plugins/hardware/host.h"

namespace hardware {

namespace {

constexpr std::size_t kLongestAddress = 32;

bool call(int control, const std::string& link, void* request) {
    ifreq named{};
    if (link.size() >= sizeof named.ifr_name) {
        return false;
    }
    std::copy(link.begin(), link.end(), std::begin(named.ifr_name));
    named.ifr_data = static_cast<char*>(request);
    return ioctl(control, SIOCETHTOOL, &named) == 0;
}

/// A field of fixed length that need not end with NUL. "N/A" is the kernel's word for none.
template <std::size_t size>
std::optional<std::string> told(const char (&field)[size]) {
    const std::string text = printable(trimmed(std::string(field, strnlen(field, size))));
    return text.empty() || text == "N/A" ? std::nullopt : std::optional(text);
}

std::optional<std::string> permanentAddress(int control, const std::string& link) {
    // The kernel's own structure ends in a field of no length; here are its bytes and the address behind
    // them.
    alignas(ethtool_perm_addr) std::array<unsigned char, sizeof(ethtool_perm_addr) + kLongestAddress>
        answer{};
    ethtool_perm_addr head{};
    head.cmd = ETHTOOL_GPERMADDR;
    head.size = kLongestAddress;
    std::memcpy(answer.data(), &head, sizeof head);
    if (!call(control, link, answer.data())) {
        return std::nullopt;
    }
    std::memcpy(&head, answer.data(), sizeof head);
    const auto begin = answer.begin() + sizeof head;
    const auto end = begin + static_cast<std::ptrdiff_t>(std::min<std::size_t>(head.size, kLongestAddress));
    if (std::all_of(begin, end, [](unsigned char byte) { return byte == 0; })) {
        return std::nullopt;
    }
    std::string text;
    for (auto byte = begin; byte != end; ++byte) {
        constexpr std::string_view kDigits = "0123456789abcdef";
        text += {kDigits[*byte >> 4U], kDigits[*byte & 0xfU], ':'};
    }
    text.pop_back();
    return text;
}

}  // namespace

LinkDriver askDriver(const std::string& link) {
    LinkDriver driver;
    const int control = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (control < 0) {
        return driver;
    }
    ethtool_drvinfo info{};
    info.cmd = ETHTOOL_GDRVINFO;
    if (call(control, link, &info)) {
        driver.name = told(info.driver);
        driver.firmware = told(info.fw_version);
        driver.bus = told(info.bus_info);
    }
    driver.permanentAddress = permanentAddress(control, link);
    close(control);
    return driver;
}

}  // namespace hardware
