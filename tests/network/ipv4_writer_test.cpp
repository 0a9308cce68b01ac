#include "network/ipv4_writer.h"

#include <gmock/gmock.h>
#include <sys/mount.h>

#include <new>

#include "tests/network/port_host.h"
#include "tests/support/command_lines.h"
#include "tests/support/failing_new.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using IC::PropertyValue;
using testing::Contains;
using testing::IsEmpty;

constexpr char kMac[] = "02:00:5e:00:00:01";
constexpr char kFile[] = "/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:01";
constexpr char kRoutes[] = "/etc/sysconfig/network/routes";

PropertyValue origin(unsigned int code) {
    return enumeration(code);
}

// --- the interface file

HOST_TEST(Origin, IsWrittenInPlaceAndTheStartModeAppended) {
    host.file(kFile, "# mine\nBOOTPROTO='dhcp'\nMTU=1500\n");
    const CommandLines commands;
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_THAT(commands.all(), TextsAre("rpm -qa | grep dhcpv6*"));
    EXPECT_EQ(host.read(kFile), "# mine\nBOOTPROTO=static\nMTU=1500\nSTARTMODE='auto'\n");
    EXPECT_THAT(host.calls(), TextsAre("rpm -qa"));
    EXPECT_THAT(capture.ownMessages(3000),
                TextsAre("setIPOrigin: entry", std::string("File open ") + kFile + " in read mode.",
                         "setIPOrigin: exit"));
    EXPECT_THAT(capture.ownMessages(4000),
                TextsAre("IP Origin  = 3", "File open '/etc/sysconfig/network' in write mode."));
}

HOST_TEST(Origin, OfDhcpIsWrittenSoWhateverRpmSays) {
    host.file(kFile, "STARTMODE='manual'\nBOOTPROTO=static\nIPADDR=192.0.2.1\n");
    IC::setIPOrigin("eth0", origin(1), kMac);
    EXPECT_EQ(host.read(kFile), "STARTMODE='auto'\nBOOTPROTO=dhcp\nIPADDR=192.0.2.1\n")
        << "old addresses stay";
}

HOST_TEST(Origin, OfDhcpIsDhcp4WhenThePackagesCannotBeAsked) {
    host.file(kFile, "BOOTPROTO=static\n");
    const NoDescriptors none;
    IC::setIPOrigin("eth0", origin(1), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp4\nSTARTMODE='auto'\n");
}

HOST_TEST(Origin, OfAnyOtherKindKeepsTheLineAndRepeatsTheLastWhenThereIsNone) {
    host.file(kFile, "BOOTPROTO=dhcp\n");
    IC::setIPOrigin("eth0", origin(2), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\nSTARTMODE='auto'\n");
    host.file(kFile, "MTU=1500\nNAME=x\n");
    IC::setIPOrigin("eth0", origin(2), kMac);
    EXPECT_EQ(host.read(kFile), "MTU=1500\nNAME=x\nNAME=x\nSTARTMODE='auto'\n");
}

HOST_TEST(Origin, OnAMissingFileCreatesIt) {
    host.directory("/etc/sysconfig/network");
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nSTARTMODE='auto'\n");
    host.remove(kFile);
    IC::setIPOrigin("eth0", origin(2), kMac);
    EXPECT_EQ(host.read(kFile), "STARTMODE='auto'\n");
}

HOST_TEST(Origin, ThatCannotBeWrittenIsPassedOver) {
    host.file(kFile, "BOOTPROTO=dhcp\n");
    host.readOnly("/etc");
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\n");
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
    EXPECT_THAT(capture.ownMessages(4000), TextsAre("IP Origin  = 3"));
}

HOST_TEST(Origin, OfAFileThatCannotBeReadToItsEndIsNotWritten) {
    host.symlink(kFile, "/proc/self/mem");
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("setIPOrigin: entry", std::string("File open ") + kFile + " in read mode.",
                         std::string("Could not read all of '") + kFile + "'.", "IP Origin  = 3",
                         "setIPOrigin: exit"));
}

HOST_TEST(InterfaceFileWriters, WithADirectoryInItsPlaceTellOfTheWritingAlone) {
    host.directory(kFile);
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    IC::setIPv4Address("eth0", "192.0.2.7", kMac);
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("Failed to open the file for writing"));
    EXPECT_THAT(capture.ownMessages(4000), TextsAre("IP Origin  = 3"));
    EXPECT_THAT(host.callsOf("ifconfig"), TextsAre("ifconfig eth0 netmask 255.255.0.0"));
}

/// An interface file that fills its disk: not a line more fits.
void fillDisk(FakeHost& host) {
    host.directory("/etc/sysconfig/network");
    ASSERT_EQ(mount("small", "/etc/sysconfig/network", "tmpfs", 0, "size=16k"), 0);
    std::string content;
    while (content.size() < 16384) {
        content += "#23456789abcdef\n";
    }
    host.file(kFile, content);
}

HOST_TEST(Origin, SaysThatTheFileIsOpenBeforeItWrites) {
    fillDisk(host);
    LogCapture capture;
    IC::setIPOrigin("eth0", origin(3), kMac);
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("setIPOrigin: entry", std::string("File open ") + kFile + " in read mode.",
                         "IP Origin  = 3", "File open '/etc/sysconfig/network' in write mode.",
                         std::string("Could not write all of '") + kFile + "'.", "setIPOrigin: exit"));
}

HOST_TEST(Mask, SaysThatTheFileIsOpenBeforeItWrites) {
    fillDisk(host);
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    LogCapture capture;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("Entering setSubnetMask", "Writing Subnet to File",
                         std::string("Could not write all of '") + kFile + "'.", "Exiting setSubnetMask"));
    EXPECT_EQ(capture.ownLines().at(2).function, "setSubnetMask");
}

HOST_TEST(Address, NeverCostsTheRestOfTheFileForWantOfMemory) {
    const std::string head = "BOOTPROTO=static\nIPADDR=";
    const std::string rest =
        "\n# the line in the cellar, behind the second switch\nMTU=1500\nSTARTMODE='auto'\n";
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        host.file(kFile, head + "192.0.2.1" + rest);
        {
            const FailingOnce once(allocations);
            try {
                IC::setIPv4Address("eth0", "192.0.2.77", kMac);
            } catch (const std::bad_alloc&) {
                // The node that called logs it.
            }
            failed = once.happened();
        }
        EXPECT_THAT(*host.read(kFile), testing::AnyOf(head + "192.0.2.1" + rest, head + "192.0.2.77" + rest))
            << "allocation " << allocations;
    }
    EXPECT_GT(allocations, 10);
}

HOST_TEST(Address, IsWrittenAndLeftToTheNextStart) {
    host.file(kFile, "BOOTPROTO=dhcp\nIPADDR='192.0.2.1'\n#IPADDR=old\n");
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\nIPADDR=192.0.2.77\nIPADDR=192.0.2.77\n")
        << "every line that holds the key is replaced, a comment too";
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(Address, IsLookedForBesideTheOriginInTheSameLine) {
    host.file(kFile, "BOOTPROTO=static IPADDR=192.0.2.1\n");
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "IPADDR=192.0.2.77\n");
    host.file(kFile, "BOOTPROTO=static NETMASK=255.0.0.0\n");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static NETMASK=255.0.0.0\nNETMASK=255.255.0.0\n")
        << "the mask's writer looks at such a line for the origin alone";
}

HOST_TEST(Address, ThatCannotBeWrittenIsPassedOver) {
    host.file(kFile, "IPADDR=192.0.2.1\n");
    host.readOnly("/etc");
    LogCapture capture;
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "IPADDR=192.0.2.1\n");
    EXPECT_THAT(capture.ownMessages(), TextsAre("Entering setIPv4Address", "Exiting setIPv4Address"));
}

HOST_TEST(Address, OnAMissingFileCreatesIt) {
    host.directory("/etc/sysconfig/network");
    LogCapture capture;
    IC::setIPv4Address("eth0", "192.0.2.77", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nIPADDR=192.0.2.77\n");
    EXPECT_EQ(capture.ownMessages().front(), "Entering setIPv4Address");
}

HOST_TEST(Mask, OnAMissingFileCreatesItAndChangesTheRunningInterface) {
    host.directory("/etc/sysconfig/network");
    host.tool("ifconfig eth0 netmask 255.255.255.128", "");
    LogCapture capture;
    IC::setSubnetMask("eth0", "255.255.255.128", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nNETMASK=255.255.255.128\n");
    EXPECT_THAT(host.calls(), TextsAre("ifconfig eth0 netmask 255.255.255.128"));
    EXPECT_EQ(capture.ownMessages().front(), "Entering setSubnetMask");
    EXPECT_THAT(capture.ownMessages(4000), TextsAre("Writing Subnet to File"));
}

HOST_TEST(Mask, IsWrittenInPlace) {
    host.file(kFile, "BOOTPROTO=dhcp\nNETMASK='255.0.0.0'\nMTU=1500\n");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    const CommandLines commands;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=dhcp\nNETMASK=255.255.0.0\nMTU=1500\n");
    EXPECT_THAT(commands.all(), TextsAre("ifconfig eth0 netmask 255.255.0.0"));
}

HOST_TEST(Mask, ThatCannotBeWrittenStillChangesTheRunningInterface) {
    host.file(kFile, "BOOTPROTO=static\nNETMASK=255.0.0.0\n");
    host.readOnly("/etc");
    host.tool("ifconfig eth0 netmask 255.255.0.0", "");
    LogCapture capture;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nNETMASK=255.0.0.0\n");
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("Failed to open the file for writing"));
    EXPECT_THAT(host.calls(), TextsAre("ifconfig eth0 netmask 255.255.0.0"));
}

HOST_TEST(Mask, SaysWhenNoCommandCanBeStarted) {
    LogCapture capture;
    const NoDescriptors none;
    IC::setSubnetMask("eth0", "255.255.0.0", kMac);
    EXPECT_THAT(capture.ownMessages(6000),
                TextsAre("Failed to open the file for writing", "Can not Change Subnet Mask."));
}

HOST_TEST(Mask, OfAnyLengthRunsNoCommandThatDoesNotFit) {
    host.directory("/etc/sysconfig/network");
    LogCapture capture;
    IC::setSubnetMask("eth0", std::string(100000, '1'), kMac);
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_THAT(capture.ownMessages(6000), Contains("Can not Change Subnet Mask."));
    EXPECT_EQ(host.read(kFile)->size(), std::string("BOOTPROTO=static\nNETMASK=\n").size() + 100000);
}

// --- the gateway

HOST_TEST(Gateway, DeletesTheHostRouteAndWritesTwoFiles) {
    host.file(kRoutes,
              "# routes\ndefault\t192.0.2.1\t-\ndefault\tfe80::1\t-\n10.0.0.0 192.0.2.3 255.0.0.0 eth0\n");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.2 eth0", "");
    LogCapture capture;
    IC::setIPV4Gateway("eth0", "192.0.2.10", "192.0.2.2");
    EXPECT_THAT(host.calls(), TextsAre("route del -host 192.0.2.10 gw 192.0.2.2 eth0"));
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifroute-eth0"), "192.0.2.10\t192.0.2.2\t-\n");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.2\t-\n# routes\ndefault\tfe80::1\t-\n");
    EXPECT_EQ(capture.ownMessages().front(), "Entering setIPV4Gateway");
    EXPECT_THAT(capture.ownMessages(), Contains("setIPv4GatewayForSuSe10: entry"));
}

HOST_TEST(Gateway, ThatIsEmptyLeavesTheDefaultRoute) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.tool("route del -host 192.0.2.10 gw eth0", "");
    const CommandLines commands;
    LogCapture capture;
    IC::setIPV4Gateway("eth0", "192.0.2.10", "");
    EXPECT_THAT(commands.all(), TextsAre("route del -host 192.0.2.10 gw  eth0 2> /dev/null"));
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifroute-eth0"), "192.0.2.10\t\t-\n");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
    EXPECT_THAT(capture.ownMessages(), Contains("Either NIC or gateway is null"));
}

HOST_TEST(Gateway, OfARoutesFileWithTwoFamiliesKeepsTheIPv6Line) {
    host.file(kRoutes, "default\t192.0.2.1\t-\ndefault\tfe80::1\t-\n");
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.2\t-\ndefault\tfe80::1\t-\n");
}

HOST_TEST(Gateway, OfARoutesFileOfCommentsBecomesTheNewLineAlone) {
    host.file(kRoutes, "# one\n# two\n");
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.2\t-\n");
}

HOST_TEST(Gateway, WithoutARoutesFileMakesNone) {
    host.directory("/etc/sysconfig/network");
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_FALSE(host.exists(kRoutes));
}

HOST_TEST(Gateway, WhoseRoutesFileCannotBeWrittenIsPassedOver) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.readOnly("/etc");
    LogCapture capture;
    IC::setIPv4GatewayForSuSe10("eth0", "192.0.2.2");
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
}

HOST_TEST(Gateway, WithoutInterfaceOrGatewayDoesNothing) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    LogCapture capture;
    IC::setIPv4GatewayForSuSe10("", "192.0.2.2");
    IC::setIPv4GatewayForSuSe10("eth0", "");
    EXPECT_THAT(capture.ownMessages(), Contains("Either NIC or gateway is null").Times(2));
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
}

HOST_TEST(Gateway, ThatCannotBeWrittenStopsBeforeTheRoutesFile) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    host.directory("/etc/sysconfig/network/ifroute-eth0");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.2 eth0", "");
    LogCapture capture;
    IC::setIPV4Gateway("eth0", "192.0.2.10", "192.0.2.2");
    EXPECT_THAT(capture.ownMessages(6000),
                Contains("Can not open '/etc/sysconfig/network/ifroute' in write mode."));
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
}

HOST_TEST(Gateway, WritesNothingWhenTheRouteCannotBeDeleted) {
    host.file(kRoutes, "default\t192.0.2.1\t-\n");
    IC::setIPV4Gateway("eth0", std::string(600, '1'), "192.0.2.2");  // no such command is started
    EXPECT_EQ(host.read(kRoutes), "default\t192.0.2.1\t-\n");
    EXPECT_FALSE(host.exists("/etc/sysconfig/network/ifroute-eth0"));
}

// --- what nothing calls

HOST_TEST(Utilities, RestartTheNetworkAndLeaveNetworkManagerAlone) {
    LogCapture capture;
    IC::restartNetwork();
    IC::disableNMControlled("eth0");
    EXPECT_THAT(host.calls(), TextsAre("service network restart"));
    EXPECT_THAT(capture.ownMessages(),
                testing::IsSupersetOf({"restartNetwork Called.", "Entering disableNMControlled\n",
                                       "Exiting disableNMControlled\n"}));
    capture.clear();
    const NoDescriptors none;
    IC::restartNetwork();
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("Can not bring up interface."));
}

}  // namespace
