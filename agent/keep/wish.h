#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace cvagent::keep {

/// Why something cannot be kept: the file is one that is not understood, or something is missing.
class CannotKeep : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The same, where nothing has been done that had to be taken back.
class NotBegun : public CannotKeep {
public:
    using CannotKeep::CannotKeep;
};

/// What shall be kept of one family of addresses; what is not set stays as it is.
struct FamilyWish {
    std::optional<std::string> address{};  ///< without its prefix length
    std::optional<unsigned> prefix{};
    std::optional<std::string> gateway{};    ///< of the default route; "" for none
    std::optional<unsigned> likelyPrefix{};  ///< for an address where nothing else tells one
    /// The address that it is about, where several are kept in no order; else the first.
    std::optional<std::string> likelyOld{};
    /// For an address in whose subnet it is, when the one before came by DHCP and brought its gateway.
    std::optional<std::string> likelyGateway{};

    /// The same for a file that has said DHCP until now.
    FamilyWish behindDhcp() const;
    bool isEmpty() const { return !address && !prefix && !gateway; }
};

/// What shall be kept of an interface; what is not set stays as it is.
struct Wish {
    std::optional<bool> dhcp{};  ///< IPv4 by DHCP
    FamilyWish ipv4{};
    FamilyWish ipv6{};
    std::optional<std::vector<std::string>> nameServers{};  ///< none: they are removed
    std::optional<std::vector<std::string>> searchDomains{};

    bool isEmpty() const {
        return !dhcp && ipv4.isEmpty() && ipv6.isEmpty() && !nameServers && !searchDomains;
    }
};

/// Throws CannotKeep for values that are no addresses, prefix lengths and domain names, whatever they come
/// from: they go into files that others read as more than a value.
void check(const Wish& wish);
/// The same for the name of a link, which the kernel lets hold almost anything.
void checkName(const std::string& link);

bool isIpv4(const std::string& text);
bool isIpv6(const std::string& text);
/// "255.255.255.0"
std::string maskOf(unsigned prefix);
/// A number of bits up to `most`, or where that is IPv4's a contiguous mask in dotted form; nothing for any
/// other text.
std::optional<unsigned> prefixOf(const std::string& text, unsigned most);

/// "192.0.2.10/24" in its parts.
struct AddressText {
    std::string address;
    std::optional<unsigned> prefix;
};
/// Nothing for a text that is no address of the family.
std::optional<AddressText> addressIn(const std::string& text, bool isIpv6);

/// The words of a text, which blanks and tabs separate; and the other way round.
std::vector<std::string> wordsOf(const std::string& text);
std::string joinedWords(const std::vector<std::string>& words, const char* separator = " ");

}  // namespace cvagent::keep
