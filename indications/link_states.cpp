// The link states of this pass, read from the published nodes.
#include <algorithm>
#include <iterator>
#include <optional>
#include <set>

#include "indications/globals.h"
#include "indications/link_state.h"
#include "mi/command.h"
#include "mi/log.h"
#include "mi/os_hw_mi.h"
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

std::optional<unsigned int> stateOf(const std::map<std::string, unsigned int>& states,
                                    const std::string& name) {
    const auto found = states.find(name);
    return found == states.end() ? std::nullopt : std::optional(found->second);
}

/// The member's name in a line "Slave Interface: eth0".
std::string slaveName(std::string line) {
    constexpr char label[] = "Slave Interface:";
    if (const auto at = line.find(label); at != std::string::npos) {
        line.erase(at, sizeof label - 1);
    }
    return trimEnd(trimStart(std::move(line)));
}

/// What one member's change means for its bond.
unsigned int verdict(unsigned int before, unsigned int now) {
    if (before == LinkState::up && now == LinkState::down) {
        return LinkState::switchedOver;
    }
    if (before == LinkState::down && now == LinkState::up) {
        return LinkState::switchedBack;
    }
    return LinkState::noVerdict;
}

/// Notes the members of a bond, which the pass has listed from `first` on. Of a bond that was cut off the
/// members of the passes before count too: the listing itself may not be whole.
/// @return those by whose change the bond still has to be judged
std::set<std::string> membersWithoutVerdict(OSHWMI_IND::Pass& pass, const std::string& bond,
                                            std::size_t first, bool cutOff) {
    std::set<std::string> listed(std::next(pass.slaves.begin(), static_cast<std::ptrdiff_t>(first)),
                                 pass.slaves.end());
    std::set<std::string>& members = pass.members[bond];
    if (!cutOff) {
        members = std::move(listed);
        return {};
    }
    std::ranges::set_difference(members, listed, std::back_inserter(pass.slaves));
    members.merge(listed);
    return members;
}

/// The next pass must find these as the last one left them, or a fail-over would never be told.
void keepStates(OSHWMI_IND::Pass& pass, const std::set<std::string>& names) {
    for (const std::string& name : names) {
        if (const auto state = stateOf(pass.previous, name)) {
            pass.current[name] = *state;
        }
    }
}

}  // namespace

void OsHwMI::createCurNetNodeMap() {
    const LogScope scope("OsHwMI::createCurNetNodeMap(): entry", "returning from createCurNetNodeMap",
                         indicationsLogSource);
    OSHWMI_IND::Pass& pass = OSHWMI_IND::pass();
    pass.current.clear();
    pass.untold.clear();
    std::set<std::string> unjudged;
    for (const auto& [key, node] : nodesByName()) {
        const unsigned int before = commandsCutOff();
        const auto now = readState(*node);
        const std::string& name = now ? now->name : key;
        std::optional<unsigned int> state = now ? std::optional(now->state) : std::nullopt;
        // A bond that was cut off in its own answer has members all the same: they raise no alerts.
        const bool isBond = contains(name, "bond") && (now || commandsCutOff() != before);
        const std::size_t slaves = pass.slaves.size();
        if (isBond) {
            logInd(kProgress) << "Calling bondedNetNodeStatus() for bonded interface: " << name;
            const unsigned int failOver = bondedNetNodeStatus(name);
            state = failOver == LinkState::noVerdict ? state : failOver;
        }
        const bool cutOff = commandsCutOff() != before;
        if (cutOff) {
            state = stateOf(pass.previous, name);
            pass.untold.push_back(name);
        }
        if (isBond) {
            unjudged.merge(membersWithoutVerdict(pass, name, slaves, cutOff));
        }
        if (state) {
            pass.current[name] = *state;
        }
    }
    keepStates(pass, unjudged);
}

unsigned int OsHwMI::bondedNetNodeStatus(const std::string& bond) {
    const Operation operation;
    logInd(kProgress) << "bondedNetNodeStatus: entry";
    HostCommand command(formatCommand(
        "cat /proc/net/bonding/%s 2> /dev/null | grep \"Slave Interface: \" 2> /dev/null", bond));
    if (!command.started()) {
        logInd(kError) << "OsHwMI::bondedNetNodeStatus - grepping slave device error";
        return LinkState::noVerdict;
    }
    std::vector<std::string> members;
    while (const auto line = command.nextLine()) {
        members.push_back(slaveName(*line));
        logInd(kProgress) << "OsHwMI::bondedNetNodeStatus - slaveInterface is: " << members.back();
        OSHWMI_IND::pass().slaves.push_back(members.back());
    }
    unsigned int status = LinkState::noVerdict;
    for (auto member = members.begin(); member != members.end() && status == LinkState::noVerdict; ++member) {
        status = memberVerdict(*member);
    }
    logInd(kProgress) << "Returning from bondedNetNodeStatus(). Status: " << status;
    return status;
}

unsigned int OsHwMI::memberVerdict(const std::string& member) const {
    // Compared with the last pass only: the current map is still being built when this is asked.
    const auto before = OSHWMI_IND::pass().previous.find(member);
    if (before == OSHWMI_IND::pass().previous.end()) {
        return LinkState::noVerdict;
    }
    const auto node = findNetworkPort(member);  // held, however long the host takes to answer
    if (!node) {
        return LinkState::noVerdict;
    }
    const auto now = readState(*node);
    return now && now->name == member ? verdict(before->second, now->state) : LinkState::noVerdict;
}

}  // namespace IC
