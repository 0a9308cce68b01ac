#include "agent/keep/profile.h"

#include <arpa/inet.h>

#include <algorithm>
#include <array>

#include "agent/core/text.h"

namespace cvagent::keep {

namespace {

constexpr const char* kAuto = "auto";
constexpr const char* kManual = "manual";

/// The methods beside which addresses can stand, and the one that they need.
struct Method {
    const char* name;
    const char* withAddress;
};
constexpr std::array kIpv4Methods = {Method{kAuto, kAuto}, Method{kManual, kManual},
                                     Method{"disabled", kManual}, Method{"link-local", kManual}};
constexpr std::array kIpv6Methods = {Method{kAuto, kAuto},          Method{"dhcp", "dhcp"},
                                     Method{kManual, kManual},      Method{"disabled", kManual},
                                     Method{"link-local", kManual}, Method{"ignore", kManual}};

/// Throws CannotKeep for one that does something else with the link.
template <class Table>
const char* methodWithAddress(const Table& table, const ProfileFamily& family) {
    const auto* found =
        std::ranges::find_if(table, [&family](const Method& each) { return each.name == family.method; });
    if (found == table.end()) {
        throw CannotKeep(family.method.empty()
                             ? std::string("the connection has no settings of this kind of address")
                             : "the connection's method is " + inQuotes(family.method));
    }
    return found->withAddress;
}

/// The link's local ones are not what a host is known by.
bool isLinkLocal(const ProfileFamily::Address& address) {
    return address.text.starts_with("fe80:");
}

/// The one that the wish is about. NetworkManager leaves them in the order in which they came.
auto addressOf(const FamilyWish& wish, std::vector<ProfileFamily::Address>& addresses) {
    const auto old = std::ranges::find(addresses, wish.likelyOld.value_or(""), &ProfileFamily::Address::text);
    return old != addresses.end() ? old : std::ranges::find_if_not(addresses, isLinkLocal);
}

/// @param isFirst it stands in front of those that were there, instead of in the place of one
void setAddress(const FamilyWish& wish, bool isFirst, ProfileFamily& family) {
    auto& addresses = family.addresses;
    const auto found = isFirst ? addresses.end() : addressOf(wish, addresses);
    const bool isThere = found != addresses.end();
    ProfileFamily::Address address = isThere ? *found : ProfileFamily::Address{};
    const auto prefix =
        wish.prefix ? wish.prefix : (isThere ? std::optional(address.prefix) : wish.likelyPrefix);
    if (!wish.address && !isThere) {
        throw CannotKeep("the connection has no address of this kind");
    }
    if (!prefix) {
        throw CannotKeep("no mask or prefix length of the address is known");
    }
    const auto place = isThere ? found - addresses.begin() : 0;
    if (isThere) {
        addresses.erase(found);
    }
    address.prefix = *prefix;
    address.text = wish.address ? canonicalAddress(*wish.address) : address.text;
    std::erase_if(addresses, [&address](const auto& each) { return each.text == address.text; });
    addresses.insert(addresses.begin() + std::min<std::ptrdiff_t>(place, std::ssize(addresses)), address);
}

void setGateway(const std::string& gateway, ProfileFamily& family) {
    if (family.hasDefaultRoute) {
        throw CannotKeep("the default route stands among the connection's other routes");
    }
    if (!gateway.empty() && family.addresses.empty()) {
        throw CannotKeep("the connection has no address of this kind");
    }
    family.gateway = gateway.empty() ? "" : canonicalAddress(gateway);
}

/// @return whether the address came by DHCP until now
bool setOrigin(bool dhcp, ProfileFamily& family) {
    methodWithAddress(kIpv4Methods, family);
    const bool wasByDhcp = family.method == kAuto;
    if (dhcp && !wasByDhcp) {
        family.addresses.clear();
        family.gateway.clear();
    }
    family.method = dhcp ? kAuto : kManual;
    return wasByDhcp && !dhcp;
}

void setIpv4(const FamilyWish& wish, bool wasByDhcp, ProfileFamily& family) {
    if (wish.isEmpty()) {
        return;
    }
    family.method = methodWithAddress(kIpv4Methods, family);
    if (family.method == kAuto) {
        throw CannotKeep("the address comes by DHCP");
    }
    if (wish.address || wish.prefix) {
        setAddress(wish, wasByDhcp, family);
    }
    if (wish.gateway) {
        setGateway(*wish.gateway, family);
    }
}

/// What routers announce stays beside it.
void setIpv6(const FamilyWish& wish, ProfileFamily& family) {
    if (wish.isEmpty()) {
        return;
    }
    const char* method = methodWithAddress(kIpv6Methods, family);
    if (wish.address || wish.prefix) {
        setAddress(wish, false, family);
        family.method = method;
    }
    if (wish.gateway) {
        setGateway(*wish.gateway, family);
    }
}

void setNameServers(const std::vector<std::string>& servers, ProfileIp& profile) {
    profile.ipv4.nameServers.clear();
    profile.ipv6.nameServers.clear();
    for (const std::string& each : servers) {
        (isIpv4(each) ? profile.ipv4 : profile.ipv6).nameServers.push_back(canonicalAddress(each));
    }
}

std::string addressWords(const ProfileFamily& family) {
    std::vector<std::string> words;
    for (const ProfileFamily::Address& each : family.addresses) {
        words.push_back(each.text + "/" + std::to_string(each.prefix));
    }
    return joinedWords(words, ",");
}

using Rows = std::array<std::pair<const char*, std::string>, 5>;

/// With the names that people type.
Rows rowsOf(const ProfileFamily& family) {
    return {{{"method", family.method},
             {"addresses", addressWords(family)},
             {"gateway", family.gateway},
             {"dns", joinedWords(family.nameServers, ",")},
             {"dns-search", joinedWords(family.searchDomains, ",")}}};
}

void addDifferences(const char* name, const ProfileFamily& before, const ProfileFamily& after,
                    std::vector<std::string>& lines) {
    const Rows was = rowsOf(before);
    const Rows is = rowsOf(after);
    for (std::size_t row = 0; row < is.size(); ++row) {
        if (was.at(row) != is.at(row)) {
            lines.push_back(std::string(name) + "." + is.at(row).first + " " + inQuotes(was.at(row).second) +
                            " -> " + inQuotes(is.at(row).second));
        }
    }
}

}  // namespace

std::string canonicalAddress(const std::string& text) {
    std::array<unsigned char, sizeof(in6_addr)> bytes{};
    std::array<char, INET6_ADDRSTRLEN> written{};
    for (const int family : {AF_INET, AF_INET6}) {
        if (inet_pton(family, text.c_str(), bytes.data()) == 1) {
            return inet_ntop(family, bytes.data(), written.data(), written.size());
        }
    }
    return text;
}

ProfileIp editedProfile(const ProfileIp& profile, const Wish& wish) {
    check(wish);
    ProfileIp edited = profile;
    const bool wasByDhcp = wish.dhcp && setOrigin(*wish.dhcp, edited.ipv4);
    setIpv4(wasByDhcp ? wish.ipv4.behindDhcp() : wish.ipv4, wasByDhcp, edited.ipv4);
    setIpv6(wish.ipv6, edited.ipv6);
    if (wish.dhcp && !*wish.dhcp && edited.ipv4.addresses.empty()) {
        throw CannotKeep("no address would be left");
    }
    if (wish.nameServers) {
        setNameServers(*wish.nameServers, edited);
    }
    if (wish.searchDomains) {
        edited.ipv4.searchDomains = *wish.searchDomains;
        edited.ipv6.searchDomains.clear();
    }
    return edited;
}

std::vector<std::string> differencesOf(const ProfileIp& before, const ProfileIp& after) {
    std::vector<std::string> lines;
    addDifferences("ipv4", before.ipv4, after.ipv4, lines);
    addDifferences("ipv6", before.ipv6, after.ipv6, lines);
    return lines;
}

}  // namespace cvagent::keep
