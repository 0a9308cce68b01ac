#include "agent/keep/wish.h"

#include <arpa/inet.h>
#include <net/if.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <sstream>

#include "agent/core/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent::keep {

namespace {

constexpr unsigned kIpv4Bits = 32;
constexpr unsigned kIpv6Bits = 128;
constexpr std::size_t kLongestDomain = 253;

bool isFamily(int family, const std::string& text) {
    std::array<unsigned char, sizeof(in6_addr)> bytes{};
    return text.find('\0') == std::string::npos && inet_pton(family, text.c_str(), bytes.data()) == 1;
}

bool isPlain(const std::string& text, const char* marks) {
    return !text.empty() && std::ranges::all_of(text, [marks](unsigned char letter) {
        return (letter < 0x80 && std::isalnum(letter) != 0) ||
               std::string_view(marks).find(static_cast<char>(letter)) != std::string_view::npos;
    });
}

/// "0.0.0.0" and "::", however they are written: no address to some, any one to others.
bool isUnspecified(const std::string& text) {
    return text.find_first_not_of("0:.") == std::string::npos;
}

void checkAddress(const std::string& text, bool isFitting) {
    if (!isFitting || isUnspecified(text)) {
        throw CannotKeep(inQuotes(text) + " is no address that could be kept");
    }
}

void checkFamily(const FamilyWish& wish, bool (*isFitting)(const std::string&), unsigned most) {
    if (wish.address) {
        checkAddress(*wish.address, isFitting(*wish.address));
    }
    for (const auto& gateway : {wish.gateway, wish.likelyGateway}) {
        if (gateway && !gateway->empty()) {
            checkAddress(*gateway, isFitting(*gateway));
        }
    }
    for (const auto& prefix : {wish.prefix, wish.likelyPrefix}) {
        if (prefix && (*prefix < 1 || *prefix > most)) {
            throw CannotKeep(std::to_string(*prefix) + " is no prefix length that could be kept");
        }
    }
}

}  // namespace

FamilyWish FamilyWish::behindDhcp() const {
    FamilyWish wish = *this;
    wish.gateway = gateway ? gateway : likelyGateway;
    return wish;
}

bool isIpv4(const std::string& text) {
    return isFamily(AF_INET, text);
}

bool isIpv6(const std::string& text) {
    return isFamily(AF_INET6, text);
}

void check(const Wish& wish) {
    checkFamily(wish.ipv4, isIpv4, kIpv4Bits);
    checkFamily(wish.ipv6, isIpv6, kIpv6Bits);
    for (const std::string& server : wish.nameServers.value_or(std::vector<std::string>{})) {
        checkAddress(server, isIpv4(server) || isIpv6(server));
    }
    for (const std::string& domain : wish.searchDomains.value_or(std::vector<std::string>{})) {
        if (!isPlain(domain, ".-_") || domain.size() > kLongestDomain || domain.starts_with('-')) {
            throw CannotKeep(inQuotes(domain) + " is no domain that could be kept");
        }
    }
}

void checkName(const std::string& link) {
    if (!isPlain(link, "._@-") || link.starts_with('-') || link.starts_with('.') || link.size() >= IFNAMSIZ) {
        throw CannotKeep("an interface of the name " + inQuotes(link) + " is written to no file");
    }
}

std::string maskOf(unsigned prefix) {
    const in_addr mask{htonl(prefix == 0 ? 0 : ~0U << (kIpv4Bits - prefix))};
    std::array<char, INET_ADDRSTRLEN> text{};
    return inet_ntop(AF_INET, &mask, text.data(), text.size());
}

std::optional<unsigned> prefixOf(const std::string& text, unsigned most) {
    if (const auto bits = QX::wholeNumber<unsigned>(text)) {
        return *bits <= most ? bits : std::nullopt;
    }
    for (unsigned bits = 0; bits <= kIpv4Bits; ++bits) {
        if (most == kIpv4Bits && text == maskOf(bits)) {
            return bits;
        }
    }
    return std::nullopt;
}

std::optional<AddressText> addressIn(const std::string& text, bool isIpv6Wanted) {
    const std::size_t slash = std::min(text.find('/'), text.size());
    AddressText found{text.substr(0, slash), std::nullopt};
    if (!(isIpv6Wanted ? isIpv6(found.address) : isIpv4(found.address))) {
        return std::nullopt;
    }
    if (slash < text.size()) {
        found.prefix = prefixOf(text.substr(slash + 1), isIpv6Wanted ? kIpv6Bits : kIpv4Bits);
        return found.prefix ? std::optional(found) : std::nullopt;
    }
    return found;
}

std::vector<std::string> wordsOf(const std::string& text) {
    std::vector<std::string> words;
    std::istringstream in(text);
    for (std::string word; in >> word;) {
        words.push_back(std::move(word));
    }
    return words;
}

std::string joinedWords(const std::vector<std::string>& words, const char* separator) {
    std::string text;
    for (const std::string& word : words) {
        text += (text.empty() ? "" : separator) + word;
    }
    return text;
}

}  // namespace cvagent::keep
