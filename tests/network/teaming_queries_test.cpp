#include "network/teaming_queries.h"

#include "tests/network/bonding_files.h"
#include "tests/support/command_lines.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using testing::UnorderedElementsAre;
using Lines = std::vector<std::string>;

constexpr char kMac[] = "00:0c:29:00:00:0a";

std::string ask(const std::string& port, unsigned int id, const std::string& team) {
    std::string result = "untouched";
    std::string master = team;
    IC::getNICTeamingInformation(port, id, result, master);
    EXPECT_EQ(master, team);
    return result;
}

/// Status and failure count of a member.
std::string health(const std::string& port) {
    return ask(port, 195, "bond0") + " " + ask(port, 196, "bond0");
}

std::string statusCommand(const std::string& port) {
    return "cat /proc/net/bonding/bond0 2> /dev/null | grep -P \"Slave Interface: " + port +
           "\\nMII Status\" 2> /dev/null | grep \"MII Status: \" 2> /dev/null | cut -d' ' -f3 2> /dev/null";
}

std::string failuresCommand(const std::string& port, const std::string& status) {
    return "cat /proc/net/bonding/bond0 2> /dev/null | grep -P \"Slave Interface: " + port +
           "\\nMII Status: " + status +
           "\\n\" 2> /dev/null | grep \"Link Failure Count: \" 2> /dev/null | cut -d ' ' -f4 2> /dev/null";
}

std::string roleCommand(const std::string& key) {
    return "cat /etc/sysconfig/network/ifcfg-eth-id-`ifconfig eth0 2> /dev/null |grep HWaddr |awk '{print "
           "$5}'"
           "|tr '[A-Z]' '[a-z]'` | grep " +
           key + " | cut -d '=' -f2 2> /dev/null";
}

std::string modeOf(const std::string& team) {
    std::string mode = "old";
    EXPECT_TRUE(IC::getBondingMode(team, mode));
    return mode;
}

Lines membersOf(const std::string& team) {
    Lines members;
    EXPECT_TRUE(IC::getBondingMembers(team, members));
    return members;
}

HOST_TEST(Teams, AreTheDriversFilesWithoutBackups) {
    for (const char* name : {"bond0", "bond1", "bond0~", ".bond2", "~team"}) {
        installBond(host, name, "active-backup");
    }
    Lines teams{"before"};
    EXPECT_TRUE(IC::getNICTeams(teams));
    EXPECT_EQ(teams.front(), "before");
    EXPECT_THAT(teams, UnorderedElementsAre("before", "bond0", "bond1", "~team"));
}

HOST_TEST(Teams, AreNoneButReadInAnEmptyDirectory) {
    host.directory("/proc/net/bonding");
    Lines teams;
    LogCapture capture;
    EXPECT_TRUE(IC::getNICTeams(teams));
    EXPECT_THAT(teams, IsEmpty());
    EXPECT_THAT(capture.messages(3000), TextsAre("Entering getNICTeams", "Exiting getNICTeams"));
}

HOST_TEST(Teams, AreNotReadWithoutADriver) {
    Lines teams{"before"};
    LogCapture capture;
    EXPECT_FALSE(IC::getNICTeams(teams));
    EXPECT_THAT(teams, TextsAre("before"));
    EXPECT_THAT(capture.messages(), TextsAre("Entering getNICTeams", "Exiting getNICTeams"));
}

HOST_TEST(BondingMode, IsTheDriversWords) {
    installBond(host, "bond0", "active-backup");
    installBond(host, "bond1", "802.3ad");
    installBond(host, "bond2", "802.3ad-details");
    installBond(host, "bond3", "no-members");
    EXPECT_EQ(modeOf("bond0"), "fault-tolerance (active-backup)");
    EXPECT_EQ(modeOf("bond1"), "IEEE 802.3ad Dynamic link aggregation");
    EXPECT_EQ(modeOf("bond2"), "IEEE 802.3ad Dynamic link aggregation");
    EXPECT_EQ(modeOf("bond3"), "load balancing (round-robin)");
}

HOST_TEST(BondingMode, LosesTheBlanksBeforeItAlone) {
    host.file("/proc/net/bonding/bond0", "Bonding Mode:   two  words \n");
    host.file("/proc/net/bonding/bond1", "Bonding Mode: \n");
    EXPECT_EQ(modeOf("bond0"), "two  words ");
    EXPECT_EQ(modeOf("bond1"), "") << "a line all the same";
}

HOST_TEST(BondingMode, IsEmptyWithoutAFileOrALine) {
    host.file("/proc/net/bonding/bond1", "Ethernet Channel Bonding Driver\nBonding Mode:none\n");
    const CommandLines commands;
    LogCapture capture;
    for (const char* team : {"bond0", "bond1"}) {
        std::string mode = "old";
        EXPECT_FALSE(IC::getBondingMode(team, mode));
        EXPECT_EQ(mode, "");
    }
    EXPECT_EQ(
        commands.all().front(),
        "cat /proc/net/bonding/bond0 2> /dev/null | grep \"Bonding Mode: \" | cut -d ':' -f2 2> /dev/null");
    EXPECT_EQ(capture.messages(3000), (Lines{"Entering getBondingMode", "Exiting getBondingMode",
                                             "Entering getBondingMode", "Exiting getBondingMode"}));
}

HOST_TEST(BondingMode, IsEmptyWhenTheShellCannotBeStarted) {
    installBond(host, "bond0", "active-backup");
    const NoDescriptors none;
    std::string mode = "old";
    EXPECT_FALSE(IC::getBondingMode("bond0", mode));
    EXPECT_EQ(mode, "");
    Lines members;
    EXPECT_FALSE(IC::getBondingMembers("bond0", members));
}

HOST_TEST(BondingMembers, AreInTheOrderOfTheFile) {
    installBond(host, "bond0", "active-backup-down");
    installBond(host, "bond1", "802.3ad");
    installBond(host, "bond2", "802.3ad-details");
    EXPECT_THAT(membersOf("bond0"), TextsAre("eth10", "eth1", "eth2"));
    EXPECT_THAT(membersOf("bond1"), TextsAre("eth0", "eth1"));
    EXPECT_THAT(membersOf("bond2"), TextsAre("eth2", "eth3"));
}

HOST_TEST(BondingMembers, AreNoneInATeamNobodyJoined) {
    installBond(host, "bond0", "no-members");
    Lines members{"before"};
    const CommandLines commands;
    LogCapture capture;
    EXPECT_FALSE(IC::getBondingMembers("bond0", members));
    EXPECT_THAT(members, TextsAre("before"));
    EXPECT_THAT(
        commands.all(),
        TextsAre("cat /proc/net/bonding/bond0 2> /dev/null | grep \"Slave Interface: \" | cut -d ':' -f2 "
                 "2> /dev/null"));
    EXPECT_THAT(capture.messages(3000), TextsAre("Entering getBondingMembers", "Exiting getBondingMembers"));
}

HOST_TEST(TeamingRole, IsInTheInterfacesFile) {
    host.tool("ifconfig eth0", "eth0      Link encap:Ethernet  HWaddr 00:0C:29:00:00:0A  \n");
    host.file(std::string("/etc/sysconfig/network/ifcfg-eth-id-") + kMac,
              "BOOTPROTO=none\nMASTER=bond0\nSLAVE=yes\nSLAVE_X=no\n");
    const CommandLines commands;
    LogCapture capture;
    std::string slave = "old";
    std::string master = "old";
    IC::getNICTeamingInformation("eth0", 193, slave, master);
    EXPECT_EQ(slave, "yes");
    EXPECT_EQ(master, "bond0");
    EXPECT_THAT(commands.all(), ElementsAre(roleCommand("SLAVE"), roleCommand("MASTER")));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering getNICTeamingInformation", "Exiting getNICTeamingInformation"));
}

HOST_TEST(TeamingRole, IsEmptyOutsideATeam) {
    host.tool("ifconfig eth0", "eth0      Link encap:Ethernet  HWaddr 00:0C:29:00:00:0A  \n");
    host.file(std::string("/etc/sysconfig/network/ifcfg-eth-id-") + kMac, "BOOTPROTO=none\n");
    std::string slave = "old";
    std::string master = "old";
    IC::getNICTeamingInformation("eth0", 193, slave, master);
    EXPECT_EQ(slave, "");
    EXPECT_EQ(master, "");
}

HOST_TEST(ActiveMember, IsTheDriversLine) {
    installBond(host, "bond0", "active-backup");
    const CommandLines commands;
    EXPECT_EQ(ask("eth0", 194, "bond0"), "Currently Active Slave: eth0");
    EXPECT_EQ(ask("eth1", 194, "bond0"), "");
    EXPECT_EQ(
        commands.all().front(),
        "cat /proc/net/bonding/bond0 2> /dev/null | grep -i \"Currently Active Slave: eth0\" 2> /dev/null");
}

HOST_TEST(ActiveMember, Eth1FindsTheLineOfEth10) {
    installBond(host, "bond0", "active-backup-down");
    EXPECT_EQ(ask("eth1", 194, "bond0"), "Currently Active Slave: eth10");
    EXPECT_EQ(ask("eth10", 194, "bond0"), "Currently Active Slave: eth10");
    EXPECT_EQ(ask("ETH10", 194, "bond0"), "Currently Active Slave: eth10") << "case does not count";
    EXPECT_EQ(ask("eth2", 194, "bond0"), "");
}

HOST_TEST(ActiveMember, OfATeamWithoutAFileIsNotEvenAskedFor) {
    host.directory("/proc/net/bonding");
    const CommandLines commands;
    EXPECT_EQ(ask("eth0", 194, "bond0"), "");
    EXPECT_THAT(commands.all(), IsEmpty());
}

HOST_TEST(ActiveMember, IsNobodyWhereTheDriverHasNone) {
    installBond(host, "bond0", "802.3ad");
    EXPECT_EQ(ask("eth0", 194, "bond0"), "");
}

HOST_TEST(MemberHealth, IsTheMembersOwnInEveryDriverGeneration) {
    installBond(host, "bond0", "active-backup");
    EXPECT_EQ(health("eth0"), "up 0");
    EXPECT_EQ(health("eth1"), "up 3");
    installBond(host, "bond0", "active-backup-down");
    EXPECT_EQ(health("eth10"), "up 10");
    EXPECT_EQ(health("eth1"), "down 1");
    EXPECT_EQ(health("eth2"), "going 2");
    installBond(host, "bond0", "802.3ad");
    EXPECT_EQ(health("eth0"), "up 4");
    EXPECT_EQ(health("eth1"), "down 7");
    installBond(host, "bond0", "802.3ad-details");
    EXPECT_EQ(health("eth2"), "up 0");
    EXPECT_EQ(health("eth3"), "up 12");
}

HOST_TEST(MemberHealth, IsOfADriversFileWhateverTheTeamIsCalled) {
    installBond(host, "bond0", "802.3ad");
    host.file("/etc/bond0", *host.read("/proc/net/bonding/bond0") + "Currently Active Slave: eth1\n");
    for (const unsigned int id : {194U, 195U, 196U}) {
        EXPECT_EQ(ask("eth1", id, "/etc/bond0"), "");
    }
    const CommandLines commands;
    ask("eth1", 194, "/etc/bond0");
    EXPECT_THAT(commands.all(), IsEmpty()) << "the driver has no such file";
}

HOST_TEST(MemberHealth, IsEmptyForWhoIsNoMember) {
    installBond(host, "bond0", "active-backup-down");
    EXPECT_EQ(health("eth"), " ");
    EXPECT_EQ(health("eth100"), " ");
    installBond(host, "bond0", "no-members");
    EXPECT_EQ(health("eth0"), " ");
    host.remove("/proc/net/bonding/bond0");
    EXPECT_EQ(health("eth0"), " ");
    EXPECT_EQ(ask("eth0", 195, "") + ask("eth0", 196, ""), "");
}

HOST_TEST(MemberHealth, CommandsAreRunFirstAsTheyAre) {
    installBond(host, "bond0", "802.3ad");
    const CommandLines commands;
    LogCapture capture;
    EXPECT_EQ(ask("eth1", 196, "bond0"), "7");
    EXPECT_THAT(commands.all(), ElementsAre(statusCommand("eth1"), failuresCommand("eth1", "down")));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering getNICTeamingInformation", "Entering getNICTeamingInformation",
                         "Exiting getNICTeamingInformation", "Exiting getNICTeamingInformation"));
}

HOST_TEST(MemberHealth, IsWhatACommandPrintsThatCanMatchTwoLines) {
    installBond(host, "bond0", "802.3ad");
    host.tool("grep -P 'Slave Interface: eth1\\nMII Status'", "Slave Interface: eth1\nMII Status: back\n");
    host.tool("grep -P 'Slave Interface: eth1\\nMII Status: back\\n'", "Link Failure Count: 99\n");
    host.tool("grep 'MII Status: '", "MII Status: back\n");
    host.tool("grep 'Link Failure Count: '", "Link Failure Count: 99\n");
    EXPECT_EQ(ask("eth1", 195, "bond0"), "back");
    EXPECT_EQ(ask("eth1", 196, "bond0"), "99");
}

HOST_TEST(MemberHealth, CountOfAMemberThatChangedItsStateMeanwhileIsNotGiven) {
    installBond(host, "bond0", "802.3ad");
    host.tool("grep -P 'Slave Interface: eth1\\nMII Status'", "Slave Interface: eth1\nMII Status: up\n");
    host.tool("grep -P 'Slave Interface: eth1\\nMII Status: up\\n'", "", 1);
    host.tool("grep 'MII Status: '", "MII Status: up\n");
    host.tool("grep 'Link Failure Count: '", "", 1);
    EXPECT_EQ(ask("eth1", 196, "bond0"), "");
}

HOST_TEST(MemberHealth, IsReadFromTheFileWhenTheShellHasNoTools) {
    installBond(host, "bond0", "active-backup-down");
    host.toolMissing("grep");
    EXPECT_EQ(health("eth1"), "down 1");
}

HOST_TEST(TeamingInformation, TakesTheTeamOutOfItsQuotesAndBlanksInCommandsAndPaths) {
    installBond(host, "bond0", "active-backup");
    for (const char* master : {"'bond0'", "\"bond0\"", " bond0 ", " \" bond0\" ", "\t'bond0'\t"}) {
        const CommandLines commands;
        EXPECT_EQ(ask("eth0", 194, master), "Currently Active Slave: eth0") << master;
        EXPECT_EQ(ask("eth1", 195, master), "up") << master << ", read straight from the file";
        EXPECT_EQ(ask("eth1", 196, master), "3") << master;
        EXPECT_THAT(commands.all(), Each(StartsWith("cat /proc/net/bonding/bond0 2> /dev/null | grep ")));
        EXPECT_EQ(commands.all().size(), 4U);
    }
    EXPECT_EQ(ask("eth0", 194, "'bond0'x"), "") << "inside of it they stay";
    for (const char* nobody : {"''", "\"", "  "}) {
        EXPECT_EQ(ask("eth0", 194, nobody) + ask("eth0", 195, nobody) + ask("eth0", 196, nobody), "");
    }
}

HOST_TEST(TeamingInformation, KnowsNoOtherQuestion) {
    installBond(host, "bond0", "active-backup");
    const CommandLines commands;
    for (const unsigned int id : {0U, 192U, 197U, 199U}) {
        EXPECT_EQ(ask("eth0", id, "bond0"), "untouched");
    }
    EXPECT_THAT(commands.all(), IsEmpty());
}

}  // namespace
