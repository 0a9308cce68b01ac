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
// ... and each of its properties is stored by one write, which asks for origin and hardware address first.
constexpr std::size_t kOfAWrite = 2;

std::size_t writesOf(const PortHost& plugin, const std::string& name) {
    std::map<unsigned int, IC::PropertyValue> properties;
    plugin.config(name)->getProperties(properties);
    return properties.size();
}

HOST_TEST(CommandCount, OfOneInterfaceIsPinned) {
    PortHost plugin(host, "ipv6-only");
    const auto all = commandsOf(plugin);
    const std::size_t writes = writesOf(plugin, "eth0");
    EXPECT_EQ(all.size(), kOfAWalk + kOfAPort + kFactsOfAConfig + writes * kOfAWrite);
    EXPECT_EQ(countContaining(all, "grep BOOTPROTO"), 1U + writes);
    EXPECT_EQ(countContaining(all, "grep Speed"), 1U);
    EXPECT_EQ(countContaining(all, "ifconfig -a | grep"), 1U);
}

HOST_TEST(CommandCount, OfTwoInterfacesIsPinned) {
    PortHost plugin(host, "suse-two-nics");  // one with addresses of both families, one without any
    const std::size_t all = commandsOf(plugin).size();
    const std::size_t writes = writesOf(plugin, "eth0") + writesOf(plugin, "eth1");
    EXPECT_EQ(all, kOfAWalk + 2 * kOfAPort + writes * kOfAWrite + 20 + 17);
}

}  // namespace
