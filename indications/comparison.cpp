#include "indications/comparison.h"

#include <algorithm>
#include <iterator>

namespace IC {

namespace {

// The switch-back alert carries the switch-over code: receivers key on it. Only message and property tell
// them apart.
constexpr AlertKind kAlertKinds[] = {
    {LinkState::up, "NIC is Online ", 3, LinkState::up, false},
    {LinkState::down, "NIC is Offline ", 1, LinkState::down, false},
    {LinkState::switchedOver, "NIC has Switched Over ", 1, LinkState::switchedOver, true},
    {LinkState::switchedBack, "NIC has Switched Back ", 1, LinkState::switchedOver, true},
};

const AlertKind* alertKind(unsigned int state) {
    const auto* found = std::ranges::find(kAlertKinds, state, &AlertKind::state);
    return found == std::end(kAlertKinds) ? nullptr : found;
}

std::optional<unsigned int> stateOf(const LinkStates& states, const std::string& name) {
    const auto found = states.find(name);
    return found == states.end() ? std::nullopt : std::optional(found->second);
}

}  // namespace

Settled settle(const LinkStates& previous, const std::vector<Reading>& readings, BondMembers& members) {
    Settled pass;
    std::set<std::string> unjudged;
    for (const Reading& reading : readings) {
        if (const auto state = reading.cutOff ? stateOf(previous, reading.name) : reading.state) {
            pass.current[reading.name] = *state;
        }
        if (reading.cutOff) {
            pass.untold.push_back(reading.name);
        }
        if (!reading.isBond) {
            continue;
        }
        std::set<std::string> listed(reading.members.begin(), reading.members.end());
        std::set<std::string>& known = members[reading.name];
        std::ranges::copy(reading.members, std::back_inserter(pass.slaves));
        if (reading.cutOff) {
            std::ranges::set_difference(known, listed, std::back_inserter(pass.slaves));
            known.merge(listed);
            unjudged.insert(known.begin(), known.end());
        } else {
            known = std::move(listed);
        }
    }
    for (const std::string& name : unjudged) {
        if (const auto state = stateOf(previous, name)) {
            pass.current[name] = *state;
        }
    }
    return pass;
}

unsigned int failOver(unsigned int before, unsigned int now) {
    if (before == LinkState::up && now == LinkState::down) {
        return LinkState::switchedOver;
    }
    if (before == LinkState::down && now == LinkState::up) {
        return LinkState::switchedBack;
    }
    return LinkState::noVerdict;
}

std::vector<Compared> compare(const LinkStates& previous, const LinkStates& current,
                              const std::vector<std::string>& slaves) {
    std::vector<Compared> all;
    for (const auto& [name, before] : previous) {
        const unsigned int now = stateOf(current, name).value_or(before);
        const bool isMember = std::ranges::find(slaves, name) != slaves.end();
        all.push_back({name, isMember, now != before, now, alertKind(now)});
    }
    return all;
}

}  // namespace IC
