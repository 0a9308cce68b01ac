// The link states of this pass, read from the published nodes.
#include <optional>

#include "indications/globals.h"
#include "indications/network_monitor.h"
#include "mi/command.h"
#include "mi/text.h"

namespace IC {

namespace {

struct NamedState {
    std::string name;
    unsigned int state;
};

/// What a node says of itself now; nothing when one of the two reads fails.
std::optional<NamedState> readState(const MutableNode& node) {
    PropertyValue name(PropertyValue::text, true);
    PropertyValue state(PropertyValue::number, true);
    if (node.getProperty(LinkState::nameProperty, name).getStatus() != 0 ||
        node.getProperty(LinkState::stateProperty, state).getStatus() != 0) {
        return std::nullopt;
    }
    try {
        return NamedState{static_cast<std::string>(name), static_cast<unsigned int>(state)};
    } catch (const ConversionError& failure) {
        logInd(kError) << "Link state of " << static_cast<std::string>(name) << ": " << failure.what();
        return std::nullopt;
    }
}

/// The member's name in a line "Slave Interface: eth0".
std::string slaveName(std::string line) {
    constexpr char label[] = "Slave Interface:";
    if (const auto at = line.find(label); at != std::string::npos) {
        line.erase(at, sizeof label - 1);
    }
    return trimEnd(trimStart(std::move(line)));
}

/// What a member's state means for its bond.
unsigned int memberVerdict(const NodeTree& tree, const LinkStates& previous, const std::string& member) {
    // Compared with the last pass only: this one is still being read when it is asked.
    const auto before = previous.find(member);
    if (before == previous.end()) {
        return LinkState::noVerdict;
    }
    const auto node = tree.findNetworkPort(member);  // held, however long the host takes to answer
    if (!node) {
        return LinkState::noVerdict;
    }
    const auto now = readState(*node);
    return now && now->name == member ? failOver(before->second, now->state) : LinkState::noVerdict;
}

/// @param key the name that the node is known by, in case it does not tell it
Reading readingOf(const NodeTree& tree, const LinkStates& previous, const std::string& key,
                  const MutableNode& node) {
    const unsigned int before = commandsCutOff();
    const auto now = readState(node);
    Reading reading;
    reading.name = now ? now->name : key;
    reading.state = now ? std::optional(now->state) : std::nullopt;
    // A bond that was cut off in its own answer has members all the same: they raise no alerts.
    reading.isBond = contains(reading.name, "bond") && (now || commandsCutOff() != before);
    if (reading.isBond) {
        logInd(kProgress) << "Calling bondedNetNodeStatus() for bonded interface: " << reading.name;
        const unsigned int verdict = bondedNetNodeStatus(tree, previous, reading.name, reading.members);
        reading.state = verdict == LinkState::noVerdict ? reading.state : verdict;
    }
    reading.cutOff = commandsCutOff() != before;
    return reading;
}

}  // namespace

void createCurNetNodeMap(const NodeTree& tree, Pass& pass) {
    const LogScope scope("OsHwMI::createCurNetNodeMap(): entry", "returning from createCurNetNodeMap",
                         indicationsLogSource);
    std::vector<Reading> readings;
    for (const auto& [key, node] : tree.nodesByName()) {
        readings.push_back(readingOf(tree, pass.previous, key, *node));
    }
    pass.now = settle(pass.previous, readings, pass.members);
}

unsigned int bondedNetNodeStatus(const NodeTree& tree, const LinkStates& previous, const std::string& bond,
                                 std::vector<std::string>& members) {
    const Operation operation;
    logInd(kProgress) << "bondedNetNodeStatus: entry";
    HostCommand command(formatCommand(
        "cat /proc/net/bonding/%s 2> /dev/null | grep \"Slave Interface: \" 2> /dev/null", bond));
    if (!command.started()) {
        logInd(kError) << "OsHwMI::bondedNetNodeStatus - grepping slave device error";
        return LinkState::noVerdict;
    }
    std::vector<std::string> listed;
    while (const auto line = command.nextLine()) {
        listed.push_back(slaveName(*line));
        logInd(kProgress) << "OsHwMI::bondedNetNodeStatus - slaveInterface is: " << listed.back();
    }
    unsigned int status = LinkState::noVerdict;
    for (auto member = listed.begin(); member != listed.end() && status == LinkState::noVerdict; ++member) {
        status = memberVerdict(tree, previous, *member);
    }
    members.insert(members.end(), listed.begin(), listed.end());
    logInd(kProgress) << "Returning from bondedNetNodeStatus(). Status: " << status;
    return status;
}

}  // namespace IC
