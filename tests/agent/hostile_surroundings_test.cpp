// cvagent on a host whose disks are full or read-only and whose clock jumps.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/hostile_host.h"
#include "tests/agent/suse_host.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using Json = nlohmann::ordered_json;

constexpr const char* kData = "/opt/vantrel/corvista/data";

HOST_TEST(FullTmp, IsToldAndTheRestIsShown) {
    SuseHost suse(host);
    host.fullDisk("/tmp");
    const Finished run = host.run(withoutMounts(host, suse.commandLine({"tree"})));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err,
                HasSubstr("cvagent: cannot write to /tmp: No space left on device; drives, partitions and "
                          "network ports can be missing\n"));
    EXPECT_THAT(run.err, HasSubstr("Command : fdisk -ls 2>/dev/null > /tmp/fdisk_tmp failed!!"));
    EXPECT_THAT(run.out, HasSubstr("computer [3]  Computer: linux"));
    EXPECT_THAT(run.out, HasSubstr("processor:1"));
    EXPECT_THAT(run.out, Not(HasSubstr("hard-drive")));
}

HOST_TEST(ReadOnlyTmp, IsTold) {
    SuseHost suse(host);
    host.readOnly("/tmp");
    const Finished run = host.run(withoutMounts(host, suse.commandLine({"tree"})));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("cvagent: cannot write to /tmp: Read-only file system; "));
}

HOST_TEST(ReadOnlyData, IsToldAndEverythingIsShown) {
    SuseHost suse(host);
    host.directory(kData, 0700);
    host.readOnly(kData);
    const Finished run = suse.run({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err,
                HasSubstr("cvagent: cannot write to the data directory '/opt/vantrel/corvista/data/': "
                          "Read-only file system; "));
    EXPECT_THAT(run.out, HasSubstr("hard-drive:sda"));
    EXPECT_THAT(run.out, HasSubstr("network-port:eth0"));
}

HOST_TEST(ReadOnlyData, AnOwnerIsNotWritten) {
    SuseHost suse(host);
    host.directory(kData, 0700);
    host.readOnly(kData);
    const Finished run = suse.run({"set", "computer", "OwnerName", "somebody"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, IsEmpty());
    EXPECT_THAT(run.err, HasSubstr("OwnerName was not changed"));
    EXPECT_THAT(host.listDirectory(kData), IsEmpty());
}

constexpr long long kDay = 86400;

std::vector<std::string> whileTheClockJumps(const std::string& how, const std::vector<std::string>& words) {
    std::vector<std::string> line = {"env", "LD_PRELOAD=" CLOCK_JUMP_LIBRARY, "CLOCK_JUMP=" + how};
    line.insert(line.end(), words.begin(), words.end());
    return line;
}

/// Seconds of a time as events have it.
long long secondsOf(const std::string& text) {
    std::tm parts{};
    EXPECT_NE(strptime(text.c_str(), "%Y-%m-%dT%H:%M:%S", &parts), nullptr) << text;
    return timegm(&parts);
}

// The plug-in of the tests publishes all the time, so there are events before and after.
HOST_TEST(ClockThatJumps, WatchingGoesOnAsLongAsItWasAsked) {
    for (const long long by : {-kDay, kDay}) {
        const auto start = std::chrono::steady_clock::now();
        CvagentRun cvagent(host);
        cvagent.telling("churn")
            .setting("LD_PRELOAD=" CLOCK_JUMP_LIBRARY)
            .setting("CLOCK_JUMP=/jump " + std::to_string(by));
        RunningProgram watch = cvagent.start({"watch", "--json", "--for", "3"});
        ASSERT_TRUE(watch.waitForOutput("\n"));
        host.file("/jump", "");
        const Finished run = watch.wait();
        host.remove("/jump");
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::seconds(3)) << by;
        std::vector<long long> times;
        std::istringstream lines(run.out);
        for (std::string line; std::getline(lines, line);) {
            times.push_back(secondsOf(Json::parse(line)["time"].get<std::string>()));
        }
        EXPECT_NEAR(static_cast<double>(times.back() - times.front() - by), 0, 60) << by;
    }
}

HOST_TEST(ClockThatJumps, TheDeadlineOfCommandsDoesNotMove) {
    SuseHost suse(host);
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = "> /jump; sleep 1000"});
    const Finished run =
        host.run(whileTheClockJumps("/jump -86400", suse.commandLine({"tree", "--command-timeout", "0.8"})));
    EXPECT_EQ(run.status, 0);
    EXPECT_TRUE(host.exists("/jump"));
    EXPECT_THAT(run.err, HasSubstr("a command of the plug-in was ended after 0.8 s; "));
}

HOST_TEST(ClockThatJumps, TheTimeIsTheHosts) {
    SuseHost suse(host);
    const Finished run = host.run(
        whileTheClockJumps("/ -86400", suse.commandLine({"get", "computer", "CurrentTime", "--json"})));
    EXPECT_EQ(run.status, 0);
    const auto told = Json::parse(run.out)["properties"]["126"]["value"].get<long long>();
    EXPECT_NEAR(static_cast<double>(told), static_cast<double>(time(nullptr) - kDay), 30);
}

}  // namespace
