#include "agent/undo/networkd_links.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <linux/if_addr.h>
#include <linux/rtnetlink.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <string_view>
#include <thread>

#include "agent/undo/boot_clock.h"
#include "agent/undo/message_parts.h"
#include "hosttools/descriptor.h"
#include "hosttools/files.h"

namespace cvagent::undo {

namespace {

constexpr const char* kPlace = "/run/systemd/netif/links/";
constexpr std::uint64_t kLongestUntilItBegins = 5'000;
constexpr std::uint64_t kLongestUntilReady = 10'000;
constexpr std::chrono::milliseconds kBetweenLinkLooks{20};

/// Its user has few rights: nobody is waited for, whatever lies there.
std::string beginningOf(const std::string& path) {
    const hosttools::Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    std::array<char, 65536> text{};
    const ssize_t got = file.isOpen() ? read(file.get(), text.data(), text.size()) : 0;
    return {text.data(), static_cast<std::size_t>(got > 0 ? got : 0)};
}

/// The values of a key, in whatever section.
std::vector<std::string> valuesOf(std::string_view text, std::string_view key) {
    std::vector<std::string> values;
    while (!text.empty()) {
        std::string_view line = hosttools::takeLine(text);
        const std::size_t equals = std::min(line.find('='), line.size());
        std::string_view name = line.substr(0, equals);
        if (hosttools::takeWord(name) == key) {
            line.remove_prefix(std::min(equals + 1, line.size()));
            values.emplace_back(hosttools::takeWord(line));
        }
    }
    return values;
}

std::string valueOf(std::string_view text, std::string_view key) {
    const std::vector<std::string> values = valuesOf(text, key);
    return values.empty() ? "" : values.back();
}

bool isOneOf(const std::string& value, std::initializer_list<const char*> some) {
    return std::ranges::find(some, value) != some.end();
}

/// The kernel's form of an address; "" for what is none, or means any.
std::string bytesOfIp(const std::string& text) {
    const std::string ip = text.substr(0, text.find('/'));
    for (const auto& [family, size] : {std::pair{AF_INET, sizeof(in_addr)}, {AF_INET6, sizeof(in6_addr)}}) {
        std::string bytes(size, '\0');
        if (inet_pton(family, ip.c_str(), bytes.data()) == 1) {
            return bytes == std::string(size, '\0') ? "" : bytes;
        }
    }
    return "";
}

bool isAddressOf(const NetworkMessage& message, unsigned link, const std::string& text) {
    const Parts<ifaddrmsg> parts(message);
    const std::string_view ip = parts.has(IFA_LOCAL) ? parts[IFA_LOCAL] : parts[IFA_ADDRESS];
    const std::size_t slash = text.find('/');
    const auto prefix =
        slash == std::string::npos ? std::nullopt : hosttools::parseNumber(text.substr(slash + 1));
    return parts.fixed().ifa_index == link && ip == bytesOfIp(text) &&
           (!prefix || *prefix == parts.fixed().ifa_prefixlen);
}

bool isGatewayOf(const NetworkMessage& message, unsigned link, const std::string& text) {
    const Parts<rtmsg> parts(message);
    return parts.number(RTA_OIF) == link && parts[RTA_GATEWAY] == bytesOfIp(text);
}

/// What it has from others, as from a router, may come later.
bool hasWhatItsFileSays(unsigned link, const std::string& file) {
    hosttools::NetlinkSocket socket(NETLINK_ROUTE);
    const NetworkMessages network = readNetwork(socket);
    const auto isThere = [&](const std::string& value, const auto& messages, const auto& is) {
        return bytesOfIp(value).empty() || std::ranges::any_of(messages, [&](const NetworkMessage& each) {
                   return is(each, link, value);
               });
    };
    return std::ranges::all_of(
               valuesOf(file, "Address"),
               [&](const std::string& each) { return isThere(each, network.addresses, isAddressOf); }) &&
           std::ranges::all_of(valuesOf(file, "Gateway"), [&](const std::string& each) {
               return isThere(each, network.routes, isGatewayOf);
           });
}

bool isUnplugged(const std::string& state) {
    return valueOf(state, "OPER_STATE") == "no-carrier";
}

/// Without a carrier it waits for one, for as long as it takes. It says that it is at work as long as no
/// router answers it.
bool isLinkReady(const std::string& link) {
    const std::string state = beginningOf(kPlace + link);
    const bool isAtWork = isOneOf(valueOf(state, "ADMIN_STATE"), {"pending", "initialized", "configuring"});
    if (!isAtWork || isUnplugged(state)) {
        return true;
    }
    const std::string file = beginningOf(valueOf(state, "NETWORK_FILE"));
    const bool isByDhcp = isOneOf(valueOf(file, "DHCP"), {"yes", "ipv4", "true"});
    const bool hasLease = !isByDhcp || valueOf(state, "IPV4_ADDRESS_STATE") == "routable";
    const auto number = hosttools::parseNumber(link).value_or(0);
    return !file.empty() && hasLease && hasWhatItsFileSays(static_cast<unsigned>(number), file);
}

}  // namespace

NetworkdLinks::NetworkdLinks(unsigned link)
    : only_(link == 0 ? "" : std::to_string(link)), before_(files()) {}

NetworkdLinks::Files NetworkdLinks::files() const {
    Files found;
    for (const std::string& link : hosttools::listDirectory(kPlace)) {
        struct stat file {};
        const bool isWanted = only_.empty() || link == only_;
        if (isWanted && lstat((kPlace + link).c_str(), &file) == 0) {
            found[link] = {file.st_ino, file.st_mtim};
        }
    }
    return found;
}

/// @param hasBegun becomes true when a link is seen to be set up anew, or to have been
bool NetworkdLinks::isSetUp(bool& hasBegun) const {
    bool isAtWork = false;
    for (const auto& [link, file] : files()) {
        const auto old = before_.find(link);
        if (old == before_.end() || !old->second.isSame(file)) {
            hasBegun = true;
            isAtWork = isAtWork || !isLinkReady(link);
        }
    }
    return hasBegun && !isAtWork;
}

bool NetworkdLinks::waitUntilSetUp() const {
    const std::uint64_t begin = bootMilliseconds();
    bool hasBegun = false;
    bool isReady = before_.empty() || (!only_.empty() && isUnplugged(beginningOf(kPlace + only_)));
    for (bool isLate = false; !isReady && !isLate;) {
        std::this_thread::sleep_for(kBetweenLinkLooks);
        isReady = isSetUp(hasBegun);
        isLate = bootMilliseconds() - begin >= (hasBegun ? kLongestUntilReady : kLongestUntilItBegins);
    }
    return isReady;
}

}  // namespace cvagent::undo
