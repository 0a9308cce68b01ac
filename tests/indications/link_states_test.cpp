#include <gmock/gmock.h>

#include "indications/globals.h"
#include "tests/indications/interfaces.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

const std::string kBond =
    "Ethernet Channel Bonding Driver: v3.0.3 (March 23, 2006)\n\nBonding Mode: fault-tolerance "
    "(active-backup)\n"
    "Primary Slave: None\nCurrently Active Slave: eth0\nMII Status: up\n\n"
    "Slave Interface: eth0\nMII Status: up\nLink Failure Count: 0\nPermanent HW addr: 00:0c:29:00:00:01\n\n"
    "Slave Interface: eth1\nMII Status: up\nLink Failure Count: 0\nPermanent HW addr: 00:0c:29:00:00:02\n";

/// A bond of eth0 and eth1 whose states of the last pass are as given.
class Bond {
public:
    Bond(FakeHost& host, std::map<std::string, unsigned int> previous)
        : eth0(interfaces.add("eth0", 1)), eth1(interfaces.add("eth1", 1)), bond(interfaces.add("bond0", 1)) {
        host.file("/proc/net/bonding/bond0", kBond);
        interfaces.previous() = std::move(previous);
    }
    unsigned int state() {
        interfaces.mi().createCurNetNodeMap();
        return interfaces.current().at("bond0");
    }
    /// As writing and reading the file does it.
    void nextPass() { interfaces.previous() = interfaces.current(); }

    Interfaces interfaces;
    InterfaceNode& eth0;
    InterfaceNode& eth1;
    InterfaceNode& bond;
};

HOST_TEST(LinkStates, AreReadFromTheNodesInTheOrderOfTheirNames) {
    Interfaces interfaces;
    interfaces.add("eth1", 12);
    interfaces.add("eth0", 1);
    interfaces.current()["gone"] = 1;
    LogCapture capture;
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(interfaces.current(), ElementsAre(Pair("eth0", 1), Pair("eth1", 12)));
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("OsHwMI::createCurNetNodeMap(): entry", "returning from createCurNetNodeMap"));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(LinkStates, PassOverANodeThatCannotBeRead) {
    Interfaces interfaces;
    interfaces.add("eth0", 1);
    auto* nameless = new IC::MutableNode(200, 1, {1}, 12, 1);
    IC::OsHwMITestAccess::addInterface(interfaces.mi(), "eth1", nameless);
    nameless->setProperty(123, {IC::Number(1U), true});
    auto* stateless = new IC::MutableNode(201, 1, {1}, 12, 2);
    stateless->setProperty(108, {"eth2", true});
    IC::OsHwMITestAccess::addInterface(interfaces.mi(), "eth2", stateless);
    auto& odd = interfaces.add("eth3", 1);
    odd.setProperty(123, {"not a number", true});
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(interfaces.current(), ElementsAre(Pair("eth0", 1)));
}

HOST_TEST(LinkStates, StayAsTheyWereWhereACommandWasEnded) {
    Interfaces interfaces;
    interfaces.add("eth0", 12);
    interfaces.add<AskedNode>("eth1", 12).hangs = true;
    interfaces.add<AskedNode>("eth2", 12).hangs = true;
    interfaces.add<AskedNode>("eth3", 12);
    interfaces.previous() = {{"eth0", 1}, {"eth1", 1}, {"eth3", 1}};
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(interfaces.current(), ElementsAre(Pair("eth0", 12), Pair("eth1", 1), Pair("eth3", 12)))
        << "eth2 has none yet";
    EXPECT_THAT(Interfaces::untold(), TextsAre("eth1", "eth2"));
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(Interfaces::untold(), TextsAre("eth1", "eth2")) << "those of the last pass alone";
}

HOST_TEST(LinkStates, OfANodeThatCannotBeReadStayToo) {
    Interfaces interfaces;
    auto& odd = interfaces.add<AskedNode>("eth0", 1);
    odd.setProperty(123, {"not a number", true});
    odd.hangs = true;
    interfaces.previous() = {{"eth0", 12}};
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(interfaces.current(), ElementsAre(Pair("eth0", 12)));
}

HOST_TEST(LinkStates, GoByTheNameThatTheNodeItselfGives) {
    Interfaces interfaces;
    interfaces.add("bond0", 1).setProperty(108, {"eth5", true});
    interfaces.add("eth6", 12).setProperty(108, {"teambond6", true});
    const CommandLines commands;
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(interfaces.current(), ElementsAre(Pair("eth5", 1), Pair("teambond6", 12)));
    EXPECT_THAT(commands.all(), TextsAre("cat /proc/net/bonding/teambond6 2> /dev/null | grep \"Slave "
                                         "Interface: \" 2> /dev/null"));
}

HOST_TEST(LinkStates, OfABondAreItsOwnWhileNoMemberChanges) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"bond0", 1}});
    bond.bond.is(12);
    EXPECT_EQ(bond.state(), 12U);
}

HOST_TEST(LinkStates, OfABondAreSwitchedOverWhenAMemberGoesDown) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"bond0", 1}});
    bond.eth0.is(12);
    EXPECT_EQ(bond.state(), 32U);
}

HOST_TEST(LinkStates, OfABondAreSwitchedBackWhenAMemberComesBack) {
    Bond bond(host, {{"eth0", 12}, {"eth1", 1}, {"bond0", 1}});
    EXPECT_EQ(bond.state(), 33U);
}

HOST_TEST(LinkStates, OfABondAreDecidedByItsFirstChangedMember) {
    Bond bond(host, {{"eth0", 12}, {"eth1", 1}, {"bond0", 1}});
    bond.eth1.is(12);
    EXPECT_EQ(bond.state(), 33U) << "eth0 came back and stands before eth1, which went down";
}

HOST_TEST(LinkStates, OfABondCompareMembersWithTheLastPassAlone) {
    Bond bond(host, {{"bond0", 1}});
    bond.interfaces.current() = {{"eth0", 1}, {"eth1", 1}};
    bond.eth0.is(12);
    EXPECT_EQ(bond.state(), 1U) << "eth0 was not in the last pass; that this pass has seen it does not count";
}

HOST_TEST(LinkStates, OfABondPassOverMembersWithoutANode) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"eth9", 1}, {"bond0", 1}});
    host.file("/proc/net/bonding/bond0", "Slave Interface: eth9\nSlave Interface: eth1\n");
    bond.eth1.is(12);
    EXPECT_EQ(bond.state(), 32U);
}

HOST_TEST(LinkStates, OfABondPassOverAMemberThatIsCalledOtherwiseOrCannotBeRead) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"bond0", 1}});
    bond.eth0.is(12);
    bond.eth0.setProperty(108, {"renamed", true});
    bond.eth1.setProperty(123, {"?", true});
    EXPECT_EQ(bond.state(), 1U);
}

HOST_TEST(LinkStates, OfABondIgnoreCodesThatAreNeitherUpNorDown) {
    Bond bond(host, {{"eth0", 32}, {"eth1", 1}, {"bond0", 32}});
    bond.eth1.is(33);
    EXPECT_EQ(bond.state(), 1U);
}

HOST_TEST(LinkStates, GatherTheMembersOfAllBonds) {
    Bond bond(host, {});
    host.file("/proc/net/bonding/bond1", "Slave Interface: eth7.100\nSlave Interface:   eth8\n");
    bond.interfaces.add("bond1", 1);
    LogCapture capture;
    bond.interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(Interfaces::slaves(), TextsAre("eth0", "eth1", "eth7.100", "eth8"));
    EXPECT_THAT(capture.ownMessages(3000),
                testing::IsSupersetOf({"Calling bondedNetNodeStatus() for bonded interface: bond0",
                                       "bondedNetNodeStatus: entry",
                                       "OsHwMI::bondedNetNodeStatus - slaveInterface is: eth0",
                                       "OsHwMI::bondedNetNodeStatus - slaveInterface is: eth8",
                                       "Returning from bondedNetNodeStatus(). Status: 34"}));
    EXPECT_TRUE(capture.everyLineTwice());
    EXPECT_EQ(capture.ownLines().front().source, "OsHwMIInd_ix86");
    EXPECT_EQ(capture.ownLines().front().component, "Corvista.IC.MI.OsHwMIInd");
}

HOST_TEST(LinkStates, GiveNoVerdictWhenTheMembersCannotBeAsked) {
    Bond bond(host, {{"eth0", 1}, {"bond0", 1}});
    bond.eth0.is(12);
    LogCapture capture;
    const NoDescriptors none;
    EXPECT_EQ(bond.interfaces.mi().bondedNetNodeStatus("bond0"), 34U);
    EXPECT_THAT(capture.ownMessages(6000),
                TextsAre("OsHwMI::bondedNetNodeStatus - grepping slave device error"));
}

/// A tool by which somebody ends the shell that runs it.
constexpr char kKillsItsShell[] = "read -r _ _ _ shell _ < /proc/$PPID/stat; kill -KILL $shell";

HOST_TEST(LinkStates, OfABondStayWithThoseOfItsMembersWhenACommandOfOneWasEnded) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"eth5", 1}, {"bond0", 33}});
    host.file("/proc/net/bonding/bond0", "Slave Interface: eth5\nSlave Interface: eth0\n");
    auto& member = bond.interfaces.add<AskedNode>("eth5", 12);
    member.hangs = true;
    bond.eth0.is(12);
    bond.eth1.is(12);
    EXPECT_EQ(bond.state(), 33U);
    EXPECT_THAT(bond.interfaces.current(),
                ElementsAre(Pair("bond0", 33), Pair("eth0", 1), Pair("eth1", 12), Pair("eth5", 1)));
    member.hangs = false;
    member.is(1);
    bond.nextPass();
    EXPECT_EQ(bond.state(), 32U) << "eth0's going down is told as soon as it can be";
    EXPECT_EQ(bond.interfaces.current().at("eth0"), 12U);
}

HOST_TEST(LinkStates, OfAMemberStayWhereItWasEndedForItsBondAlone) {
    Bond bond(host, {{"eth1", 1}, {"eth5", 1}, {"bond0", 1}});
    host.file("/proc/net/bonding/bond0", "Slave Interface: eth5\n");
    bond.interfaces.add<AskedNode>("eth5", 12).hangsOnce = true;
    EXPECT_EQ(bond.state(), 1U);
    EXPECT_EQ(bond.interfaces.current().at("eth5"), 1U);
    bond.nextPass();
    EXPECT_EQ(bond.state(), 32U);
}

HOST_TEST(LinkStates, OfMembersRaiseNoAlertWhenTheirBondDoesNotTellOfThem) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"bond0", 1}, {"eth7", 1}});
    bond.interfaces.add("eth7", 12);
    const std::string listed = "Slave Interface: eth0\nSlave Interface: eth1\n";
    host.toolInTurn("grep %any", {{.out = listed}, {.out = "", .action = kKillsItsShell}, {.out = listed}});
    EXPECT_EQ(bond.state(), 1U);
    bond.nextPass();
    bond.eth0.is(12);
    EXPECT_EQ(bond.state(), 1U);
    EXPECT_THAT(Interfaces::slaves(), TextsAre("eth0", "eth1"));
    EXPECT_EQ(bond.interfaces.current().at("eth0"), 1U);
    EXPECT_EQ(bond.interfaces.current().at("eth7"), 12U);
    bond.nextPass();
    EXPECT_EQ(bond.state(), 32U);
}

HOST_TEST(LinkStates, OfMembersRaiseNoAlertWhenTheirBondItselfCannotBeRead) {
    Bond bond(host, {{"eth1", 1}, {"eth0", 1}, {"bond7", 12}});
    host.file("/proc/net/bonding/bond7", "Slave Interface: eth1\n");
    auto& hanging = bond.interfaces.add<AskedNode>("bond7", 1);
    hanging.setProperty(123, {"not a number", true});
    hanging.hangs = true;
    bond.eth1.is(12);
    bond.state();
    EXPECT_THAT(Interfaces::slaves(), testing::Contains("eth1"));
    EXPECT_EQ(bond.interfaces.current().at("bond7"), 12U);
    EXPECT_EQ(bond.interfaces.current().at("eth1"), 1U);
}

HOST_TEST(LinkStates, OfABondStayWhenItsMembersAreNotTold) {
    Bond bond(host, {{"eth0", 1}, {"eth1", 1}, {"bond0", 32}});
    host.tool("grep %any", ToolAnswer{.out = "", .action = kKillsItsShell});
    EXPECT_EQ(bond.state(), 32U);
}

HOST_TEST(LinkStates, OfABondWithoutAStatusFileAreItsOwn) {
    Interfaces interfaces;
    interfaces.add("bond0", 12);
    interfaces.mi().createCurNetNodeMap();
    EXPECT_THAT(interfaces.current(), ElementsAre(Pair("bond0", 12)));
    EXPECT_THAT(Interfaces::slaves(), IsEmpty());
}

}  // namespace
