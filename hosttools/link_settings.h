#pragma once

#include <linux/ethtool.h>
#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "hosttools/descriptor.h"

namespace hosttools {

/// The older calls about one interface, which its driver answers.
class DriverCalls {
public:
    /// @param name must outlive this
    explicit DriverCalls(std::string_view name);

    /// @param data a structure of <linux/ethtool.h> with its command in it; the answer comes there
    /// @return 0 or an error number: EOPNOTSUPP when the driver has no answer
    int ask(void* data) const;

private:
    Descriptor socket_;
    std::string_view name_;
};

/// Speed, duplex and negotiation of a link, and the modes that its ends know.
class LinkSettings {
public:
    enum Mask { supported, advertised, partner, masks };

    /// @return as DriverCalls::ask; EOPNOTSUPP from kernels before 4.6, too
    int read(const DriverCalls& driver);

    const ethtool_link_settings& head() const;
    /// @param bit ETHTOOL_LINK_MODE_..._BIT
    bool has(Mask mask, unsigned bit) const;
    /// Whether the mask has any bits at all.
    bool any(Mask mask) const;

private:
    // The kernel counts the words of its masks in a signed byte.
    static constexpr std::size_t mostWords = 127;

    int fetch(const DriverCalls& driver, int words);
    std::size_t wordsOfAMask() const;
    std::uint32_t word(Mask mask, std::size_t number) const;

    alignas(ethtool_link_settings)
        std::array<char, sizeof(ethtool_link_settings) + masks * mostWords * sizeof(std::uint32_t)> room_{};
};

}  // namespace hosttools
