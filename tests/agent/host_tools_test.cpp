#include "agent/core/host_tools.h"

#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/time.h>
#include <sys/wait.h>

#include <csignal>
#include <cstdlib>
#include <nlohmann/json.hpp>

#include "agent/core/probe.h"
#include "tests/support/fake_host.h"
#include "tests/support/texts_are.h"

namespace {

using cvagent::HostTools;
using cvagent::inspectHostTools;
using cvagent::Look;
using cvagent::ToolReport;
using testing::IsEmpty;

constexpr const char* kAdapters = "/opt/adapters";

/// A host with programs in the adapters' directory; they are never run here.
void installAdapters(FakeHost& host) {
    for (const std::string name : {"ifconfig", "route", "fdisk"}) {
        host.file(std::string(kAdapters) + "/" + name + "/" + name, "#!/bin/sh\n", 0755);
    }
}

std::vector<std::string> adapted(const std::vector<ToolReport>& reports) {
    std::vector<std::string> names;
    for (const ToolReport& report : reports) {
        if (report.useAdapter) {
            names.push_back(report.tool);
        }
    }
    return names;
}

const std::string kClassicIfconfig = "lo        Link encap:Local Loopback  \n";
const std::string kModernIfconfig = "lo: flags=73<UP,LOOPBACK,RUNNING>  mtu 65536\n";
const std::string kRoute = "Kernel IP routing table\n";
const std::string kDisks = "\nDisk /dev/sda: 80.0 GB, 80026361856 bytes\n";

HOST_TEST(HostTools, ThatSpeakTheClassicFormatsStay) {
    installAdapters(host);
    host.tool("ifconfig lo", kClassicIfconfig);
    host.tool("route -n", kRoute);
    host.tool("fdisk -ls", kDisks);
    EXPECT_THAT(adapted(inspectHostTools(HostTools::automatic, Look::adapters, kAdapters)), IsEmpty());
}

HOST_TEST(HostTools, ThatSpeakAnotherFormatAreReplacedOneByOne) {
    installAdapters(host);
    host.tool("ifconfig lo", kModernIfconfig);
    host.tool("route -n", kRoute);
    host.tool("fdisk -ls", {"", 1, "fdisk: bad usage\n"});
    const auto reports = inspectHostTools(HostTools::automatic, Look::adapters, kAdapters);
    EXPECT_THAT(adapted(reports), TextsAre("ifconfig", "fdisk"));
    EXPECT_EQ(reports[0].used(), "/opt/adapters/ifconfig/ifconfig");
    EXPECT_EQ(reports[1].used(), "/tools/route");
    EXPECT_FALSE(reports[2].classic);
}

HOST_TEST(HostTools, ThatAreMissingAreReplaced) {
    installAdapters(host);
    EXPECT_THAT(adapted(inspectHostTools(HostTools::automatic, Look::adapters, kAdapters)),
                TextsAre("ifconfig", "route", "fdisk"));
}

HOST_TEST(HostTools, WithoutAdaptersTheHostsOwnAreUsed) {
    host.tool("ifconfig lo", kModernIfconfig);
    const auto reports = inspectHostTools(HostTools::automatic, Look::adapters, std::nullopt);
    EXPECT_THAT(adapted(reports), IsEmpty());
    EXPECT_EQ(reports[0].used(), "/tools/ifconfig");
    EXPECT_TRUE(reports[1].missing());
}

HOST_TEST(HostTools, AHostWithoutDisksHasAClassicFdisk) {
    installAdapters(host);
    host.tool("fdisk -ls", "");
    EXPECT_THAT(adapted(inspectHostTools(HostTools::automatic, Look::adapters, kAdapters)),
                TextsAre("ifconfig", "route"));
}

HOST_TEST(HostTools, ForcedChoicesRunNothing) {
    installAdapters(host);
    host.tool("ifconfig lo", kClassicIfconfig);
    EXPECT_THAT(adapted(inspectHostTools(HostTools::native, Look::adapters, kAdapters)), IsEmpty());
    EXPECT_THAT(adapted(inspectHostTools(HostTools::classic, Look::adapters, kAdapters)),
                TextsAre("ifconfig", "route", "fdisk"));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(HostTools, OnlyTheAdaptersInUseComeFirstAndTheOthersLast) {
    installAdapters(host);
    host.tool("ifconfig lo", kClassicIfconfig);
    cvagent::putAdaptersOnPath(inspectHostTools(HostTools::automatic, Look::adapters, kAdapters));
    EXPECT_EQ(std::string(std::getenv("PATH")),
              "/opt/adapters/route:/opt/adapters/fdisk:/tools:/usr/sbin:/usr/bin:/sbin:/bin:/opt/adapters/"
              "ifconfig");
}

HOST_TEST(HostTools, ThePathStaysWhenNoAdapterIsUsed) {
    cvagent::putAdaptersOnPath(inspectHostTools(HostTools::native, Look::adapters, kAdapters));
    EXPECT_EQ(std::string(std::getenv("PATH")), "/tools:/usr/sbin:/usr/bin:/sbin:/bin");
}

/// A link in sysfs, as the kernel shows a card.
void addCard(FakeHost& host, const std::string& name) {
    host.file("/sys/class/net/" + name + "/type", "1\n");
    host.file("/sys/class/net/" + name + "/device/vendor", "0x8086\n");
}

const std::string kDeviceHeader = "Inter-|   Receive\n face |bytes    packets\n";

HOST_TEST(HostTools, TheListingIsAdaptedWhereAnInterfaceHasOneOfTodaysNames) {
    installAdapters(host);
    host.file(std::string(kAdapters) + "/egrep/egrep", "#!/bin/sh\n", 0755);
    host.tool("ifconfig lo", kClassicIfconfig);
    host.tool("route -n", kRoute);
    host.tool("fdisk -ls", kDisks);
    host.file("/proc/net/dev", kDeviceHeader + "  eth0: 1 2\n");
    addCard(host, "eth0");
    EXPECT_THAT(adapted(inspectHostTools(HostTools::automatic, Look::adapters, kAdapters)), IsEmpty());
    host.file("/proc/net/dev", kDeviceHeader + "  eth0: 1 2\nens18: 1 2\n");
    addCard(host, "ens18");
    const auto reports = inspectHostTools(HostTools::automatic, Look::adapters, kAdapters);
    EXPECT_THAT(adapted(reports), TextsAre("egrep"));
    EXPECT_EQ(reports.back().flaw, "finds no interfaces with names such as enp3s0");
    EXPECT_THAT(adapted(inspectHostTools(HostTools::native, Look::adapters, kAdapters)), IsEmpty());
}

/// As while its package is upgraded.
HOST_TEST(HostTools, AToolThatVanishesIsAnsweredByItsAdapter) {
    host.tool("ethtool lo", "the host's own\n");
    host.tool("brctl show", "the host's own\n");
    host.tool("ifconfig lo", kClassicIfconfig);
    const auto reports = inspectHostTools(HostTools::automatic, Look::adapters, cvagent::adapterDirectory());
    cvagent::putAdaptersOnPath(reports);
    const auto answers = [&] { return host.run({"sh", "-c", "ethtool lo; brctl show; ifconfig lo"}).out; };
    EXPECT_EQ(answers(), "the host's own\nthe host's own\n" + kClassicIfconfig);
    for (const char* tool : {"ethtool", "brctl", "ifconfig"}) {
        host.toolMissing(tool);
    }
    EXPECT_THAT(answers(), testing::AllOf(testing::HasSubstr("Settings for lo:\n"),
                                          testing::HasSubstr("lo        Link encap:Local Loopback")));
}

HOST_TEST(HostTools, EverythingIsLookedAtForTheDoctor) {
    host.tool("ethtool -h", "");
    const auto reports = inspectHostTools(HostTools::native, Look::everything, std::nullopt);
    std::map<std::string, const ToolReport*> byName;
    for (const ToolReport& report : reports) {
        byName[report.tool] = &report;
        EXPECT_NE(report.package, "") << report.tool;
        EXPECT_NE(report.purpose, "") << report.tool;
    }
    EXPECT_EQ(byName.at("ethtool")->used(), "/tools/ethtool");
    EXPECT_TRUE(byName.at("brctl")->missing());
    EXPECT_EQ(byName.at("brctl")->package, "bridge-utils");
    EXPECT_EQ(byName.at("md5sum")->used(), "/usr/bin/md5sum");
}

HOST_TEST(Probe, KillsAProgramThatTakesTooLong) {
    host.tool("ifconfig lo", {kClassicIfconfig, 0, "", 20000});
    cvagent::Probe probe({"/tools/ifconfig", "lo"});
    EXPECT_FALSE(probe.finish(std::chrono::milliseconds(100)));
}

/// A router's table has tens of thousands of lines.
HOST_TEST(Probe, ReadsToTheEndWhatIsTooLongToBeKept) {
    cvagent::Probe probe({"/usr/bin/head", "-c", "2000000", "/dev/zero"});
    EXPECT_TRUE(probe.finish(std::chrono::seconds(60)));
    EXPECT_GE(probe.output().size(), 1U << 20U);
    EXPECT_LT(probe.output().size(), 1100000U);
}

HOST_TEST(Probe, KillsAProgramThatNobodyWaitsFor) {
    const auto start = std::chrono::steady_clock::now();
    { const cvagent::Probe probe({"/usr/bin/sleep", "60"}); }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(30));
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child is left";
}

HOST_TEST(Probe, GoesOnWaitingAfterASignal) {
    signal(SIGALRM, [](int) {});
    const itimerval often{{0, 10000}, {0, 10000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    cvagent::Probe probe({"/bin/sh", "-c", "sleep 0.3; echo done"});
    EXPECT_TRUE(probe.finish(std::chrono::seconds(60)));
    EXPECT_EQ(probe.output(), "done\n");
    const itimerval never{};
    setitimer(ITIMER_REAL, &never, nullptr);
}

HOST_TEST(Probe, WithoutADescriptorIsNoSuccess) {
    const rlimit none{0, 1024};
    setrlimit(RLIMIT_NOFILE, &none);
    cvagent::Probe probe({"/usr/bin/true"});
    const rlimit some{1024, 1024};
    setrlimit(RLIMIT_NOFILE, &some);
    EXPECT_FALSE(probe.finish(std::chrono::milliseconds(100)));
    EXPECT_EQ(probe.output(), "");
}

HOST_TEST(Probe, AMissingProgramIsNoSuccess) {
    cvagent::Probe probe({"/nowhere"});
    EXPECT_FALSE(probe.finish(std::chrono::milliseconds(100)));
    EXPECT_EQ(probe.output(), "");
}

HOST_TEST(Doctor, TellsWhatIsFoundUsedAndMissing) {
    host.tool("ifconfig lo", kModernIfconfig);
    host.tool("route -n", kRoute);
    const Finished run = host.run({CVAGENT_PROGRAM, "doctor", "--host-tools", "native"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, testing::HasSubstr("/tools/ifconfig (not the classic format)"));
    EXPECT_THAT(run.out, testing::ContainsRegex("\nroute +/tools/route +the host's own\n"));
    EXPECT_THAT(run.out,
                testing::ContainsRegex("\nbrctl +not found +missing: .*install the package bridge-utils\n"));
    EXPECT_THAT(run.out, testing::HasSubstr("apt-get install bridge-utils ethtool"));
    EXPECT_FALSE(host.exists("/opt/vantrel"));
}

HOST_TEST(Doctor, TellsWhichAdaptersAreUsed) {
    const Finished run = host.run({CVAGENT_PROGRAM, "doctor", "--host-tools", "classic"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, testing::ContainsRegex("\nroute +not found +our adapter /.*/route\n"));
}

HOST_TEST(Doctor, NeedsNoPackageOnABareHost) {
    for (const char* tool : {"ip link", "hostname -s"}) {
        host.tool(tool, "");
    }
    host.tool("route -n", kRoute);
    host.file("/proc/net/dev", kDeviceHeader + " ens18: 1 2\n");
    addCard(host, "ens18");
    const Finished run = host.run({CVAGENT_PROGRAM, "doctor"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, testing::ContainsRegex("\nethtool +not found +our adapter /.*/ethtool\n"));
    EXPECT_THAT(run.out,
                testing::ContainsRegex(
                    "\negrep +/.*egrep \\(finds no interfaces with names such as enp3s0\\) +our adapter "));
    EXPECT_THAT(run.out,
                testing::HasSubstr("Our adapters stand in for: ifconfig fdisk ethtool brctl egrep\n"));
    EXPECT_THAT(run.out,
                testing::HasSubstr("Our adapters stand by, should the host's own be removed: route\n"));
    EXPECT_THAT(run.out, testing::EndsWith("Nothing is missing: no package needs to be installed.\n"));
}

HOST_TEST(Doctor, SpeaksJson) {
    host.tool("ifconfig lo", kModernIfconfig);
    const Finished run = host.run({CVAGENT_PROGRAM, "doctor", "--host-tools", "native", "--json"});
    ASSERT_EQ(run.status, 0) << run.err;
    std::map<std::string, nlohmann::json> tools;
    const auto report = nlohmann::json::parse(run.out);
    for (const auto& tool : report["tools"]) {
        tools[tool["tool"]] = tool;
    }
    EXPECT_EQ(tools["ifconfig"]["host"], "/tools/ifconfig");
    EXPECT_EQ(tools["ifconfig"]["used"], "/tools/ifconfig");
    EXPECT_EQ(tools["ifconfig"]["classic"], false);
    EXPECT_EQ(tools["brctl"]["host"], nullptr);
    EXPECT_THAT(tools["brctl"]["adapter"], testing::EndsWith("/brctl/brctl"));
    EXPECT_EQ(tools["ip"]["adapter"], nullptr);
    EXPECT_EQ(tools["brctl"]["used"], nullptr);
    EXPECT_EQ(tools["brctl"]["package"], "bridge-utils");
    EXPECT_NE(tools["brctl"]["purpose"], "");
    EXPECT_EQ(report["plugins"].size() + report["leftOut"].size(), 2U);
    EXPECT_EQ(report["service"]["running"], false);
    EXPECT_EQ(report["service"]["version"], nullptr);
}

}  // namespace
