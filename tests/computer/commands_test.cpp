// The command lines of the computer room as they are written, and what happens when none can be started.
#include <gmock/gmock.h>

#include "computer/time_zone.h"
#include "mi/host_name.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/computer/computer_tools.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

HOST_TEST(ComputerCommands, AreExactlyThese) {
    for (const char* tool : {"hostname", "/usr/sbin/vpdupdate", "/sbin/update-lsvpd-db", "/bin/cp"}) {
        host.recordOnly(tool);
    }
    host.file("/etc/hosts", "");
    IC::OsHwMI mi;
    mi.createOsHwNodes();
    mi.createRootNode();
    const CommandLines commands;
    mi.updateHostAndDomainName();
    mi.createComputerNodes();
    mi.vpdUpdate();
    RunningComputer computer;
    computer.write(123, 9U);
    computer.write(123, 12U);
    IC::setAutoDSTEnabled(true);
    IC::executeDomainandHostnameChanges("alpha", "example.org", true, "");
    IC::executeDomainandHostnameChanges("alpha", "", true, "");
    EXPECT_THAT(
        commands.all(),
        TextsAre("hostname -s 2> /dev/null", "hostname -d 2> /dev/null", "hostname 2> /dev/null",
                 "/usr/sbin/vpdupdate 2> /dev/null", "/sbin/update-lsvpd-db 2> /dev/null", "shutdown -r now",
                 "shutdown -h now", "/bin/cp /etc/sysconfig/clock /etc/sysconfig/clock.bak",
                 "hostname alpha.example.org", "hostname alpha"));
}

HOST_TEST(ComputerCommands, AreNotNeededForAnythingElse) {
    host.directory("/opt/vantrel/corvista/data");
    RunningComputer computer;
    const CommandLines commands;
    for (const unsigned int id : {115U, 116U}) {
        computer.write(id, "text");
        computer.read(id);
    }
    computer.write(126, "2001-09-09T01:46:40Z");
    computer.write(127, 330U);
    computer.write(200, 1U);
    computer.write(123, 1U);
    for (const unsigned int id : {108U, 123U, 126U, 127U, 200U}) {
        computer.read(id);
    }
    EXPECT_THAT(commands.all(), IsEmpty());
}

HOST_TEST(ComputerCommands, ThatCannotBeStartedChangeNoName) {
    host.file("/etc/hosts", "127.0.0.2 old\n");
    const NoDescriptors none;
    LogCapture capture;
    IC::executeDomainandHostnameChanges("alpha", "example.org", true, "");
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not set HostName !!"));
    EXPECT_EQ(host.read("/etc/hosts"), "127.0.0.2 old\n");
    EXPECT_FALSE(host.exists("/etc/HOSTNAME"));
}

HOST_TEST(ComputerCommands, ThatCannotBeStartedLeaveTheRestOfTheNodeStanding) {
    const LogCapture quiet;
    IC::OsHwMI mi;
    mi.createOsHwNodes();
    mi.createRootNode();
    const NoDescriptors none;
    mi.updateHostAndDomainName();
    mi.createComputerNodes();
    mi.vpdUpdate();
    std::vector<IC::Node*> nodes;
    mi.getMap(nodes);
    EXPECT_EQ(nodes.back()->getDescription(), "Computer");
    std::map<unsigned int, IC::PropertyValue> stored;
    nodes.back()->getProperties(stored);
    EXPECT_FALSE(stored.contains(108));
    EXPECT_TRUE(stored.contains(127));
}

HOST_TEST(ComputerCommands, ThatCannotBeStartedDoNotShowInAPowerAction) {
    RunningComputer computer;
    const NoDescriptors none;
    EXPECT_EQ(computer.write(123, 9U), 0);
    EXPECT_EQ(static_cast<unsigned int>(computer.stored(123)), 9U);
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(ComputerCommands, ThatCannotBeStartedLeaveTheClockFile) {
    host.file("/etc/sysconfig/clock", "HWCLOCK=\"x\"");
    const NoDescriptors none;
    EXPECT_FALSE(IC::setAutoDSTEnabled(true));
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "HWCLOCK=\"x\"");
}

}  // namespace
