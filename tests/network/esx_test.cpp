#include "network/esx.h"

#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

HOST_TEST(Esx, EnablesIPv6ForConsoleAndKernel) {
    host.recordOnly("esxcfg-vswif");
    host.tool("esxcfg-vmknic -6 true", "", 1);
    const CommandLines commands;
    LogCapture capture;
    EXPECT_TRUE(IC::enableIPv6ForESX());
    EXPECT_THAT(commands.all(), TextsAre("esxcfg-vswif -6 true", "esxcfg-vmknic  -6 true"));
    EXPECT_THAT(host.calls(), TextsAre("esxcfg-vswif -6 true", "esxcfg-vmknic -6 true"));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering enableIPv6ForESX", "enableIPv6ForESX Returned : 1"));
}

HOST_TEST(Esx, DoesNotTryTheKernelWhenTheConsoleCouldNotBe) {
    const CommandLines commands;
    LogCapture capture;
    {
        const NoDescriptors none;
        EXPECT_FALSE(IC::enableIPv6ForESX());
    }
    EXPECT_THAT(commands.all(), TextsAre("esxcfg-vswif -6 true"));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering enableIPv6ForESX", "enableIPv6ForESX Returned : 0"));
}

HOST_TEST(Esx, ReleaseIsNoneOnAnotherMachine) {
    const CommandLines commands;
    LogCapture capture;
    EXPECT_FALSE(IC::checkESX4_1Release());
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_THAT(capture.messages(3000), TextsAre("Entering checkESX4_1Release", "Machine is not vmware",
                                                 "Exiting checkESX4_1Release"));
}

HOST_TEST(Esx, ReleaseIsTakenFromALineWithAFour) {
    host.file("/etc/vmware-release", "VMware ESX 4.1 (Kandinsky)\n");
    const CommandLines commands;
    LogCapture capture;
    EXPECT_TRUE(IC::checkESX4_1Release());
    EXPECT_THAT(commands.all(), TextsAre("cat /etc/vmware-release | grep 4"));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering checkESX4_1Release", "Exiting checkESX4_1Release"));
}

HOST_TEST(Esx, ReleaseWithoutAFourIsTheOlderOne) {
    host.file("/etc/vmware-release", "VMware ESX Server 3\n");
    LogCapture capture;
    EXPECT_FALSE(IC::checkESX4_1Release());
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering checkESX4_1Release", "Machine is ESX 4.0", "Exiting checkESX4_1Release"));
}

HOST_TEST(Esx, ReleaseIsNotGuessedWhenItCannotBeRead) {
    host.file("/etc/vmware-release", "VMware ESX 4.1\n");
    LogCapture capture;
    {
        const NoDescriptors none;
        EXPECT_FALSE(IC::checkESX4_1Release());
    }
    EXPECT_THAT(capture.messages(3000),
                TextsAre("Entering checkESX4_1Release", "Exiting checkESX4_1Release"));
}

HOST_TEST(Esx, EmptyOperationsDoNothing) {
    host.file("/etc/sysconfig/network/config", "NETCONFIG_DNS_POLICY=\"auto\"\n");
    host.readOnly("/etc");
    const CommandLines commands;
    LogCapture capture;
    IC::enableIPv6forRHEL();
    IC::disablePeerDNS("eth0");
    IC::executeGatewayChanges("eth0", "10.0.0.1");
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_THAT(capture.messages(), IsEmpty());
}

}  // namespace
