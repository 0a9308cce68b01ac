// What two passes come to, without a host: states of the last pass, what the nodes tell now and the members
// known before give the states of this pass and the alerts.
#include "indications/comparison.h"

#include <gmock/gmock.h>

#include "tests/support/texts_are.h"

namespace {

using IC::BondMembers;
using IC::LinkStates;
using IC::Reading;
using Texts = std::vector<std::string>;

Reading port(const std::string& name, unsigned int state) {
    return {name, state, false, false, {}};
}
Reading cutOff(const std::string& name, unsigned int state) {
    return {name, state, false, true, {}};
}
Reading bond(const std::string& name, unsigned int state, Texts members) {
    return {name, state, true, false, std::move(members)};
}
Reading bondCutOff(const std::string& name, Texts members) {
    return {name, std::nullopt, true, true, std::move(members)};
}

struct TwoPasses {
    const char* title;
    LinkStates previous;
    std::vector<Reading> readings;
    BondMembers known;
    LinkStates current;
    Texts alerts;  ///< "eth0: message"; without a message for a state that is told by none
    Texts untold = {};
    Texts slaves = {};
};

const std::vector<TwoPasses> kPasses = {
    {"nothing, nothing", {}, {}, {}, {}, {}},
    {"first seen", {}, {port("eth0", 12)}, {}, {{"eth0", 12}}, {}},
    {"gone", {{"eth0", 1}}, {}, {}, {}, {}},
    {"the same", {{"eth0", 1}}, {port("eth0", 1)}, {}, {{"eth0", 1}}, {}},
    {"down", {{"eth0", 1}}, {port("eth0", 12)}, {}, {{"eth0", 12}}, {"eth0: NIC is Offline "}},
    {"up", {{"eth0", 12}}, {port("eth0", 1)}, {}, {{"eth0", 1}}, {"eth0: NIC is Online "}},
    {"not told", {{"eth0", 12}}, {port("eth0", 7)}, {}, {{"eth0", 7}}, {"eth0"}},
    {"not read", {{"eth0", 1}}, {{"eth0", std::nullopt, false, false, {}}}, {}, {}, {}},
    {"in the order of the names",
     {{"eth1", 1}, {"eth0", 1}},
     {port("eth1", 12), port("eth0", 12)},
     {},
     {{"eth0", 12}, {"eth1", 12}},
     {"eth0: NIC is Offline ", "eth1: NIC is Offline "}},
    {"cut off", {{"eth0", 1}}, {cutOff("eth0", 12)}, {}, {{"eth0", 1}}, {}, {"eth0"}},
    {"cut off when first seen", {}, {cutOff("eth0", 12)}, {}, {}, {}, {"eth0"}},
    {"a bond switches over, its member tells nothing",
     {{"bond0", 1}, {"eth0", 1}},
     {bond("bond0", 32, {"eth0"}), port("eth0", 12)},
     {},
     {{"bond0", 32}, {"eth0", 12}},
     {"bond0: NIC has Switched Over "},
     {},
     {"eth0"}},
    {"a bond switches back",
     {{"bond0", 32}},
     {bond("bond0", 33, {})},
     {},
     {{"bond0", 33}},
     {"bond0: NIC has Switched Back "}},
    {"a port that has left its bond tells again",
     {{"bond0", 1}, {"eth0", 1}},
     {bond("bond0", 1, {}), port("eth0", 12)},
     {{"bond0", {"eth0"}}},
     {{"bond0", 1}, {"eth0", 12}},
     {"eth0: NIC is Offline "}},
    {"a bond that is cut off keeps its members' states, those of earlier passes too",
     {{"bond0", 1}, {"eth0", 1}, {"eth1", 1}, {"eth2", 1}},
     {bondCutOff("bond0", {"eth1"}), port("eth0", 12), port("eth1", 12), port("eth2", 12)},
     {{"bond0", {"eth0"}}},
     {{"bond0", 1}, {"eth0", 1}, {"eth1", 1}, {"eth2", 12}},
     {"eth2: NIC is Offline "},
     {"bond0"},
     {"eth1", "eth0"}},
};

Texts alertsOf(const LinkStates& previous, const IC::Settled& now) {
    Texts told;
    for (const IC::Compared& compared : IC::compare(previous, now.current, now.slaves)) {
        if (compared.hasChanged && !compared.isMember) {
            const std::string message = compared.kind != nullptr ? compared.kind->message : "";
            told.push_back(compared.name + (message.empty() ? "" : ": " + message));
        }
    }
    return told;
}

TEST(Comparison, OfTwoPassesGivesTheStatesAndTheAlerts) {
    for (const TwoPasses& row : kPasses) {
        SCOPED_TRACE(row.title);
        BondMembers members = row.known;
        const IC::Settled now = IC::settle(row.previous, row.readings, members);
        EXPECT_EQ(now.current, row.current);
        EXPECT_EQ(now.untold, row.untold);
        EXPECT_EQ(now.slaves, row.slaves);
        EXPECT_EQ(alertsOf(row.previous, now), row.alerts);
    }
}

TEST(Comparison, KeepsTheMembersThatABondListedLast) {
    BondMembers members = {{"bond0", {"eth0"}}, {"bond1", {"eth7"}}};
    IC::settle({}, {bondCutOff("bond0", {"eth1"})}, members);
    EXPECT_EQ(members, (BondMembers{{"bond0", {"eth0", "eth1"}}, {"bond1", {"eth7"}}}));
    IC::settle({}, {bond("bond0", 1, {"eth2"})}, members);
    EXPECT_EQ(members, (BondMembers{{"bond0", {"eth2"}}, {"bond1", {"eth7"}}}));
}

TEST(Comparison, OfAMemberTellsOfAFailOver) {
    struct Row {
        unsigned int before, now, verdict;
    };
    for (const Row& row : {Row{1, 12, 32}, {12, 1, 33}, {1, 1, 34}, {12, 12, 34}, {32, 1, 34}, {1, 33, 34}}) {
        EXPECT_EQ(IC::failOver(row.before, row.now), row.verdict) << row.before << " to " << row.now;
    }
}

}  // namespace
