// cvagent where the system gives it too few descriptors, processes or too little memory: what is missing is
// told, it ends with status 1, and it never crashes.
#include <gmock/gmock.h>
#include <signal.h>

#include <set>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/hostile_host.h"
#include "tests/agent/suse_host.h"

namespace {

using testing::AnyOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

/// Runs cvagent under a limit as the shell's ulimit takes it.
Finished limited(const SuseHost& suse, FakeHost& host, const std::string& limit,
                 const std::vector<std::string>& words) {
    // What the test was started with is not to count.
    std::string line = "exec 3>&- 4>&- 5>&- 6>&- 7>&- 8>&- 9>&-; ulimit " + limit + "; exec";
    for (const std::string& word : suse.commandLine(words)) {
        line += " '" + word + "'";
    }
    return host.run({"sh", "-c", line}, std::chrono::seconds(60));
}

Finished descriptors(const SuseHost& suse, FakeHost& host, int count, const std::vector<std::string>& words) {
    return limited(suse, host, "-n " + std::to_string(count), words);
}

HOST_TEST(FewDescriptors, ThatAreEnoughAreNotTold) {
    const SuseHost suse(host);
    const Finished run = descriptors(suse, host, 64, {"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, IsEmpty());
}

/// cvagent tree where the system gives no more of something.
std::vector<std::string> treeWithout(const SuseHost& suse, const std::string& what,
                                     const std::vector<std::string>& words = {"tree"}) {
    return suse.commandLine(words, {"LD_PRELOAD=" FEW_PROCESSES_LIBRARY, "CORVISTA_FEW_PROCESSES=" + what});
}

HOST_TEST(FewProcesses, CommandsThatCannotBeStartedAreCounted) {
    const SuseHost suse(host);
    const Finished run = host.run(treeWithout(suse, "commands"));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err,
                // Processors are found without a process.
                testing::ContainsRegex("cvagent: the tree has no hard-drive, network-port, ip-config, "
                                       "and more can be missing: "
                                       "[1-9][0-9]* commands could not be started, the system gives "
                                       "no more processes or threads\nRaise the limits of "));
    EXPECT_THAT(host.callsOf("ethtool"), IsEmpty());
}

HOST_TEST(FewProcesses, ShellsForAllCommandsTakeMoreOfThem) {
    const SuseHost suse(host);
    const Finished run = host.run(treeWithout(suse, "commands", {"--commands", "shell", "tree"}));
    EXPECT_THAT(run.err, HasSubstr("cvagent: the tree has no hard-drive, network-port, ip-config, "
                                   "processor, and more can be missing: "));
}

HOST_TEST(FewProcesses, ThreadsThatCannotBeStartedAreTold) {
    const SuseHost suse(host);
    const Finished run = host.run(treeWithout(suse, "threads"));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("network-port:eth0"));
    EXPECT_THAT(run.err, HasSubstr("NetworkMonitor thread failed."));
    EXPECT_THAT(run.err, HasSubstr("cvagent: some of the tree can be missing: the system gives no more "
                                   "processes or threads\n"));
}

HOST_TEST(FewProcesses, ASignalEndsTheProgramWithoutAThreadForIt) {
    CvagentRun cvagent(host);
    cvagent.telling("hangstart")
        .setting("LD_PRELOAD=" FEW_PROCESSES_LIBRARY)
        .setting("CORVISTA_FEW_PROCESSES=threads");
    RunningProgram tree = cvagent.start({"tree"});
    ASSERT_TRUE(eventually([&] { return cvagent.diary().find("hanging\n") != std::string::npos; }));
    tree.signal(SIGTERM);
    EXPECT_EQ(tree.wait(std::chrono::seconds(1)).status, 128 + SIGTERM);
}

// The sanitizers' own checks open descriptors, and want terabytes of memory.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
HOST_TEST(FewDescriptors, WhatIsMissingFromTheTreeIsTold) {
    const SuseHost suse(host);
    const Finished run = descriptors(suse, host, 10, {"tree"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, HasSubstr("computer [3]"));
    EXPECT_THAT(run.err, HasSubstr("network-port, ip-config, processor, and more can be missing: "));
    EXPECT_THAT(run.err, HasSubstr("there are too few descriptors (limit 10)\n"
                                   "Raise the limit: ulimit -n 256\n"));
    EXPECT_EQ(run.err.find("too few descriptors"), run.err.rfind("too few descriptors")) << "it is told once";
}

HOST_TEST(FewDescriptors, EveryCommandTellsAndFails) {
    const SuseHost suse(host);
    host.tool("ifconfig lo", "");  // the doctor tries it
    for (const std::vector<std::string>& words : std::vector<std::vector<std::string>>{
             {"get", "computer"},
             {"get", "ip-config:eth0", "25"},  // of which there is no node then
             {"set", "computer", "OwnerName", "x"},
             {"watch", "--for", "0"},
             {"doctor"}}) {
        const Finished run = descriptors(suse, host, 10, words);
        EXPECT_EQ(run.status, 1) << words.front();
        EXPECT_THAT(run.err, HasSubstr("there are too few descriptors (limit 10)\n")) << words.front();
    }
    EXPECT_EQ(descriptors(suse, host, 10, {"properties"}).status, 0);
}

HOST_TEST(FewDescriptors, WithHardlyAnyItSaysWhatItCannotOpen) {
    const SuseHost suse(host);
    for (int count = 4; count < 10; ++count) {
        const Finished run = descriptors(suse, host, count, {"tree"});
        EXPECT_EQ(run.status, 1) << count << run.err;
        EXPECT_THAT(run.err,
                    HasSubstr("there are too few descriptors (limit " + std::to_string(count) + ")"));
    }
}

// Some numbers between are enough for a start but not for reading many properties side by side.
HOST_TEST(FewDescriptors, NothingIsMissingUntold) {
    const SuseHost suse(host);
    const std::string whole = descriptors(suse, host, 256, {"get", "ip-config:eth0"}).out;
    for (const int count : {12, 14, 16}) {
        const Finished run = descriptors(suse, host, count, {"get", "ip-config:eth0"});
        EXPECT_THAT(run.status, AnyOf(0, 1)) << count;
        EXPECT_EQ(run.err.find("too few descriptors") != std::string::npos, run.status == 1) << run.err;
        EXPECT_TRUE(run.status == 1 || run.out == whole) << count << run.out;
    }
}

// Below some megabytes the loader cannot even load the program and says so.
HOST_TEST(LittleMemory, IsToldAndNeverACrash) {
    const SuseHost suse(host);
    const std::string whole = host.run(suse.commandLine({"tree"})).out;
    std::set<int> seen;
    for (int kilobytes = 4000; kilobytes < 80000; kilobytes += kilobytes < 8000 ? 210 : kilobytes) {
        const Finished run = limited(suse, host, "-v " + std::to_string(kilobytes), {"tree"});
        seen.insert(run.status);
        EXPECT_THAT(run.status, AnyOf(0, 1, 127)) << kilobytes << run.err;
        EXPECT_EQ(run.err.find("the system gives no more") != std::string::npos, run.status == 1) << run.err;
        EXPECT_TRUE(run.status != 0 || run.out == whole) << kilobytes;
    }
    EXPECT_THAT(seen, testing::IsSupersetOf({0, 1}));
}
#endif

}  // namespace
