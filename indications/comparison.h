#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "framework/ic/link_state.h"

namespace IC {

namespace LinkState {

constexpr unsigned int noVerdict = 34;  ///< the bond's members tell of no fail-over

// Properties the states are read from.
constexpr unsigned int nameProperty = 108;
constexpr unsigned int stateProperty = 123;

}  // namespace LinkState

// What the states of two passes come to. Nothing here asks the host, logs or keeps anything.

using LinkStates = std::map<std::string, unsigned int>;            ///< by interface
using BondMembers = std::map<std::string, std::set<std::string>>;  ///< by bond

/// What one node has told in a pass.
struct Reading {
    std::string name;
    std::optional<unsigned int> state;  ///< of a bond: that of its fail-over, if there was one
    bool isBond = false;
    bool cutOff = false;               ///< a command was ended by force: the state is not the host's
    std::vector<std::string> members;  ///< of a bond, as the kernel lists them
};

/// The states of a pass.
struct Settled {
    LinkStates current;
    std::vector<std::string> slaves;  ///< the member ports of all bonds
    std::vector<std::string> untold;  ///< the interfaces about which a command was ended by force
};

/// An interface of which a command was ended by force keeps its state of the last pass. A bond's members keep
/// theirs with it: the next pass must find them as the last one left them, or a fail-over would never be
/// told. Of such a bond the members of earlier passes count too, for the listing may not be whole.
/// @param members of each bond as it was listed last; brought up to date
Settled settle(const LinkStates& previous, const std::vector<Reading>& readings, BondMembers& members);

/// What one member's change means for its bond: LinkState::switchedOver, switchedBack or noVerdict.
unsigned int failOver(unsigned int before, unsigned int now);

/// What the agent is told of a state that is new.
struct AlertKind {
    unsigned int state;
    const char* message;  ///< the blank at its end is part of it
    unsigned char firstCode;
    unsigned int eventCode;
    bool marksNode;  ///< the node's status and state property take the new state before the alert goes out
};

/// One interface of the last pass.
struct Compared {
    const std::string& name;
    bool isMember;          ///< of a bond, which tells in its place
    bool hasChanged;        ///< false when it has disappeared
    unsigned int state;     ///< the new one
    const AlertKind* kind;  ///< null for a state that is not told
};

/// All interfaces of the last pass, in the order of their names.
/// @param previous must outlive the result
std::vector<Compared> compare(const LinkStates& previous, const LinkStates& current,
                              const std::vector<std::string>& slaves);

}  // namespace IC
