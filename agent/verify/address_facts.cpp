// IP configurations.
#include <glob.h>

#include <algorithm>
#include <array>
#include <sstream>

#include "agent/core/host_file.h"
#include "agent/verify/fact.h"
#include "framework/ic/link_state.h"
#include "hosttools/addresses.h"
#include "hosttools/text.h"

namespace cvagent::verify {

namespace {

bool isNoAddress(const std::string& address) {
    return address.empty() || address == "0.0.0.0" || address == "::";
}

/// A list as it is shown.
std::string joined(const std::vector<std::string>& texts) {
    return static_cast<std::string>(IC::PropertyValue(texts, true));
}

/// A bond's counts as up while it is listed, with a link or without.
Text interfaceState(const Kernel& kernel, const Fact& fact) {
    const bool isBond = fact.name.find("bond") != std::string::npos;
    const bool isUp = isBond ? kernel.isUp(fact.name) : kernel.hasCarrier(fact.name);
    return std::to_string(isUp ? IC::LinkState::up : IC::LinkState::down);
}

/// The file of the interface's settings; its name ends in the hardware address.
std::string interfaceFile(const Kernel& kernel, const std::string& name) {
    constexpr std::size_t kBytes = 6;
    const hosttools::Link* link = kernel.link(name);
    hosttools::Text path;
    path.add("/etc/sysconfig/network/ifcfg-eth-id-");
    for (std::size_t byte = 0; link != nullptr && byte < kBytes; ++byte) {
        path.add(byte == 0 ? "" : ":").hex(link->hardware.at(byte), 2);
    }
    return path.str();
}

/// What stands behind the key, without quotes; "" when there is no such line.
std::string valueIn(const std::string& file, const std::string& key) {
    std::istringstream lines = linesOf(file);
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(key + "=")) {
            std::string value = line.substr(key.size() + 1);
            std::erase_if(value,
                          [](char letter) { return letter == '\'' || letter == '"' || letter == '\r'; });
            return value.substr(0, value.find_last_not_of(" \t") + 1);
        }
    }
    return {};
}

Text ipOrigin(const Kernel& kernel, const Fact& fact) {
    constexpr std::pair<const char*, const char*> kOrigins[] = {
        {"dhcp", "1"}, {"dhcp4", "1"}, {"bootp", "2"}, {"static", "3"}, {"none", "3"}};
    const std::string protocol = valueIn(interfaceFile(kernel, fact.name), "BOOTPROTO");
    const auto* known = std::ranges::find(kOrigins, protocol, &std::pair<const char*, const char*>::first);
    return known != std::end(kOrigins) ? known->second : "0";
}

Text ipv4Address(const Kernel& kernel, const Fact& fact) {
    const auto* address = kernel.inet(fact.name);
    if (address == nullptr) {
        return isNoAddress(fact.shown) ? fact.shown : kNone;
    }
    return hosttools::textOf(address->local);
}

Text subnetMask(const Kernel& kernel, const Fact& fact) {
    const auto* address = kernel.inet(fact.name);
    if (address == nullptr) {
        return isNoAddress(fact.shown) ? fact.shown : kNone;
    }
    constexpr unsigned kBits = 32;
    const std::uint32_t mask = address->prefix == 0 ? 0 : ~std::uint32_t{0} << (kBits - address->prefix);
    return hosttools::textOf(in_addr{htonl(mask)});
}

/// The fact itself when it is among what may be shown, else the first of that.
std::string oneOf(const std::vector<std::string>& right, const std::string& shown, const char* none) {
    const bool isAmong = std::ranges::find(right, shown) != right.end();
    return isAmong ? shown : right.empty() ? none : right.front();
}

/// Of several addresses any one is right.
Text ipv6Address(const Kernel& kernel, const Fact& fact) {
    std::vector<std::string> addresses;
    for (const auto& [address, prefix] : kernel.inet6(fact.name)) {
        addresses.push_back(address);
    }
    return addresses.empty() && isNoAddress(fact.shown) ? fact.shown : oneOf(addresses, fact.shown, kNone);
}

Text prefixLength(const Kernel& kernel, const Fact& fact) {
    std::vector<std::string> lengths;
    for (const auto& [address, prefix] : kernel.inet6(fact.name)) {
        lengths.push_back(std::to_string(prefix));
    }
    return oneOf(lengths, fact.shown, "0");
}

/// As the address is written, not as it is counted.
Text fourthGroup(const Kernel& kernel, const Fact& fact) {
    std::vector<std::string> groups;
    for (const auto& [address, prefix] : kernel.inet6(fact.name)) {
        std::istringstream text(address);
        std::string& group = groups.emplace_back();
        for (int number = 0; number < 4; ++number) {
            group.clear();
            std::getline(text, group, ':');
        }
    }
    return oneOf(groups, fact.shown, "");
}

/// @param codes for IPv4 or nothing, for IPv6 alone, for both
Text byProtocols(const Kernel& kernel, const std::string& name, const std::array<const char*, 3>& codes) {
    const bool hasInet6 = !kernel.inet6(name).empty();
    return codes.at(!hasInet6 ? 0 : kernel.inet(name) == nullptr ? 1 : 2);
}

Text addressType(const Kernel& kernel, const Fact& fact) {
    return byProtocols(kernel, fact.name, {"2", "5", "7"});
}

Text protocol(const Kernel& kernel, const Fact& fact) {
    return byProtocols(kernel, fact.name, {"4096", "4097", "4098"});
}

/// An interface without a way out of its own shows the host's.
Text ipv4Gateway(const Kernel& /*kernel*/, const Fact& fact) {
    const auto own = Kernel::gateways(fact.name);
    const bool isNone = own.empty() && isNoAddress(fact.shown);
    return isNone ? fact.shown : oneOf(own.empty() ? Kernel::gateways("") : own, fact.shown, kNone);
}

Text ipv6Gateway(const Kernel& /*kernel*/, const Fact& fact) {
    const auto own = Kernel::inet6Gateways(fact.name);
    return own.empty() && fact.shown.empty() ? "" : oneOf(own, fact.shown, kNone);
}

/// The words behind a keyword of the resolver's file.
std::vector<std::string> resolverWords(const std::string& keyword) {
    std::istringstream lines = linesOf("/etc/resolv.conf");
    std::vector<std::string> found;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line.substr(0, line.find_first_of("#;")));
        std::string word;
        const bool isOne = words >> word && word == keyword;
        while (isOne && words >> word) {
            found.push_back(word);
        }
    }
    return found;
}

Text dnsServers(const Kernel& /*kernel*/, const Fact& /*fact*/) {
    return joined(resolverWords("nameserver"));
}

Text dnsSuffixes(const Kernel& /*kernel*/, const Fact& /*fact*/) {
    return joined(resolverWords("search"));
}

std::string leaseFile(const std::string& name) {
    return "/var/lib/dhcpcd/dhcpcd-" + name + ".info";
}

bool hasLease(const std::string& name) {
    return !contentOf(leaseFile(name)).value_or("").empty();
}

Text usesDhcp(const Kernel& /*kernel*/, const Fact& fact) {
    return yesOrNo(hasLease(fact.name));
}

Text leaseOrigin(const Kernel& /*kernel*/, const Fact& fact) {
    return hasLease(fact.name) ? "1" : "3";
}

/// The last word of the first line of all leases that has one.
std::string dhcpv6Server() {
    glob_t files{};
    std::string server;
    if (glob("/var/lib/dhcpv6/client6.leases*", 0, nullptr, &files) == 0) {
        for (std::size_t i = 0; i < files.gl_pathc && server.empty(); ++i) {
            std::istringstream lines = linesOf(files.gl_pathv[i]);
            for (std::string line; server.empty() && std::getline(lines, line);) {
                const std::size_t at = line.find("SDUID");
                server = at == std::string::npos ? "" : line.substr(line.find_last_of(" \t") + 1);
            }
        }
    }
    globfree(&files);
    return server.substr(0, server.find(';'));
}

Text dhcpServers(const Kernel& /*kernel*/, const Fact& fact) {
    std::vector<std::string> servers{valueIn(leaseFile(fact.name), "DHCPSID"), dhcpv6Server()};
    std::erase(servers, "");
    return joined(servers);
}

constexpr auto ip = NodeType::ipConfig;
constexpr const char* kAnyRoute = "it is the first gateway of any route of the interface";

constexpr Check kAddressChecks[] = {
    {ip, 24, 108, ipOrigin},     {ip, 25, 108, ipv4Address},     {ip, 26, 108, subnetMask},
    {ip, 27, 108, ipv6Address},  {ip, 28, 108, addressType},     {ip, 29, 108, fourthGroup},
    {ip, 47, 108, protocol},     {ip, 93, 108, dhcpServers},     {ip, 94, 108, dnsServers},
    {ip, 96, 108, leaseOrigin},  {ip, 99, 108, dnsSuffixes},     {ip, 100, 108, ipv4Gateway, kAnyRoute},
    {ip, 101, 108, ipv6Gateway}, {ip, 102, 108, prefixLength},   {ip, 108, 108, linkName},
    {ip, 121, 108, linkName},    {ip, 123, 108, interfaceState}, {ip, 186, 108, usesDhcp},
};

}  // namespace

std::span<const Check> addressChecks() {
    return kAddressChecks;
}

}  // namespace cvagent::verify
