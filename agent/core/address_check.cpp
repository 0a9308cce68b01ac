// Addresses and names, as they are written into commands and configuration files.
#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <string_view>

#include "agent/core/value_check.h"
#include "framework/qx/whole_number.h"

namespace cvagent::check {

namespace {

constexpr std::size_t kLongestLabel = 63;
constexpr std::size_t kLongestDomain = 253;

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

bool isLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

bool isHexDigit(char c) {
    return isDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

bool isHexOrColon(char c) {
    return isHexDigit(c) || c == ':' || c == '.';
}

Value asText(Words words, bool good) {
    return good ? Value(IC::PropertyValue(words.front(), true)) : std::nullopt;
}

std::optional<std::uint32_t> parseIpv4(const std::string& text) {
    const bool harmless = text.size() < INET_ADDRSTRLEN && std::all_of(text.begin(), text.end(), [](char c) {
                              return isDigit(c) || c == '.';
                          });
    in_addr address{};
    if (!harmless || inet_pton(AF_INET, text.c_str(), &address) != 1) {
        return std::nullopt;
    }
    return ntohl(address.s_addr);
}

std::optional<in6_addr> parseIpv6(const std::string& text) {
    in6_addr address{};
    const bool harmless =
        text.size() < INET6_ADDRSTRLEN && std::all_of(text.begin(), text.end(), isHexOrColon);
    if (!harmless || inet_pton(AF_INET6, text.c_str(), &address) != 1) {
        return std::nullopt;
    }
    return address;
}

bool isIpv4Host(const std::string& text) {
    const auto address = parseIpv4(text);
    const std::uint32_t net = address ? *address >> 24U : 0;
    return net != 0 && net != 127 && net < 224;
}

/// An IPv6 address that one machine has.
bool isIpv6Unicast(const in6_addr& address) {
    return !IN6_IS_ADDR_UNSPECIFIED(&address) && !IN6_IS_ADDR_LOOPBACK(&address) &&
           !IN6_IS_ADDR_MULTICAST(&address) && !IN6_IS_ADDR_V4MAPPED(&address);
}

bool isIpv6Host(const std::string& text) {
    const auto address = parseIpv6(text);
    return address && isIpv6Unicast(*address) && !IN6_IS_ADDR_LINKLOCAL(&*address);
}

/// A resolver may well run on the host itself.
bool isDnsServer(const std::string& text) {
    const auto ipv4 = parseIpv4(text);
    const auto ipv6 = parseIpv6(text);
    const bool loopback = (ipv4 && *ipv4 >> 24U == 127) || (ipv6 && IN6_IS_ADDR_LOOPBACK(&*ipv6));
    return loopback || isIpv4Host(text) || isIpv6Host(text);
}

bool isLabel(std::string_view text) {
    return !text.empty() && text.size() <= kLongestLabel && text.front() != '-' && text.back() != '-' &&
           std::all_of(text.begin(), text.end(),
                       [](char c) { return isDigit(c) || isLetter(c) || c == '-'; });
}

/// In digits, or in the hexadecimal ones behind 0x.
bool isNumber(std::string_view label) {
    const bool isHex = label.starts_with("0x") || label.starts_with("0X");
    label.remove_prefix(isHex ? 2 : 0);
    return std::ranges::all_of(label, isDigit) || (isHex && std::ranges::all_of(label, isHexDigit));
}

/// A resolver takes a name that ends in a number for an address: 10.0.0.07 is 10.0.0.7.
bool isDomain(std::string_view text) {
    if (text.size() > kLongestDomain) {
        return false;
    }
    for (std::size_t dot = text.find('.'); dot != std::string_view::npos; dot = text.find('.')) {
        if (!isLabel(text.substr(0, dot))) {
            return false;
        }
        text.remove_prefix(dot + 1);
    }
    return isLabel(text) && !isNumber(text);
}

/// One empty word stands for the empty list.
Value asList(Words words, bool (*good)(const std::string&)) {
    if (words.size() == 1 && words.front().empty()) {
        return IC::PropertyValue(std::vector<std::string>(), true);
    }
    if (words.empty() || !std::all_of(words.begin(), words.end(), good)) {
        return std::nullopt;
    }
    return IC::PropertyValue(std::vector<std::string>(words.begin(), words.end()), true);
}

}  // namespace

Value ipv4Address(const Property& /*property*/, Words words) {
    return asText(words, words.size() == 1 && isIpv4Host(words.front()));
}

Value subnetMask(const Property& /*property*/, Words words) {
    const auto mask = words.size() == 1 ? parseIpv4(words.front()) : std::nullopt;
    const std::uint32_t hostBits = mask ? ~*mask : ~0U;
    // Ones, then zeros: the host bits are one less than a power of two.
    return asText(words, hostBits != ~0U && (hostBits & (hostBits + 1)) == 0);
}

Value ipv6Address(const Property& /*property*/, Words words) {
    return asText(words, words.size() == 1 && isIpv6Host(words.front()));
}

/// In the kernel's spelling: the plug-in takes a route to another one for an old route, and removes it.
Value ipv6Gateway(const Property& /*property*/, Words words) {
    const auto address = words.size() == 1 ? parseIpv6(words.front()) : std::nullopt;
    if (!address || !isIpv6Unicast(*address)) {
        return std::nullopt;
    }
    std::array<char, INET6_ADDRSTRLEN> text{};
    inet_ntop(AF_INET6, &*address, text.data(), text.size());
    return IC::PropertyValue(text.data(), true);
}

Value prefixLength(const Property& /*property*/, Words words) {
    if (words.size() != 1 || words.front().empty() || words.front().front() == '0') {
        return std::nullopt;
    }
    const auto bits = QX::wholeNumber<unsigned int>(words.front());
    const bool good = bits && *bits >= 1 && *bits <= 128;
    return good ? Value(IC::PropertyValue(IC::Number(*bits), true)) : std::nullopt;
}

Value dnsServers(const Property& /*property*/, Words words) {
    return asList(words, isDnsServer);
}

Value hostName(const Property& /*property*/, Words words) {
    return asText(words, words.size() == 1 && isLabel(words.front()));
}

Value domainName(const Property& /*property*/, Words words) {
    return asText(words, words.size() == 1 && (words.front().empty() || isDomain(words.front())));
}

Value dnsSuffixes(const Property& /*property*/, Words words) {
    return asList(words, [](const std::string& word) { return isDomain(word); });
}

}  // namespace cvagent::check
