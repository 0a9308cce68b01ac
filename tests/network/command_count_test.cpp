// What an interface costs when its nodes are built, in commands. docs/performance.md tells why.
#include <dlfcn.h>
#include <gmock/gmock.h>

#include <algorithm>
#include <cstdio>

#include "tests/network/port_host.h"

namespace {

std::vector<std::string>* commands = nullptr;  // kept while a test listens

std::vector<std::string> commandsOf(PortHost& plugin) {
    std::vector<std::string> kept;
    commands = &kept;
    plugin.build();
    commands = nullptr;
    return kept;
}

std::size_t countContaining(const std::vector<std::string>& all, const std::string& part) {
    return static_cast<std::size_t>(std::count_if(
        all.begin(), all.end(), [&](const auto& command) { return command.find(part) != command.npos; }));
}

}  // namespace

/// Stands in for the C library's: every command of the plug-in passes here.
extern "C" FILE* popen(const char* command, const char* mode) {
    static const auto real = reinterpret_cast<FILE* (*)(const char*, const char*)>(dlsym(RTLD_NEXT, "popen"));
    if (commands != nullptr) {
        commands->emplace_back(command);
    }
    return real(command, mode);
}

namespace {

// Listing the interfaces and the bridge members.
constexpr std::size_t kOfAWalk = 2;
// A port: link, speed, duplex, negotiation, modes, wake-on-LAN (6); its role (2), active member (0 or 1), MII
// status (1), failure count (2).
constexpr std::size_t kOfAPort = 11;
// An IP configuration asks for its facts once...
constexpr std::size_t kFactsOfAConfig = 24;
// ... and each of its 22 properties is stored by a write, which asks for origin and hardware address first.
constexpr std::size_t kWritesOfAConfig = 22U * 2U;

HOST_TEST(CommandCount, OfOneInterfaceIsPinned) {
    PortHost plugin(host, "ipv6-only");
    const auto all = commandsOf(plugin);
    for (const auto& command : all) {
        std::printf("%s\n", command.c_str());
    }
    EXPECT_EQ(all.size(), kOfAWalk + kOfAPort + kFactsOfAConfig + kWritesOfAConfig);
    EXPECT_EQ(countContaining(all, "grep BOOTPROTO"), 1U + kWritesOfAConfig / 2);
    EXPECT_EQ(countContaining(all, "grep Speed"), 1U);
    EXPECT_EQ(countContaining(all, "ifconfig -a | grep"), 1U);
}

HOST_TEST(CommandCount, GrowsByTheSameForEachInterface) {
    PortHost plugin(host, "suse-two-nics");
    const std::size_t both = commandsOf(plugin).size();
    const std::size_t one = (both - kOfAWalk) / 2;
    EXPECT_NEAR(static_cast<double>(one), static_cast<double>(kOfAPort + kFactsOfAConfig + kWritesOfAConfig),
                3.0);
}

}  // namespace
