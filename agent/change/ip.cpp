#include "agent/change/ip.h"

#include <arpa/inet.h>

#include <cstring>

namespace cvagent::change {

namespace {

constexpr unsigned kByte = 8;

/// The bits of one byte of an address that stand behind the prefix.
std::uint8_t hostBits(std::size_t byte, unsigned prefix) {
    const unsigned before = static_cast<unsigned>(byte) * kByte;
    if (prefix <= before) {
        return 0xFF;
    }
    return prefix >= before + kByte ? 0 : static_cast<std::uint8_t>(0xFFU >> (prefix - before));
}

std::size_t lengthOf(const Ip& ip) {
    return ip.bits() / kByte;
}

}  // namespace

std::optional<Ip> Ip::parse(const std::string& text) {
    Ip ip;
    if (inet_pton(AF_INET, text.c_str(), ip.bytes.data()) == 1) {
        return ip;
    }
    ip.isIpv6 = true;
    return inet_pton(AF_INET6, text.c_str(), ip.bytes.data()) == 1 ? std::optional(ip) : std::nullopt;
}

std::string Ip::text() const {
    std::array<char, INET6_ADDRSTRLEN> shown{};
    inet_ntop(isIpv6 ? AF_INET6 : AF_INET, bytes.data(), shown.data(), shown.size());
    return shown.data();
}

bool Ip::isLinkLocal() const {
    return isIpv6 && bytes[0] == 0xFE && (bytes[1] & 0xC0U) == 0x80;
}

Ip Ip::first(unsigned prefix) const {
    Ip result = *this;
    for (std::size_t i = 0; i < lengthOf(*this); ++i) {
        result.bytes.at(i) &= static_cast<std::uint8_t>(~hostBits(i, prefix));
    }
    return result;
}

Ip Ip::last(unsigned prefix) const {
    Ip result = *this;
    for (std::size_t i = 0; i < lengthOf(*this); ++i) {
        result.bytes.at(i) |= hostBits(i, prefix);
    }
    return result;
}

bool Ip::sharesPrefix(const Ip& other, unsigned prefix) const {
    return isIpv6 == other.isIpv6 && first(prefix) == other.first(prefix);
}

std::optional<unsigned> prefixOfMask(const std::string& mask) {
    const auto ip = Ip::parse(mask);
    if (!ip || ip->isIpv6) {
        return std::nullopt;
    }
    Ip ones;
    ones.bytes.fill(0xFF);
    for (unsigned prefix = 0; prefix <= ip->bits(); ++prefix) {
        const Ip candidate = ones.first(prefix);
        if (std::memcmp(candidate.bytes.data(), ip->bytes.data(), lengthOf(*ip)) == 0) {
            return prefix;
        }
    }
    return std::nullopt;
}

}  // namespace cvagent::change
