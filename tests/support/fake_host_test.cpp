#include "tests/support/fake_host.h"

#include <gmock/gmock.h>
#include <net/if.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <sys/timex.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>

#include "tests/support/shell.h"
#include "tests/support/texts_are.h"

using testing::HasSubstr;
using testing::IsEmpty;

namespace {

bool appendTo(const std::string& path, const std::string& text) {
    std::ofstream file(path, std::ios::app);
    file << text << std::flush;
    return file.good();
}

std::string machineHostName() {
    char name[256] = {};
    gethostname(name, sizeof name - 1);
    return name;
}

// --- What the machine keeps to itself.

TEST(FakeHostIsolation, HostNameStaysInside) {
    const std::string before = machineHostName();
    inFakeHost([](FakeHost& host) {
        EXPECT_EQ(machineHostName(), "localhost");
        host.setHostName("linux-a");
        EXPECT_EQ(machineHostName(), "linux-a");
        EXPECT_EQ(shell("uname -n").out, "linux-a\n");
    });
    EXPECT_EQ(machineHostName(), before);
}

TEST(FakeHostIsolation, FilesStayInside) {
    const std::string path = "/tmp/fakehost-isolation-" + std::to_string(getpid());
    inFakeHost([&](FakeHost& host) {
        host.file(path, "inside");
        EXPECT_EQ(host.read(path), "inside");
    });
    EXPECT_NE(access(path.c_str(), F_OK), 0);
    inFakeHost([&](FakeHost& host) { EXPECT_FALSE(host.exists(path)); });
}

HOST_TEST(FakeHostIsolation, StartsEmpty) {
    for (const char* directory : {"/opt", "/var", "/sys", "/proc/net", "/usr/sbin"})
        EXPECT_THAT(host.listDirectory(directory), IsEmpty()) << directory;
    for (const std::string& name : host.listDirectory("/etc")) EXPECT_EQ(name, "ld.so.cache");
    EXPECT_FALSE(host.exists("/proc/cpuinfo"));
    EXPECT_FALSE(host.exists("/home"));
    EXPECT_FALSE(host.exists("/dev/sda"));
}

HOST_TEST(FakeHostIsolation, ProcessesAndNetworkAreItsOwn) {
    EXPECT_EQ(getpid(), 2);
    EXPECT_NE(access("/proc/self/maps", R_OK), -1);
    EXPECT_NE(access("/proc/2/task", R_OK), -1);
    struct if_nameindex* links = if_nameindex();
    ASSERT_NE(links, nullptr);
    EXPECT_STREQ(links[0].if_name, "lo");
    EXPECT_EQ(links[1].if_index, 0U);
    if_freenameindex(links);
}

HOST_TEST(FakeHostIsolation, EveryProcessStandsInProcHoweverManyThereWere) {
    if (access("/proc/sys/kernel/ns_last_pid", F_OK) != 0)
        GTEST_SKIP() << "this kernel cannot tell the last process";
    for (int round = 0; round < 40; ++round)
        EXPECT_EQ(
            shell("for i in 1 2 3 4 5 6 7 8 9 10; do (:); done; test -d /proc/$$ || echo missing $$").out,
            "");
}

HOST_TEST(FakeHostIsolation, ToolsOfTheMachineAreOutOfReach) {
    for (std::string name :
         {"ifconfig", "ethtool", "route", "ip", "brctl", "fdisk", "hostname", "systemctl", "mount", "date",
          "esxcfg-vswif", "apt", "dpkg", "python3", "modprobe", "sysctl", "su"}) {
        EXPECT_NE(shell("command -v " + name).status, 0) << name;
        EXPECT_NE(shell("PATH=/usr/sbin:/usr/bin:/sbin:/bin command -v " + name).status, 0) << name;
    }
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(FakeHostIsolation, TheKernelsClockAndSettingsAreOutOfReach) {
    struct timex now {};
    syscall(SYS_adjtimex, &now);
    now.modes = ADJ_MAXERROR;  // to what it is
    EXPECT_EQ(syscall(SYS_adjtimex, &now), -1);
    EXPECT_EQ(errno, EPERM);
    EXPECT_FALSE(appendTo("/.proc/sysrq-trigger", ""));
    EXPECT_NE(access("/proc/sys/kernel/sysrq", W_OK), 0);
    EXPECT_NE(access("/usr/bin", W_OK), -1) << "the test's own";
    EXPECT_NE(access("/usr/lib", W_OK), 0);
}

HOST_TEST(FakeHostIsolation, SurroundingsAreNotInherited) {
    EXPECT_STREQ(std::getenv("PATH"), "/tools:/usr/sbin:/usr/bin:/sbin:/bin");
    for (const char* name : {"TZ", "LANG", "LC_ALL", "CORVISTA_DATA_DIR", "LD_PRELOAD"})
        EXPECT_EQ(std::getenv(name), nullptr) << name;
    EXPECT_EQ(std::fgetc(stdin), EOF);
}

// --- Files.

HOST_TEST(FakeHostFiles, AreAsGiven) {
    host.file("/etc/sysconfig/network/ifcfg-eth0", "A='b'\n", 0600);
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifcfg-eth0"), "A='b'\n");
    EXPECT_EQ(shell("cat /etc/sysconfig/network/ifcfg-eth0; stat -c %a /etc/sysconfig/network/*").out,
              "A='b'\n600\n");
    host.symlink("/etc/localtime", "/nowhere");
    EXPECT_TRUE(host.exists("/etc/localtime"));
    EXPECT_EQ(host.read("/etc/localtime"), std::nullopt);
    host.directory("/etc/a", 0700);
    EXPECT_THAT(host.listDirectory("/etc/sysconfig"), TextsAre("network"));
    host.remove("/etc/sysconfig");
    EXPECT_FALSE(host.exists("/etc/sysconfig"));
    EXPECT_EQ(host.read("/etc"), std::nullopt);
    EXPECT_THAT(host.listDirectory("/none"), IsEmpty());
}

HOST_TEST(FakeHostFiles, CanBeAnotherUsers) {
    host.file("/tmp/a", "");
    host.symlink("/tmp/link", "a");
    if (!host.giveToStranger("/tmp/link")) {
        GTEST_SKIP() << "only root can map a second user";
    }
    struct stat found {};
    ASSERT_EQ(lstat("/tmp/link", &found), 0);
    EXPECT_EQ(found.st_uid, 12345U);
    EXPECT_EQ(found.st_gid, 12345U);
    ASSERT_EQ(stat("/tmp/a", &found),
              0);  // not by the link: hosts that protect links follow no stranger's there
    EXPECT_EQ(found.st_uid, 0U);
}

HOST_TEST(FakeHostFiles, ProcIsTheTests) {
    host.file("/proc/cpuinfo", "processor : 0\n");
    host.file("/proc/net/dev", "eth0:\n");
    host.file("/proc/net/bonding/bond0", "MII Status: up\n");
    EXPECT_EQ(shell("cat /proc/cpuinfo /proc/net/dev; ls /proc/net").out,
              "processor : 0\neth0:\nbonding\ndev\n");
}

HOST_TEST(FakeHostFiles, ReadOnlyRefusesWrites) {
    host.file("/etc/hosts", "old");
    host.file("/etc/HOSTNAME", "old");
    host.readOnly("/etc");
    EXPECT_FALSE(appendTo("/etc/hosts", "new"));
    EXPECT_EQ(errno, EROFS);
    EXPECT_NE(std::rename("/etc/hosts", "/etc/hosts.bak"), 0);
    EXPECT_EQ(host.read("/etc/hosts"), "old");
    host.restore("/etc");
    host.readOnly("/etc/hosts");
    EXPECT_FALSE(appendTo("/etc/hosts", "new"));
    EXPECT_TRUE(appendTo("/etc/HOSTNAME", " new"));
    EXPECT_EQ(host.read("/etc/HOSTNAME"), "old new");
}

HOST_TEST(FakeHostFiles, FullDiskHasNoSpaceLeft) {
    host.file("/var/lib/state", std::string(10000, 'a'));
    host.fullDisk("/var/lib");
    EXPECT_EQ(host.read("/var/lib/state"), std::string(10000, 'a'));
    EXPECT_THAT(host.listDirectory("/var/lib"), TextsAre("state"));
    EXPECT_FALSE(appendTo("/var/lib/other", "text"));
    EXPECT_EQ(errno, ENOSPC);
    std::ofstream rewritten("/var/lib/state");
    rewritten << "short" << std::flush;
    EXPECT_FALSE(rewritten.good());
    EXPECT_EQ(host.read("/var/lib/state"), "") << "truncated, as on a real disk";
    rewritten.close();
    host.restore("/var/lib");
    EXPECT_TRUE(appendTo("/var/lib/other", "text"));
}

HOST_TEST(FakeHostFiles, RecordedHostIsInstalledWhole) {
    host.file("/rec/README.md", "where from");
    host.file("/rec/hostname", "sles\n");
    host.file("/rec/etc/HOSTNAME", "sles.example\n");
    host.file("/rec/proc/net/dev", "eth0:\n");
    host.symlink("/rec/sys/class/net/eth0", "../../devices/eth0");
    host.file("/rec/tools/ethtool/eth0", "Speed: 100Mb/s\n");
    host.file("/rec/tools/ethtool/eth7", "");
    host.file("/rec/tools/ethtool/eth7%status", "71\n");
    host.file("/rec/tools/hostname/%none", "sles\n");
    host.file("/rec/tools/%2Fusr%2Fsbin%2Fvpdupdate/%any", "");
    host.copyTree("/rec");
    EXPECT_EQ(machineHostName(), "sles");
    EXPECT_EQ(host.read("/etc/HOSTNAME"), "sles.example\n");
    EXPECT_EQ(host.read("/proc/net/dev"), "eth0:\n");
    EXPECT_TRUE(host.exists("/sys/class/net/eth0"));
    EXPECT_FALSE(host.exists("/README.md"));
    EXPECT_EQ(shell("ethtool eth0; hostname").out, "Speed: 100Mb/s\nsles\n");
    EXPECT_EQ(shell("ethtool eth7").status, 71);
    EXPECT_EQ(shell("/usr/sbin/vpdupdate").status, 0);
}

// --- Tools.

HOST_TEST(FakeHostTools, AnswerTheirExactArguments) {
    host.tool("ethtool eth0", "Speed: 1000Mb/s\n");
    host.tool("ethtool eth1", "", 71);
    host.tool("ethtool -i eth0", {"driver: e1000\n", 0, "a warning\n", 0, ""});
    host.tool("hostname", "linux-a\n");
    EXPECT_EQ(shell("ethtool eth0 | tr -s ' ' | cut -d ' ' -f2").out, "1000Mb/s\n");
    EXPECT_EQ(shell("ethtool eth1").status, 71);
    EXPECT_EQ(shell("ethtool -i eth0 2>&1 >/dev/null").out, "a warning\n");
    EXPECT_EQ(shell("hostname").out, "linux-a\n");
    EXPECT_THAT(host.calls(), TextsAre("ethtool eth0", "ethtool eth1", "ethtool -i eth0", "hostname"));
    EXPECT_THAT(host.callsOf("hostname"), TextsAre("hostname"));
    host.clearCalls();
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(FakeHostTools, ArgumentsMayHoldAnything) {
    host.tool("fdisk -ls /dev/sda", "disk\n");
    host.tool("ip 'a b' '' it\\'s 100%", "odd\n");
    host.tool("/usr/sbin/vpdupdate", "by path\n");
    EXPECT_EQ(shell("fdisk -ls /dev/sda").out, "disk\n");
    EXPECT_EQ(shell("ip 'a b' '' \"it's\" 100%").out, "odd\n");
    EXPECT_EQ(shell("/usr/sbin/vpdupdate 2> /dev/null").out, "by path\n");
    EXPECT_THAT(host.calls(),
                TextsAre("fdisk -ls /dev/sda", "ip 'a b' '' 'it'\\''s' 100%", "/usr/sbin/vpdupdate"));
    EXPECT_THAT(host.callsOf("ip").size(), 1U);
    host.tool("ip " + std::string("'two\nlines'"), "");
    EXPECT_EQ(shell("ip 'two\nlines'").status, 0);
    EXPECT_EQ(host.calls().back(), "ip 'two\\nlines'");
}

HOST_TEST(FakeHostTools, AnswerInTurn) {
    host.toolInTurn("ethtool eth0", {{"Link detected: yes\n"}, {"Link detected: no\n"}, {"", 1}});
    EXPECT_EQ(shell("ethtool eth0; ethtool eth0").out, "Link detected: yes\nLink detected: no\n");
    EXPECT_EQ(shell("ethtool eth0").status, 1);
    EXPECT_EQ(shell("ethtool eth0").status, 1);
    host.toolInTurn("ethtool eth0", {{"again\n"}, {"and again\n"}});
    EXPECT_EQ(shell("ethtool eth0; ethtool eth0; ethtool eth0").out, "again\nand again\nand again\n");
    host.tool("ethtool eth0", "for ever\n");
    EXPECT_EQ(shell("ethtool eth0; ethtool eth0").out, "for ever\nfor ever\n");
}

HOST_TEST(FakeHostTools, ActAndTakeTheirTime) {
    host.tool("ifconfig eth0 up", {"done\n", 0, "", 50, "echo \"$2 $1\" > /proc/net/state; echo acting"});
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(shell("ifconfig eth0 up").out, "acting\ndone\n");
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(50));
    EXPECT_EQ(host.read("/proc/net/state"), "up eth0\n");
}

HOST_TEST(FakeHostTools, RecordersOnlyRecord) {
    EXPECT_EQ(
        shell(
            "shutdown -r now; service network restart; hwclock --systohc; rpm -qa; reboot; halt -p; poweroff")
            .out,
        "");
    EXPECT_THAT(host.calls(), TextsAre("shutdown -r now", "service network restart", "hwclock --systohc",
                                       "rpm -qa", "reboot", "halt -p", "poweroff"));
    host.tool("rpm -qa", "dhcpv6-1.0\n");
    EXPECT_EQ(shell("rpm -qa; rpm -q bash").out, "dhcpv6-1.0\n");
}

HOST_TEST(FakeHostTools, MissingToolIsNotFound) {
    host.tool("brctl show", "bridge name\n");
    EXPECT_EQ(shell("brctl show").status, 0);
    host.toolMissing("brctl");
    host.toolMissing("awk");
    EXPECT_EQ(shell("brctl show 2> /dev/null").status, 127);
    EXPECT_EQ(shell("awk '{print $1}' 2> /dev/null").status, 127);
    EXPECT_THAT(host.calls(), TextsAre("brctl show"));
}

HOST_TEST(FakeHostTools, RealToolIsTheMachines) {
    host.realTool("hostname");
    host.setHostName("linux-b");
    EXPECT_EQ(shell("hostname").out, "linux-b\n");
    EXPECT_THROW(host.realTool("no-such-tool"), std::invalid_argument);
}

HOST_TEST(FakeHostTools, CallsOfAPipelineNeverMix) {
    for (const char* name : {"one", "two", "three", "four"}) host.recordOnly(name);
    const std::string argument(3000, 'x');
    for (int round = 0; round < 10; ++round)
        shell("one " + argument + " | two " + argument + " | three " + argument + " | four " + argument);
    ASSERT_EQ(host.calls().size(), 40U);
    for (const std::string& call : host.calls()) EXPECT_EQ(call.substr(call.find(' ') + 1), argument);
}

HOST_TEST(FakeHostTools, UnrecordedCallMayBeExpected) {
    host.tool("ethtool eth0", "");
    host.expectUnrecorded();
    EXPECT_THAT(shell("ethtool eth1 2>&1").out, HasSubstr("no answer is recorded for: ethtool eth1"));
    EXPECT_THAT(host.unrecorded(), TextsAre("ethtool eth1"));
    EXPECT_THAT(host.calls(), TextsAre("ethtool eth1"));
}

// --- Clock and programs.

HOST_TEST(FakeHostClock, SettingItIsRecorded) {
    const std::time_t before = std::time(nullptr);
    timeval time{1000000000, 0};
    struct timezone zone {};
    EXPECT_EQ(settimeofday(&time, nullptr), 0);
    host.clockFails(EPERM);
    EXPECT_EQ(settimeofday(&time, &zone), -1);
    EXPECT_EQ(errno, EPERM);
    host.clockFails(0);
    EXPECT_EQ(settimeofday(&time, nullptr), 0);
    ASSERT_EQ(host.clockCalls().size(), 3U);
    EXPECT_EQ(host.clockCalls()[0].function, "settimeofday");
    EXPECT_EQ(host.clockCalls()[0].seconds, 1000000000);
    EXPECT_EQ(host.clockCalls()[0].microseconds, 0);
    EXPECT_FALSE(host.clockCalls()[0].timeZone);
    EXPECT_TRUE(host.clockCalls()[1].timeZone);
    EXPECT_LE(std::time(nullptr) - before, 60);
}

HOST_TEST(FakeHostClock, SettingItInAProgramIsRecordedToo) {
    EXPECT_EQ(host.run({buildDirectory() + "/fakehost/set_clock"}).out, "0\n");
    host.clockFails(EINVAL);
    EXPECT_EQ(host.run({buildDirectory() + "/fakehost/set_clock"}).out, "-1\n");
    ASSERT_EQ(host.clockCalls().size(), 2U);
    EXPECT_EQ(host.clockCalls()[0].seconds, 1234567890);
    EXPECT_EQ(host.clockCalls()[0].microseconds, 5);
}

TEST(FakeHostClock, SettingItOutsideIsRefused) {
    timeval time{1000000000, 0};
    EXPECT_EQ(settimeofday(&time, nullptr), -1);
    EXPECT_EQ(errno, EPERM);
}

HOST_TEST(FakeHostPrograms, RunToTheirEnd) {
    Finished finished = host.run({"sh", "-c", "echo out; echo err >&2; exit 3"});
    EXPECT_EQ(finished.status, 3);
    EXPECT_EQ(finished.out, "out\n");
    EXPECT_EQ(finished.err, "err\n");
    EXPECT_EQ(host.run({"sh", "-c", "kill -9 $$"}).status, 137);
    EXPECT_THROW(host.run({"no-such-program"}), std::system_error);
    EXPECT_THROW(host.run({"sleep", "60"}, std::chrono::seconds(0)), std::runtime_error);
}

HOST_TEST(FakeHostPrograms, RunBesideTheTest) {
    RunningProgram program =
        host.start({"sh", "-c", "trap 'echo bye; exit 0' TERM; echo ready; while :; do sleep 0.01; done"});
    ASSERT_TRUE(program.waitForOutput("ready"));
    program.signal(SIGTERM);
    EXPECT_EQ(program.wait().status, 0);
    EXPECT_EQ(program.out(), "ready\nbye\n");
    EXPECT_FALSE(program.waitForOutput("more"));
}

HOST_TEST(FakeHostNetwork, CanBeTheKernels) {
    host.useKernelNetwork();
    EXPECT_THAT(host.listDirectory("/sys/class/net"), TextsAre("lo"));
    EXPECT_THAT(host.read("/proc/net/dev").value_or(""), HasSubstr("lo:"));
    host.realTool("ip");
    if (shell("ip link add va type veth peer name vb 2>/dev/null").status != 0)
        GTEST_SKIP() << "no veth in this kernel";
    EXPECT_TRUE(host.exists("/sys/class/net/va"));
    EXPECT_THAT(host.read("/proc/net/dev").value_or(""), HasSubstr("va:"));
}

}  // namespace
