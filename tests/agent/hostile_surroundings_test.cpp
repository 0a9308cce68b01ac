// cvagent on a host whose disks are full or read-only and whose clock jumps.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>
#include <set>

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

std::vector<std::string> whileTheClockJumps(const std::string& when, const std::vector<std::string>& words) {
    std::vector<std::string> line = {"env", "LD_PRELOAD=" CLOCK_JUMP_LIBRARY, "CLOCK_JUMP=" + when};
    line.insert(line.end(), words.begin(), words.end());
    return line;
}

// The plug-in of the tests publishes all the time, so each second's time of day is seen.
HOST_TEST(ClockThatJumps, WatchingGoesOnAsLongAsItWasAsked) {
    for (const std::string when : {"400 -86400", "400 86400"}) {
        const auto start = std::chrono::steady_clock::now();
        CvagentRun cvagent(host);
        cvagent.telling("churn").setting("LD_PRELOAD=" CLOCK_JUMP_LIBRARY).setting("CLOCK_JUMP=" + when);
        const Finished run = cvagent({"watch", "--json", "--for", "1"});
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::seconds(1)) << when;
        std::istringstream lines(run.out);
        std::set<std::string> days;
        for (std::string line; std::getline(lines, line);) {
            days.insert(Json::parse(line)["time"].get<std::string>().substr(0, 10));
        }
        EXPECT_EQ(days.size(), 2U) << when;
    }
}

HOST_TEST(ClockThatJumps, TheDeadlineOfCommandsDoesNotMove) {
    SuseHost suse(host);
    host.tool("fdisk -ls", hanging());
    const Finished run =
        host.run(whileTheClockJumps("400 -86400", suse.commandLine({"tree", "--command-timeout", "0.8"})));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("a command of the plug-in was ended after 0.8 s; "));
}

HOST_TEST(ClockThatJumps, TheTimeIsTheHosts) {
    SuseHost suse(host);
    const Finished run = host.run(
        whileTheClockJumps("0 -86400", suse.commandLine({"get", "computer", "CurrentTime", "--json"})));
    EXPECT_EQ(run.status, 0);
    const auto told = Json::parse(run.out)["properties"]["126"]["value"].get<long long>();
    EXPECT_NEAR(static_cast<double>(told), static_cast<double>(time(nullptr) - 86400), 30);
}

}  // namespace
