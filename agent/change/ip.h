#pragma once

#include <array>
#include <compare>
#include <cstdint>
#include <optional>
#include <string>

namespace cvagent::change {

/// An IPv4 or IPv6 address.
struct Ip {
    bool isIpv6 = false;
    std::array<std::uint8_t, 16> bytes{};  ///< of IPv4 the first four

    auto operator<=>(const Ip&) const = default;

    /// Nothing for a text that is none.
    static std::optional<Ip> parse(const std::string& text);
    std::string text() const;
    unsigned bits() const { return isIpv6 ? 128 : 32; }
    bool isLinkLocal() const;
    /// Whether the two agree in their first bits.
    bool sharesPrefix(const Ip& other, unsigned prefix) const;
    /// The same with the bits behind the prefix all zero, all one.
    Ip first(unsigned prefix) const;
    Ip last(unsigned prefix) const;
};

/// The length of a contiguous mask in dotted form; nothing for any other text.
std::optional<unsigned> prefixOfMask(const std::string& mask);

}  // namespace cvagent::change
