// cvagent and the real plug-in on a host whose tools hang, die or are not there.
#include <gmock/gmock.h>
#include <signal.h>

#include <nlohmann/json.hpp>

#include "agent/core/command_deadline.h"
#include "agent/core/surroundings.h"
#include "framework/qx/thread.h"
#include "tests/agent/hostile_host.h"
#include "tests/agent/started_plugin.h"
#include "tests/agent/suse_host.h"

namespace {

using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using Json = nlohmann::ordered_json;

constexpr const char* kRoutes = "route -A inet6 -n";  // one query asks for them
const std::string kGateway = "::/0   fe80::1  UG   1024   0  0 eth0\n";
constexpr const char* kIp = "ip-config:eth0";

std::vector<std::string> within(const std::string& seconds, std::vector<std::string> words) {
    words.insert(words.end(), {"--command-timeout", seconds});
    return words;
}

HOST_TEST(HangingTool, ReadsAsAnErrorAndTheRestGoesOn) {
    SuseHost suse(host);
    afterTheStart(host, suse, kRoutes, {kGateway}, hanging());
    const Finished run = suse.run(within("2", {"get", kIp, "101", "25", "100", "--json"}));
    EXPECT_EQ(run.status, 1);
    const Json properties = Json::parse(run.out)["properties"];
    EXPECT_THAT(properties["101"]["error"], testing::StartsWith("timed out after 2 s: route -A inet6 -n"));
    EXPECT_EQ(properties["25"]["value"], "192.0.2.10");
    EXPECT_EQ(properties["100"]["value"], "192.0.2.1");
    EXPECT_TRUE(isGone(host, "sleep"));
}

HOST_TEST(HangingTool, ThatLeavesItsPipeToAnotherEndsUnderAShellToo) {
    SuseHost suse(host);
    host.tool("hostname -s", ToolAnswer{.out = "", .action = "sleep 1000 &"});
    const Finished run = suse.run(within("0.3", {"--commands", "shell", "get", kIp, "HostName"}));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("timed out after 0.3 s: hostname -s"));
}

HOST_TEST(HangingTool, AListingTellsAndFails) {
    SuseHost suse(host);
    afterTheStart(host, suse, kRoutes, {kGateway}, hanging());
    const Finished run = suse.run(within("2", {"get", kIp}));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("not known (timed out after 2 s: route -A inet6 -n"));
    EXPECT_THAT(run.out, HasSubstr("192.0.2.1\n"));
}

HOST_TEST(HangingTool, AStartWarnsAndGoesOn) {
    SuseHost suse(host);
    host.tool("fdisk -ls", hanging());
    const Finished run = suse.run(within("2", {"tree"}));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("cvagent: a command of the plug-in was ended after 2 s; what it would "
                                   "have told is missing: fdisk -ls"));
    EXPECT_THAT(run.err, HasSubstr("Command : fdisk -ls 2>/dev/null > /tmp/fdisk_tmp failed!!"));
    EXPECT_THAT(run.out, Not(HasSubstr("hard-drive")));
    EXPECT_THAT(run.out, HasSubstr("ip-config:eth0 [9]  IP Configuration: up, 192.0.2.10"));
    EXPECT_THAT(host.listDirectory("/tmp"), IsEmpty());
}

HOST_TEST(HangingTool, AWriteFailsAfterTenTimesTheDeadline) {
    SuseHost suse(host);
    host.tool("ifconfig eth0 down", hanging());
    const Finished run = suse.run(within("0.3", {"set", kIp, "InterfaceState", "12"}));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, IsEmpty());
    EXPECT_THAT(
        run.err,
        HasSubstr("InterfaceState may be changed only in part: timed out after 3 s: ifconfig eth0 down\n"));
}

HOST_TEST(HangingTool, ZeroWaitsForIt) {
    SuseHost suse(host);
    host.tool(kRoutes, ToolAnswer{.out = kGateway, .delayMilliseconds = 200});
    const Finished run = suse.run(within("0", {"get", kIp, "IPv6Gateway"}));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("fe80::1"));
    EXPECT_THAT(run.err, IsEmpty());
}

HOST_TEST(HangingTool, ADeadlineThatIsNoneIsRefused) {
    SuseHost suse(host);
    for (const std::string seconds : {"-1", "nan", "soon", "", "1e9", "1,5"}) {
        const Finished run = suse.run(within(seconds, {"tree"}));
        EXPECT_EQ(run.status, 2) << seconds;
        EXPECT_THAT(run.err, HasSubstr("--command-timeout: '" + seconds +
                                       "' is no number of seconds from 0 to 1000000"));
    }
}

/// Counts the alerts.
class Alerts : public cvagent::Listener {
public:
    void hear(const cvagent::Event& event) override { count += event.kind == cvagent::Event::Kind::alert; }
    std::atomic<int> count{0};
};

// A tool that hangs says nothing of the link: the monitor must not tell that it went down, and must tell once
// it really does.
HOST_TEST(HangingTool, TheMonitorsGoOnAndTellNoLies) {
    const SuseHost suse(host);
    const std::string settings = *host.read("/tools/.answers/ethtool/eth0");
    host.tool("ethtool eth0", ToolAnswer{.out = settings, .action = "[ -e /hang ] && sleep 1000"});
    host.directory("/opt/vantrel/corvista/data");
    const cvagent::QuietCommands quiet;
    Alerts alerts;
    const cvagent::CommandDeadline deadline(0.5s, cvagent::tellNobody);
    QX::setClockSpeed(1000);  // a pass every 30 ms
    StartedPlugin plugin(CORVISTA_PLUGIN_FILE, &alerts);
    ASSERT_TRUE(eventually([&] { return host.exists("/opt/vantrel/corvista/data/oshwminetind.dat"); }));
    host.file("/hang", "");
    const auto calls = [&] { return host.callsOf("ethtool").size(); };
    const auto before = calls();
    ASSERT_TRUE(eventually([&] { return calls() > before + 2; })) << "two commands were ended";
    EXPECT_EQ(alerts.count, 0);
    host.tool("ethtool eth0", "\tLink detected: no\n");
    host.remove("/hang");
    EXPECT_TRUE(eventually([&] { return alerts.count == 1; }));
    QX::setClockSpeed(1);
}

HOST_TEST(DyingTool, ReadsAsNotKnown) {
    SuseHost suse(host);
    host.tool(kRoutes, ToolAnswer{.out = "", .action = "kill -SEGV $PPID"});
    const Finished run = suse.run({"get", kIp, "IPv6Gateway", "IPv4Gateway", "--json"});
    EXPECT_EQ(run.status, 0);
    const Json properties = Json::parse(run.out)["properties"];
    EXPECT_EQ(properties["101"]["value"], "");
    EXPECT_EQ(properties["100"]["value"], "192.0.2.1");
}

HOST_TEST(DyingTool, HalfASnapshotIsNoNews) {
    SuseHost suse(host);
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = "printf 'Disk /dev/sda: 80'; kill -SEGV $PPID"});
    const Finished run = suse.run({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("Command : fdisk -ls 2>/dev/null > /tmp/fdisk_tmp failed!!"));
    EXPECT_THAT(run.out, HasSubstr("network-port:eth0"));
}

HOST_TEST(MissingTool, EveryOneOfThemLeavesATree) {
    SuseHost suse(host);
    for (const std::string name :
         {"ifconfig", "ethtool", "route", "ip", "brctl", "hostname", "rpm", "fdisk"}) {
        host.toolMissing(name);
    }
    const Finished run = suse.run({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("computer [3]  Computer"));
    EXPECT_THAT(run.out, HasSubstr("network-port:eth0"));
    const Finished read = suse.run({"get", "network-port:eth0", "--json"});
    EXPECT_EQ(read.status, 0);
    const Finished doctor = suse.run({"doctor"});
    EXPECT_THAT(doctor.out, HasSubstr("missing: "));
}

}  // namespace
