// What signals do to cvagent, whatever it is at: on hosts whose tools hang, with the real plug-in and with
// the fake one.
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <filesystem>
#include <fstream>
#include <sstream>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/from_directory.h"
#include "tests/agent/hostile_host.h"
#include "tests/agent/suse_host.h"
#include "tests/agent/terminal.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr const char* kState = "/opt/vantrel/corvista/data/oshwminetind.dat";
constexpr const char* kRoutes = "route -A inet6 -n";  // one query of ip-config asks for them
constexpr std::array<int, 3> kStops = {SIGINT, SIGTERM, SIGHUP};

/// Sends the signal and waits for the end, which has to come within a second.
Finished stop(RunningProgram& program, int number) {
    const auto sent = std::chrono::steady_clock::now();
    program.signal(number);
    Finished run = program.wait(std::chrono::seconds(10));
    EXPECT_LT(std::chrono::steady_clock::now() - sent, std::chrono::seconds(1));
    return run;
}

/// The same for a program that dies by it: no command is left, and none came after it.
Finished stopAtOnce(const FakeHost& host, RunningProgram& program, int number) {
    const auto calls = host.calls().size();
    Finished run = stop(program, number);
    EXPECT_EQ(run.status, 128 + number);
    EXPECT_TRUE(isGone(host, "sleep"));
    EXPECT_TRUE(isGone(host, "sh"));
    EXPECT_EQ(host.calls().size(), calls);
    EXPECT_THAT(run.out, IsEmpty());
    return run;
}

bool eventuallyCalls(const FakeHost& host, const std::string& command) {
    return eventually([&] {
        const auto calls = host.calls();
        return std::find(calls.begin(), calls.end(), command) != calls.end();
    });
}

/// Whether the program's main thread comes to sleep in an open.
bool hangsInOpen(const FakeHost& host, const RunningProgram& program) {
    const std::string call = "/proc/" + std::to_string(program.pid()) + "/syscall";
    const std::string open = std::to_string(SYS_openat) + " ";
    return eventually([&] { return host.read(call).value_or("").starts_with(open); });
}

void stopAStartThatHangsIn(FakeHost& host, const SuseHost& suse, const std::string& command) {
    host.tool(command, hanging());
    for (const int number : kStops) {
        host.clearCalls();
        RunningProgram tree = host.start(suse.commandLine({"tree"}));
        ASSERT_TRUE(eventuallyCalls(host, command));
        stopAtOnce(host, tree, number);
        EXPECT_FALSE(host.exists(kState));
    }
}

HOST_TEST(ASignal, EndsAStartThatHangsInATool) {
    const SuseHost suse(host);
    stopAStartThatHangsIn(host, suse, "fdisk -ls");
}

// The C library's system would have the program ignore SIGINT meanwhile.
HOST_TEST(ASignal, EndsAStartThatHangsInACommandWithoutAPipe) {
    const SuseHost suse(host);
    stopAStartThatHangsIn(host, suse, "ifconfig");
}

HOST_TEST(ASignal, EndsAWriteThatHangsInATool) {
    const SuseHost suse(host);
    host.tool("ifconfig eth0 down", hanging());
    for (const int number : kStops) {
        host.clearCalls();
        RunningProgram set = host.start(suse.commandLine({"set", "ip-config:eth0", "InterfaceState", "12"}));
        ASSERT_TRUE(eventuallyCalls(host, "ifconfig eth0 down"));
        stopAtOnce(host, set, number);
    }
}

HOST_TEST(ASignal, EndsReadsThatHangSideBySide) {
    const SuseHost suse(host);
    afterTheStart(host, suse, kRoutes, {""}, {.out = "", .action = "echo >> /hanging; sleep 1000"});
    RunningProgram get = host.start(suse.commandLine({"get", "ip-config:eth0", "101", "101"}));
    ASSERT_TRUE(eventually([&] { return host.read("/hanging") == "\n\n"; }));
    stopAtOnce(host, get, SIGTERM);
}

HOST_TEST(ASignal, EndsAWriteThatHangsInAFile) {
    const SuseHost suse(host);
    host.remove("/etc/resolv.conf");
    ASSERT_EQ(mkfifo("/etc/resolv.conf", 0600), 0);
    RunningProgram set = host.start(suse.commandLine({"set", "ip-config:eth0", "DNSServers", "192.0.2.1"}));
    ASSERT_TRUE(hangsInOpen(host, set));
    stopAtOnce(host, set, SIGTERM);
}

/// Ports that look like the first one, but for their names.
void addPorts(FakeHost& host, int count) {
    std::string listing = "Inter-|   Receive\n face |bytes\n";
    for (int i = 0; i < count; ++i) {
        const std::string name = "eth" + std::to_string(i);
        const std::string link = "/sys/class/net/" + name + "/";
        for (const std::string file : {"type", "flags", "addr_assign_type", "address"}) {
            host.file(link + file, host.read("/sys/class/net/eth0/" + file).value());
        }
        host.file(link + "uevent", "INTERFACE=" + name + "\n");
        host.file(link + "ifindex", std::to_string(i + 2) + "\n");
        host.file(link + "iflink", std::to_string(i + 2) + "\n");
        if (i != 0) {
            host.symlink(link + "device", "../../../0000:00:03.0");
        }
        listing += "  " + name + ":       1 0 0 0\n";
    }
    host.file("/proc/net/dev", listing);
    for (const std::string tool : {"ifconfig", "ethtool", "ip"}) {
        host.tool(tool + " %any", "");
    }
}

HOST_TEST(ASignal, EndsAStartOverAHundredPorts) {
    const SuseHost suse(host);
    addPorts(host, 100);
    host.tool("ethtool eth60", hanging());  // a test that is held up finds it there
    host.clearCalls();
    RunningProgram tree = host.start(suse.commandLine({"tree"}));
    ASSERT_TRUE(eventually([&] { return host.callsOf("ethtool").size() > 20; }));
    const Finished run = stop(tree, SIGTERM);
    EXPECT_EQ(run.status, 128 + SIGTERM);
    EXPECT_TRUE(isGone(host, "sh"));
    EXPECT_LT(host.callsOf("ethtool").size(), 100U) << "the start was over before";
}

// Processes that the signal did not reach because they have left the program's group are commands, too.
HOST_TEST(ASignal, KillsWhatACommandHasStartedInASessionOfItsOwn) {
    const SuseHost suse(host);
    host.realTool("setsid");
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = "trap '' INT TERM HUP; setsid sleep 1000"});
    RunningProgram tree = host.start(suse.commandLine({"tree"}));
    ASSERT_TRUE(eventually([&] { return isRunning(host, "sleep"); }));
    stopAtOnce(host, tree, SIGINT);
}

// A Ctrl-C reaches shells and tools as well: what a tool that goes on has lost is its parent.
HOST_TEST(ASignal, KillsWhatACommandHasLeftBehind) {
    const SuseHost suse(host);
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = "(sleep 999 &) ; sleep 1000"});
    RunningProgram tree = host.start(suse.commandLine({"tree"}));
    ASSERT_TRUE(eventually([&] { return isRunning(host, std::string("sleep\0", 6) + "1000"); }));
    stopAtOnce(host, tree, SIGINT);
}

// Such as a service that it has started. The kernel tells the age of a process in hundredths of a second: the
// command goes on for some of them, so that the next one is younger than what it leaves.
HOST_TEST(ASignal, SparesWhatACommandBeforeHasLeftBehind) {
    const SuseHost suse(host);
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = "(sleep 999 > /dev/null 2>&1 &) ; sleep 0.05"});
    host.tool("brctl show", ToolAnswer{.out = "", .action = "sleep 1000"});
    RunningProgram tree = host.start(suse.commandLine({"tree"}));
    ASSERT_TRUE(eventually([&] { return isRunning(host, std::string("sleep\0", 6) + "1000"); }));
    stop(tree, SIGTERM);
    EXPECT_TRUE(isGone(host, std::string("sleep\0", 6) + "1000"));
    EXPECT_TRUE(isRunning(host, std::string("sleep\0", 6) + "999"));
}

HOST_TEST(ASignal, ThatTheCallerHasBlockedEndsTheProgram) {
    const SuseHost suse(host);
    host.tool("fdisk -ls", hanging());
    sigset_t all;
    sigset_t before;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &before);
    RunningProgram tree = host.start(suse.commandLine({"tree"}));
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
    ASSERT_TRUE(eventually([&] { return isRunning(host, "sleep"); }));
    stopAtOnce(host, tree, SIGTERM);
}

/// The signals that a program ignores, as the kernel writes them: a number in hexadecimal digits.
unsigned long ignoredBy(const FakeHost& host, const RunningProgram& program) {
    const std::string status = host.read("/proc/" + std::to_string(program.pid()) + "/status").value_or("");
    const std::string label = "SigIgn:";
    return std::stoul(status.substr(status.find(label) + label.size()), nullptr, 16);
}

HOST_TEST(ASignal, ThatNohupIgnoresStaysIgnored) {
    CvagentRun cvagent(host);
    cvagent.telling("churn");
    RunningProgram watch = host.start(fromDirectory("/", cvagent.commandLine({"watch"}), "trap '' HUP TERM"));
    ASSERT_TRUE(watch.waitForOutput("withdrawn"));
    const unsigned long hangUp = 1UL << (SIGHUP - 1);
    const unsigned long terminate = 1UL << (SIGTERM - 1);
    EXPECT_EQ(ignoredBy(host, watch) & (hangUp | terminate), hangUp);
    EXPECT_EQ(stop(watch, SIGTERM).status, 0);
}

HOST_TEST(ASignal, FollowedByOthersEndsTheProgramAsWell) {
    const SuseHost suse(host);
    host.tool("fdisk -ls", hanging());
    RunningProgram tree = host.start(suse.commandLine({"tree"}));
    ASSERT_TRUE(eventually([&] { return isRunning(host, "sleep"); }));
    tree.signal(SIGTERM);
    tree.signal(SIGHUP);
    const Finished run = stop(tree, SIGTERM);
    EXPECT_THAT(run.status, testing::AnyOf(128 + SIGTERM, 128 + SIGHUP));
    EXPECT_TRUE(isGone(host, "sleep"));
}

void waitFor(const CvagentRun& cvagent, const std::string& note) {
    ASSERT_TRUE(eventually([&] { return cvagent.diary().find(note) != std::string::npos; }));
}

HOST_TEST(ASignal, EndsAStartThatHangsInThePlugin) {
    for (const int number : kStops) {
        host.remove("/tmp/diary");
        CvagentRun cvagent(host);
        cvagent.telling("hangstart");
        RunningProgram tree = cvagent.start({"tree"});
        waitFor(cvagent, "hanging\n");
        stopAtOnce(host, tree, number);
        EXPECT_THAT(cvagent.diary(), Not(HasSubstr("unload")));
    }
}

// What the command would have told must not be taken for told.
HOST_TEST(ASignal, HoldsWhoWaitsForACommandThatIsKilled) {
    CvagentRun cvagent(host);
    cvagent.telling("command");
    RunningProgram tree = cvagent.start({"tree"});
    waitFor(cvagent, "command\n");
    stopAtOnce(host, tree, SIGTERM);
    EXPECT_THAT(cvagent.diary(), EndsWith("command\n"));
}

HOST_TEST(ASignal, AfterTheAnswerEndsAnUnloadThatHangs) {
    CvagentRun cvagent(host);
    cvagent.telling("hangstop");
    RunningProgram get = cvagent.start({"get", "computer", "108"});
    waitFor(cvagent, "hanging\n");
    const Finished run = stop(get, SIGTERM);
    EXPECT_EQ(run.status, 128 + SIGTERM);
    EXPECT_THAT(run.out, HasSubstr("fake"));
}

HOST_TEST(ASignal, AfterTheAnswerLetsAnUnloadEnd) {
    CvagentRun cvagent(host);
    cvagent.telling("slowstop");
    RunningProgram get = cvagent.start({"get", "computer", "108"});
    waitFor(cvagent, "slow\n");
    const Finished run = stop(get, SIGTERM);
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(cvagent.diary(), EndsWith("\nunload\n"));
}

HOST_TEST(ASignal, EndsAnIdleWatchInOrder) {
    for (const int number : kStops) {
        host.remove("/tmp/diary");
        CvagentRun cvagent(host);
        cvagent.telling("churn");
        RunningProgram watch = cvagent.start({"watch"});
        ASSERT_TRUE(watch.waitForOutput("withdrawn"));
        EXPECT_EQ(stop(watch, number).status, 0) << number;
        EXPECT_THAT(cvagent.diary(), EndsWith("\nunload\n"));
    }
}

HOST_TEST(ASignal, ArrivesAlsoWhereTheCallerHeldItBack) {
    CvagentRun cvagent(host);
    cvagent.telling("churn");
    std::vector<std::string> words = cvagent.commandLine({"watch"});
    words.insert(words.begin(), {"env", "--block-signal=INT,TERM,HUP,ALRM"});
    RunningProgram watch = host.start(words);
    ASSERT_TRUE(watch.waitForOutput("withdrawn"));
    EXPECT_EQ(stop(watch, SIGTERM).status, 0);
}

HOST_TEST(ASignal, EndsAWatchWhosePluginDoesNotStop) {
    CvagentRun cvagent(host);
    cvagent.telling("churn hangstop");
    RunningProgram watch = cvagent.start({"watch"});
    ASSERT_TRUE(watch.waitForOutput("withdrawn"));
    EXPECT_EQ(stop(watch, SIGINT).status, 128 + SIGINT);
}

bool eventuallyWatches(const RunningProgram& program) {
    return eventually([&] { return program.err().find("watching") != std::string::npos; });
}

// The last command of the first pass hangs: what it would have told must neither be reported nor kept.
HOST_TEST(ASignal, EndsAWatchWhoseMonitorHangs) {
    const SuseHost suse(host);
    const ToolAnswer link{*host.read("/tools/.answers/ethtool/eth0")};
    {
        RunningProgram first = host.start(suse.commandLine({"watch"}));
        ASSERT_TRUE(eventuallyWatches(first) && eventually([&] { return host.exists(kState); }));
        EXPECT_EQ(stop(first, SIGTERM).status, 0);
    }
    const auto calls = host.callsOf("ethtool").size();
    std::vector<ToolAnswer> answers(calls - 1, link);
    answers.push_back(hanging());
    host.toolInTurn("ethtool eth0", answers);
    const auto state = host.read(kState);
    RunningProgram watch = host.start(suse.commandLine({"watch"}));
    ASSERT_TRUE(eventuallyWatches(watch) && eventually([&] { return isRunning(host, "sleep"); }));
    const Finished run = stop(watch, SIGTERM);
    EXPECT_THAT(run.status, testing::AnyOf(0, 128 + SIGTERM));
    EXPECT_THAT(run.out, Not(HasSubstr("alert")));
    EXPECT_EQ(host.read(kState), state);
    EXPECT_TRUE(isGone(host, "sleep"));
}

HOST_TEST(AReaderThatHasSeenEnough, IsNoDrama) {
    CvagentRun cvagent(host);
    cvagent.telling("churn");
    std::string line;
    for (const std::string& word : cvagent.commandLine({"watch"})) {
        line += "'" + word + "' ";
    }
    const Finished run = host.run({"sh", "-c", line + "| head -n 1"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, testing::StartsWith("cvagent: watching"));
    EXPECT_THAT(run.err, Not(HasSubstr("cannot write")));
    waitFor(cvagent, "unload");
    EXPECT_THAT(cvagent.diary(), EndsWith("\nunload\n"));
}

HOST_TEST(ASignalAtTheQuestion, MeansNo) {
    const std::string diary = "/var/diary";
    for (const int number : kStops) {
        host.remove(diary);
        const OnTerminal run = stopOnTerminal(
            {"/usr/bin/env", "CORVISTA_FAKE_PLUGIN_DIARY=" + diary, CVAGENT_PROGRAM, "--host-tools", "native",
             "--plugin", FAKE_PLUGIN_FILE, "set", "computer", "PowerAction", "9"},
            "[y/N]", number);
        EXPECT_EQ(run.status, 128 + number) << run.output;
        EXPECT_EQ(host.read(diary), "initialize 1 1 2\nunload\n");
    }
}

}  // namespace
