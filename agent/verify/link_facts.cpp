// Network ports and teams.
#include <linux/ethtool.h>

#include <algorithm>
#include <iterator>
#include <sstream>

#include "agent/core/text.h"
#include "agent/verify/fact.h"
#include "agent/verify/link_modes.h"
#include "framework/ic/link_state.h"
#include "framework/qx/whole_number.h"

namespace cvagent::verify {

namespace {

using hosttools::LinkSettings;

Text carrier(const Kernel& kernel, const Fact& fact) {
    return std::to_string(kernel.hasCarrier(fact.name) ? IC::LinkState::up : IC::LinkState::down);
}

Text linkSpeed(const Kernel& /*kernel*/, const Fact& fact) {
    const auto settings = Kernel::settingsOf(fact.name);
    constexpr unsigned kUnknown = 0xFFFF;  // of its lower half, too
    const unsigned megabits = settings ? settings->head().speed : 0;
    const bool isKnown = megabits != kUnknown && megabits != ~0U;
    return std::to_string(isKnown ? megabits * 1000ULL : 0);
}

Text fullDuplex(const Kernel& /*kernel*/, const Fact& fact) {
    const auto settings = Kernel::settingsOf(fact.name);
    return yesOrNo(settings && settings->head().duplex == DUPLEX_FULL);
}

/// A driver that tells its settings tells whether it negotiates, and then it can.
Text negotiates(const Kernel& /*kernel*/, const Fact& fact) {
    return yesOrNo(Kernel::settingsOf(fact.name).has_value());
}

LinkMode firstModeOf(const std::string& name) {
    const auto settings = Kernel::settingsOf(name);
    return firstLinkMode(
        [&settings](unsigned bit) { return settings && settings->has(LinkSettings::supported, bit); });
}

Text supportedSpeed(const Kernel& /*kernel*/, const Fact& fact) {
    return std::to_string(firstModeOf(fact.name).megabits);
}

Text portType(const Kernel& /*kernel*/, const Fact& fact) {
    return std::to_string(firstModeOf(fact.name).portType);
}

Text wakeOnLan(const Kernel& /*kernel*/, const Fact& fact) {
    return Kernel::tellsWakeOnLan(fact.name) ? "3" : "";
}

Text isMember(const Kernel& /*kernel*/, const Fact& fact) {
    return yesOrNo(!Kernel::bondOf(fact.name).empty());
}

Text isActiveMember(const Kernel& /*kernel*/, const Fact& fact) {
    const std::string bond = Kernel::bondOf(fact.name);
    return yesOrNo(!bond.empty() && Kernel::attribute(bond, "bonding/active_slave") == fact.name);
}

/// The first word: "going down" is shown as "going".
Text memberStatus(const Kernel& /*kernel*/, const Fact& fact) {
    const std::string status = Kernel::attribute(fact.name, "bonding_slave/mii_status");
    return status.substr(0, status.find(' '));
}

Text memberFailures(const Kernel& /*kernel*/, const Fact& fact) {
    const std::string failures = Kernel::attribute(fact.name, "bonding_slave/link_failure_count");
    return failures.empty() ? "0" : failures;
}

Text teamOf(const Kernel& /*kernel*/, const Fact& fact) {
    return Kernel::bondOf(fact.name);
}

std::vector<std::string> sortedWords(const std::string& text) {
    std::istringstream words(text);
    std::vector<std::string> all{std::istream_iterator<std::string>(words), {}};
    std::ranges::sort(all);
    return all;
}

Text teamMembers(const Kernel& /*kernel*/, const Fact& fact) {
    const std::string members = Kernel::attribute(fact.name, "bonding/slaves");
    return sortedWords(members) == sortedWords(fact.shown) ? fact.shown : members;
}

// The modes by their numbers: /proc has other words for them than sysfs.
constexpr const char* kTeamModes[] = {
    "load balancing (round-robin)", "fault-tolerance (active-backup)",       "load balancing (xor)",
    "fault-tolerance (broadcast)",  "IEEE 802.3ad Dynamic link aggregation", "transmit load balancing",
    "adaptive load balancing",
};

/// What stands behind the mode ("fail_over_mac active") is left to the plug-in.
Text teamMode(const Kernel& /*kernel*/, const Fact& fact) {
    const std::string told = Kernel::attribute(fact.name, "bonding/mode");
    const auto number = QX::wholeNumber<std::size_t>(told.substr(told.find(' ') + 1));
    if (!number || *number >= std::size(kTeamModes)) {
        return told;
    }
    const std::string mode = kTeamModes[*number];
    return fact.shown == mode || fact.shown.starts_with(mode + " (") ? fact.shown : mode;
}

constexpr auto port = NodeType::networkPort;
constexpr const char* kByFile = "it is taken from the interface's file below /etc/sysconfig/network";

constexpr Check kLinkChecks[] = {
    {port, 0, 108, linkName},
    {port, 38, 108, supportedSpeed},
    {port, 57, 108, linkSpeed},
    {port, 67, 108, negotiates},
    {port, 82, 108, fullDuplex},
    {port, 108, 108, linkName},
    {port, 121, 108, linkName},
    {port, 123, 108, carrier},
    {port, 182, 108, wakeOnLan, nullptr, true},
    {port, 183, 108, wakeOnLan, nullptr, true},
    {port, 185, 108, portType},
    {port, 193, 108, isMember, kByFile},
    {port, 194, 108, isActiveMember, kByFile},
    {port, 195, 108, memberStatus, kByFile},
    {port, 196, 108, memberFailures, kByFile},
    {port, 199, 108, teamOf, kByFile},
    {NodeType::lanEndpoint, 108, 108, linkName},
    {NodeType::team, 165, 197, teamMembers},
    {NodeType::team, 197, 197, linkName},
    {NodeType::team, 198, 197, teamMode},
};

}  // namespace

Text linkName(const Kernel& kernel, const Fact& fact) {
    return kernel.link(fact.name) != nullptr ? fact.name : kNoLink;
}

std::span<const Check> linkChecks() {
    return kLinkChecks;
}

}  // namespace cvagent::verify
