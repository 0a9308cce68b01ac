#include "hosttools/link_settings.h"

#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <algorithm>
#include <cerrno>

#include "hosttools/netlink.h"

namespace hosttools {

DriverCalls::DriverCalls(std::string_view name)
    : socket_(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0)), name_(name) {}

int DriverCalls::ask(void* data) const {
    // The call would take the beginning of a longer name for the whole.
    if (name_.size() >= IFNAMSIZ) return ENODEV;
    ifreq request{};
    name_.copy(request.ifr_name, IFNAMSIZ - 1);
    request.ifr_data = static_cast<char*>(data);
    return ioctl(socket_.get(), SIOCETHTOOL, &request) == 0 ? 0 : errno;
}

int LinkSettings::read(const DriverCalls& driver) {
    // Asked for masks of no words, the kernel answers with how many it has, as a negative number.
    if (const int error = fetch(driver, 0); error != 0) return error;
    const int words = -head().link_mode_masks_nwords;
    return words > 0 ? fetch(driver, words) : EOPNOTSUPP;
}

const ethtool_link_settings& LinkSettings::head() const {
    return *reinterpret_cast<const ethtool_link_settings*>(room_.data());
}

bool LinkSettings::has(Mask mask, unsigned bit) const {
    return bit / 32 < wordsOfAMask() && (word(mask, bit / 32) >> bit % 32 & 1U) != 0;
}

bool LinkSettings::any(Mask mask) const {
    for (std::size_t number = 0; number < wordsOfAMask(); ++number) {
        if (word(mask, number) != 0) return true;
    }
    return false;
}

int LinkSettings::fetch(const DriverCalls& driver, int words) {
    room_ = {};
    auto& asked = *reinterpret_cast<ethtool_link_settings*>(room_.data());
    asked.cmd = ETHTOOL_GLINKSETTINGS;
    asked.link_mode_masks_nwords = static_cast<std::int8_t>(words);
    return driver.ask(&asked);
}

std::size_t LinkSettings::wordsOfAMask() const {
    return static_cast<std::size_t>(std::max<int>(head().link_mode_masks_nwords, 0));
}

std::uint32_t LinkSettings::word(Mask mask, std::size_t number) const {
    return readPadded<std::uint32_t>(
        std::string_view(room_.data(), room_.size())
            .substr(sizeof(ethtool_link_settings) + 4 * (mask * wordsOfAMask() + number)));
}

}  // namespace hosttools
