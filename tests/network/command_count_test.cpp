// What an interface costs when its nodes are built, in commands. docs/performance.md tells why.
#include <gmock/gmock.h>

#include <algorithm>

#include "tests/network/port_host.h"
#include "tests/support/command_lines.h"

namespace {

std::vector<std::string> commandsOf(PortHost& plugin) {
    const CommandLines commands;
    plugin.build();
    return commands.all();
}

std::size_t countContaining(const std::vector<std::string>& all, const std::string& part) {
    return static_cast<std::size_t>(std::count_if(
        all.begin(), all.end(), [&](const auto& command) { return command.find(part) != command.npos; }));
}

// Listing the interfaces and the bridge members.
constexpr std::size_t kOfAWalk = 2;
// A port: link, speed, duplex, negotiation, modes, wake-on-LAN (6); its role (2), active member (0 or 1), MII
// status (1), failure count (2).
constexpr std::size_t kOfAPort = 11;
// An IP configuration asks for its facts once...
constexpr std::size_t kFactsOfAConfig = 19;
// ... and each of its 22 properties is stored by a write, which asks for origin and hardware address first.
constexpr std::size_t kWritesOfAConfig = 22U * 2U;

HOST_TEST(CommandCount, OfOneInterfaceIsPinned) {
    PortHost plugin(host, "ipv6-only");
    const auto all = commandsOf(plugin);
    EXPECT_EQ(all.size(), kOfAWalk + kOfAPort + kFactsOfAConfig + kWritesOfAConfig);
    EXPECT_EQ(countContaining(all, "grep BOOTPROTO"), 1U + kWritesOfAConfig / 2);
    EXPECT_EQ(countContaining(all, "grep Speed"), 1U);
    EXPECT_EQ(countContaining(all, "ifconfig -a | grep"), 1U);
}

HOST_TEST(CommandCount, OfTwoInterfacesIsPinned) {
    PortHost plugin(host, "suse-two-nics");  // one with addresses of both families, one without any
    EXPECT_EQ(commandsOf(plugin).size(), kOfAWalk + 2 * (kOfAPort + kWritesOfAConfig) + 20 + 17);
}

}  // namespace
