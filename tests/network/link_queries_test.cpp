#include "network/link_queries.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>

#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/shell_stub.h"
#include "tests/support/texts_are.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;

HOST_TEST(LinkQueries, AskEthtoolInTheseWords) {
    host.tool("ethtool eth0", "\tSpeed: 1000Mb/s\n");
    const CommandLines commands;
    unsigned long long speed = 0;
    EXPECT_TRUE(IC::getNetworkSpeed("eth0", speed));
    IC::getNetworkDuplex("eth0");
    IC::getAutoSense("eth0");
    IC::isNICUp("eth0");
    EXPECT_THAT(commands.all(),
                TextsAre("ethtool eth0 2> /dev/null | grep Speed | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
                         "ethtool eth0 2> /dev/null | grep Duplex",
                         "ethtool eth0 2> /dev/null | grep Auto-negotiation",
                         "ethtool eth0 2> /dev/null | grep \"Link detected\""));
    EXPECT_EQ(speed, 1'000'000U);
}

HOST_TEST(LinkQueries, LogEntryAndExit) {
    host.tool("ethtool eth0", "");
    host.tool("ifconfig eth0", "");
    host.tool("ifconfig", "");
    const LogCapture capture;
    unsigned long long speed = 0;
    std::string address;
    IC::getNetworkSpeed("eth0", speed);
    IC::getNetworkDuplex("eth0");
    IC::getAutoSense("eth0");
    IC::getHardwareAddress("eth0", address);
    IC::isInterfaceUP("eth0");
    EXPECT_THAT(capture.messages(3000),
                TextsAre("getNetworkSpeed: entry", "getNetworkSpeed: exit", "getNetworkDuplex: entry",
                         "getNetworkDuplex: exit", "getAutoSense: entry", "getAutoSense: exit",
                         "getHardwareAddress: entry", "getHardwareAddress: exit", "isInterfaceUP: entry",
                         "isInterfaceUP: exit"));
    EXPECT_EQ(capture.messages().size(), 10U);
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(LinkQueries, NegotiationThatIsOffCountsAsOn) {
    host.tool("ethtool eth0", "\tAuto-negotiation: off\n");
    EXPECT_TRUE(IC::getAutoSense("eth0"));
}

HOST_TEST(LinkQueries, ASpeedOver32BitsIsSignExtended) {
    host.tool("ethtool eth0", "\tSpeed: 2147484Mb/s\n");
    unsigned long long speed = 0;
    EXPECT_TRUE(IC::getNetworkSpeed("eth0", speed));
    EXPECT_EQ(speed, 18446744071562068320ULL);
}

HOST_TEST(LinkQueries, WithoutTheToolTheAnswersAreNo) {
    const LogCapture capture;
    unsigned long long speed = 7;
    EXPECT_FALSE(IC::getNetworkSpeed("eth0", speed));
    EXPECT_EQ(speed, 7U);
    EXPECT_FALSE(IC::getNetworkDuplex("eth0"));
    EXPECT_FALSE(IC::getAutoSense("eth0"));
    EXPECT_FALSE(IC::isNICUp("eth0"));
    std::string address = "before";
    IC::getHardwareAddress("eth0", address);
    EXPECT_EQ(address, "");
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(LinkQueries, AShellThatCannotBeStartedIsLogged) {
    const LogCapture capture;
    unsigned long long speed = 7;
    {
        const NoDescriptors none;
        EXPECT_FALSE(IC::getNetworkSpeed("eth0", speed));
        EXPECT_FALSE(IC::getNetworkDuplex("eth0"));
        EXPECT_FALSE(IC::getAutoSense("eth0"));
        EXPECT_FALSE(IC::isNICUp("eth0"));
        EXPECT_FALSE(IC::isNICUp("bond0"));
        EXPECT_FALSE(IC::isInterfaceUP("eth0"));
    }
    EXPECT_EQ(speed, 7U);
    EXPECT_THAT(capture.messages(6000),
                TextsAre("NetworkPort getProperty - ethtool error", "NetworkPort getProperty - ethtool error",
                         "NetworkPort getProperty - ethtool error", "isNICUp - ethtool error",
                         "isNICUp - cat /proc/net/bonding/bond* error"));
}

HOST_TEST(LinkQueries, NamesThatFillTheCommandBufferAreNotRun) {
    const LogCapture silent;
    const CommandLines commands;
    const std::string longest(511 - std::string("ethtool  2> /dev/null | grep Duplex").size(), 'x');
    host.tool("ethtool %any", "\tDuplex: Full\n");
    EXPECT_TRUE(IC::getNetworkDuplex(longest));
    EXPECT_EQ(commands.all().size(), 1U);
    EXPECT_FALSE(IC::getNetworkDuplex(longest + "x"));
    EXPECT_EQ(commands.all().size(), 1U);
}

HOST_TEST(LinkQueries, AnOverlongNameIsAnsweredAsIfThereWereNoShell) {
    const LogCapture capture;
    const CommandLines commands;
    const std::string name(600, 'x');
    unsigned long long speed = 7;
    std::string address = "before";
    EXPECT_FALSE(IC::getNetworkSpeed(name, speed));
    EXPECT_FALSE(IC::getNetworkDuplex(name));
    EXPECT_FALSE(IC::getAutoSense(name));
    EXPECT_FALSE(IC::isInterfaceUP(name));
    IC::getHardwareAddress(name, address);
    EXPECT_EQ(address, "before");
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_THAT(capture.messages(6000), testing::Contains(HasSubstr(name)).Times(5));
}

HOST_TEST(LinkQueries, ACommandHandedOverAsAStringHasNoLimit) {
    const std::string name(600, 'x');
    host.tool("ethtool %any", "\tLink detected: yes\n");
    EXPECT_TRUE(IC::isNICUp(name));
    EXPECT_THAT(host.calls(), TextsAre("ethtool " + name));
}

HOST_TEST(HardwareAddress, IsAskedOfIfconfig) {
    host.tool("ifconfig eth0", "eth0      Link encap:Ethernet  HWaddr 00:1A:64:0B:7C:10  \n");
    const CommandLines commands;
    std::string address;
    IC::getHardwareAddress("eth0", address);
    EXPECT_EQ(address, "00:1a:64:0b:7c:10");
    EXPECT_THAT(
        commands.all(),
        TextsAre(
            "ifconfig eth0 2> /dev/null |grep HWaddr |awk '{print $5}'|tr '[A-Z]' '[a-z]' 2> /dev/null"));
}

HOST_TEST(HardwareAddress, StaysWithoutAShell) {
    const LogCapture capture;
    std::string address = "before";
    {
        const NoDescriptors none;
        IC::getHardwareAddress("eth0", address);
    }
    EXPECT_EQ(address, "before");
    EXPECT_THAT(capture.messages(3000),
                TextsAre("getHardwareAddress: entry",
                         "getHardwareAddress: Can not get Hardware Address for SLES machine",
                         "getHardwareAddress: exit"));
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(InterfaceUp, ReadsTheSnapshotWhenThereIsOne) {
    host.tool("ifconfig", "eth0      Link encap:Ethernet\n");
    const CommandLines commands;
    EXPECT_TRUE(IC::isInterfaceUP("eth0"));
    host.file(IC::ifconfigSnapshotPath, "eth1      Link encap:Ethernet\n");
    EXPECT_FALSE(IC::isInterfaceUP("eth0"));
    EXPECT_TRUE(IC::isInterfaceUP("eth1"));
    EXPECT_THAT(commands.all(), TextsAre("ifconfig | grep eth0 ", "cat /tmp/CVIfconfig.txt | grep eth0 ",
                                         "cat /tmp/CVIfconfig.txt | grep eth1 "));
    EXPECT_THAT(host.calls(), TextsAre("ifconfig"));
}

HOST_TEST(InterfaceUp, AsksIfconfigItselfWhereTheSnapshotIsNotOurs) {
    const std::string lies = "eth0      Link encap:Ethernet\n";
    host.file("/etc/elsewhere", lies);
    const std::function<bool()> places[] = {
        [&] { return host.symlink(IC::ifconfigSnapshotPath, "/etc/elsewhere"), true; },
        [] { return mkfifo(IC::ifconfigSnapshotPath, 0600) == 0; },
        [] { return link("/etc/elsewhere", IC::ifconfigSnapshotPath) == 0; },
        [&] { return host.file(IC::ifconfigSnapshotPath, lies, 0666), true; },
        [&] {
            host.file(IC::ifconfigSnapshotPath, lies);
            return host.giveToStranger(IC::ifconfigSnapshotPath);
        },
    };
    host.tool("ifconfig", "eth1      Link encap:Ethernet\n");
    for (std::size_t place = 0; place < std::size(places); ++place) {
        SCOPED_TRACE(place);
        host.remove(IC::ifconfigSnapshotPath);
        if (!places[place]()) {
            GTEST_SKIP() << "the tests do not run as root: there is no stranger";
        }
        const CommandLines commands;
        EXPECT_FALSE(IC::isInterfaceUP("eth0"));
        EXPECT_THAT(commands.all(), TextsAre("ifconfig | grep eth0 "));
    }
}

HOST_TEST(InterfaceUp, TheBlankBehindTheNameIsNothingToTheShell) {
    host.tool("ifconfig", "eth10     Link encap:Ethernet\n");
    EXPECT_TRUE(IC::isInterfaceUP("eth1"));
}

HOST_TEST(NicUp, LogsWhatEthtoolSays) {
    host.tool("ethtool eth0", "\tLink detected: yes\n");
    const LogCapture capture;
    EXPECT_TRUE(IC::isNICUp("eth0"));
    EXPECT_THAT(capture.messages(3000), testing::Contains("buffer = \tLink detected: yes\n"));
}

HOST_TEST(NicUp, ABondAsksItsFileAndThenEachMember) {
    host.file("/proc/net/bonding/bond0", "MII Status: up\nSlave Interface: eth0\nSlave Interface: eth1\n");
    host.tool("ethtool eth0", "\tLink detected: yes\n");
    host.tool("ethtool eth1", "\tLink detected: yes\n");
    const CommandLines commands;
    EXPECT_TRUE(IC::isNICUp("bond0"));
    // Two blanks: the probe's own and the one in front of the member's name.
    EXPECT_THAT(commands.all(),
                TextsAre("cat /proc/net/bonding/bond0 2> /dev/null | grep \"MII Status:\"",
                         "cat /proc/net/bonding/bond0 2> /dev/null | grep \"Slave Interface:\"",
                         "ethtool  eth0 2> /dev/null | grep \"Link detected\"",
                         "ethtool  eth1 2> /dev/null | grep \"Link detected\""));
}

HOST_TEST(NicUp, TheFirstMemberWithoutALinkEndsTheWalk) {
    host.file("/proc/net/bonding/bond0", "MII Status: up\nSlave Interface: eth0\nSlave Interface: eth1\n");
    host.tool("ethtool eth0", "\tLink detected: no\n");
    EXPECT_FALSE(IC::isNICUp("bond0"));
    EXPECT_THAT(host.calls(), TextsAre("ethtool eth0"));
}

HOST_TEST(NicUp, ABondWithoutMembersIsDown) {
    host.file("/proc/net/bonding/bond0", "MII Status: up\n");
    EXPECT_FALSE(IC::isNICUp("bond0"));
}

HOST_TEST(NicUp, ABondWhoseMembersCannotBeAskedForIsDown) {
    host.file("/proc/net/bonding/bond0", "MII Status: up\nSlave Interface: eth0\n");
    host.tool("ethtool eth0", "\tLink detected: yes\n");
    shell_stub::failWhen(
        [](const std::string& command) { return command.ends_with("\"Slave Interface:\""); });
    const LogCapture capture;
    EXPECT_FALSE(IC::isNICUp("bond0"));
    shell_stub::failWhen({});
    EXPECT_THAT(capture.messages(6000), TextsAre("isNICUp - grepping slave device error"));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(NicUp, ABondWhoseStatusIsDownAsksNobody) {
    host.file("/proc/net/bonding/bond0", "MII Status: down\nSlave Interface: eth0\nMII Status: up\n");
    EXPECT_FALSE(IC::isNICUp("bond0"));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(NicUp, ANameWithBondInItIsABondWhereverItStands) {
    host.file("/proc/net/bonding/mybond1", "MII Status: up\nSlave Interface: eth0\n");
    host.tool("ethtool eth0", "\tLink detected: yes\n");
    EXPECT_TRUE(IC::isNICUp("mybond1"));
    // A member that looks like a bond is looked for under its name with the blank in front: never found.
    host.file("/proc/net/bonding/bond0", "MII Status: up\nSlave Interface: mybond1\n");
    EXPECT_FALSE(IC::isNICUp("bond0"));
}

// A member's name has a blank in front: a file of that name where the agent stands is read as well.
HOST_TEST(NicUp, ABondThatNamesItselfEnds) {
    host.file("/proc/net/bonding/bond0", "MII Status: up\nSlave Interface: bond0\n");
    host.file("/home/stranger/bond0", "MII Status: up\nSlave Interface: bond0\n");
    ASSERT_EQ(chdir("/home/stranger"), 0);
    const CommandLines commands;
    EXPECT_FALSE(IC::isNICUp("bond0"));
    EXPECT_LT(commands.all().size(), 20U);
}

HOST_TEST(NicUp, AMissingBondIsDown) {
    EXPECT_FALSE(IC::isNICUp("bond7"));
}

}  // namespace
