// What a stranger, or a careless caller, lays out around cvagent: directory, environment, PATH, umask,
// descriptors.
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <set>
#include <sstream>

#include "agent/core/environment.h"
#include "agent/core/surroundings.h"
#include "tests/agent/cvagent_run.h"
#include "tests/agent/from_directory.h"
#include "tests/agent/hostile_host.h"
#include "tests/agent/suse_host.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::IsSubsetOf;
using testing::Not;

constexpr const char* kStrangers = "/home/stranger";

/// A tool that every start runs, which also writes down what a shell command tells of its surroundings.
void tellFromWithin(FakeHost& host, const std::string& command) {
    host.tool("hostname", ToolAnswer{.out = "linux\n", .action = "{ " + command + "; } > /var/told"});
}

std::string told(const FakeHost& host) {
    return host.read("/var/told").value_or("(nothing)");
}

// The names are those that an unquoted pattern of the plug-in finds: the filter then reads the one FIFO for
// patterns to look for in the other, and waits for ever.
HOST_TEST(StrangersDirectory, ItsNamesAreNoPartOfACommand) {
    SuseHost suse(host);
    host.directory(kStrangers, 0777);
    for (const std::string fifo : {"dhcpv6a", "dhcpv6b"}) {
        ASSERT_EQ(mkfifo((std::string(kStrangers) + "/" + fifo).c_str(), 0666), 0);
    }
    host.tool("rpm -qa", ToolAnswer{.out = "", .action = "pwd > /var/told"});
    const Finished run = host.run(fromDirectory(
        kStrangers, suse.commandLine({"set", "ip-config:eth0", "IPOrigin", "3", "--command-timeout", "10"})));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, Not(HasSubstr("timed out")));
    EXPECT_EQ(told(host), "/\n");
}

// AddressSanitizer knows its own stack from /proc.
#if !defined(__SANITIZE_ADDRESS__)
HOST_TEST(StrangersDirectory, HoldsNoPlugin) {
    host.directory(std::string(kStrangers) + "/bin");
    const std::string fake = host.read(FAKE_PLUGIN_FILE).value_or("");
    for (const std::string place : {"/bin/", "/lib/", "/"}) {
        host.file(kStrangers + place + "libvantrelcvicoshwmi.so.1", fake, 0755);
    }
    host.remove("/proc/self");  // where the loader, too, asks for the place of the program
    const std::string libraries = std::filesystem::path(FRAMEWORK_FILE).parent_path();
    const Finished run = host.run(fromDirectory(
        kStrangers + std::string("/bin"), {"env", "LD_LIBRARY_PATH=" + libraries, CVAGENT_PROGRAM, "tree"}));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err,
                testing::EndsWith("cvagent: cannot tell where this program lies, for there is no /proc; "
                                  "name the plug-in with --plugin FILE\n"));
}
#endif

HOST_TEST(StartingDirectory, IsWhereTheNamesOnTheCommandLineAreMeantFrom) {
    host.file("/home/me/plugin.so", host.read(FAKE_PLUGIN_FILE).value_or(""));
    host.directory("/home/me/logs");
    const Finished run = host.run(fromDirectory(
        "/home/me",
        {"env", "CORVISTA_DATA_DIR=data", "CORVISTA_FAKE_PLUGIN=errors", CVAGENT_PROGRAM, "--host-tools",
         "native", "--plugin", "plugin.so", "--log", "log", "--trace", "logs/../logs/trace", "tree"}));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(host.read("/home/me/log").value_or(""), HasSubstr("first error"));
    EXPECT_THAT(host.read("/home/me/logs/trace").value_or(""), HasSubstr("first error"));
    EXPECT_TRUE(host.exists("/home/me/data/.lock"));
}

HOST_TEST(StartingDirectory, ThatIsGoneIsNeededForRelativeNamesAlone) {
    CvagentRun cvagent(host);
    host.directory("/home/gone");
    const auto fromNowhere = [&](const std::vector<std::string>& words) {
        host.directory("/home/gone");
        return host.run(fromDirectory("/home/gone", cvagent.commandLine(words), "rmdir /home/gone"));
    };
    EXPECT_EQ(fromNowhere({"tree"}).status, 0);
    const Finished run = fromNowhere({"--log", "log", "tree"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("give the whole path of 'log'"));
}

HOST_TEST(CallersEnvironment, ReachesCommandsOnlyAsFarAsTheyNeedIt) {
    SuseHost suse(host);
    tellFromWithin(host, "env");
    const Finished run = host.run(suse.commandLine(
        {"tree"},
        {"LD_LIBRARY_PATH=/home/stranger", "LD_AUDIT=/home/stranger/spy.so", "GREP_OPTIONS=--invert-match",
         "GREP_COLORS=mt=01;31", "POSIXLY_CORRECT=1", "BASH_ENV=/home/stranger/run", "ENV=/home/stranger/run",
         "IFS=/", "CDPATH=/home/stranger", "BASH_FUNC_cat%%=() { touch /var/attacked; }", "LANG=de_DE.UTF-8",
         "LC_MESSAGES=de_DE.UTF-8", "TZ=UTC", "TERM=xterm", "XDG_STATE_HOME=/home/me"}));
    EXPECT_EQ(run.status, 0) << run.err;
    std::set<std::string> names;
    std::istringstream lines(told(host));
    for (std::string line; std::getline(lines, line);) {
        names.insert(line.substr(0, line.find('=')));
    }
    // Shells set the working directory themselves.
    EXPECT_THAT(names, IsSubsetOf({"CVAGENT_COMMAND", "HOME", "LC_ALL", "OLDPWD", "PATH", "PWD", "TERM", "TZ",
                                   "XDG_STATE_HOME", "_"}));
    EXPECT_THAT(told(host), HasSubstr("LC_ALL=C\n"));
    EXPECT_THAT(told(host), HasSubstr("TZ=UTC\n"));
}

HOST_TEST(CallersPath, LeadsRootToNoProgramOfAStranger) {
    SuseHost suse(host);
    const std::string attack = "#!/bin/sh\necho attacked >> /var/attacked\n";
    for (const std::string place : {"/home/stranger", "/home/stranger/bin", "/srv/open/closed/bin"}) {
        for (const std::string tool : {"hostname", "egrep", "brctl"}) {
            host.file(place + "/" + tool, attack, 0755);
        }
    }
    host.directory("/home/stranger/bin", 01777);
    host.directory("/srv/open", 0777);
    tellFromWithin(host, "echo $PATH");
    const std::string path = ":.:bin:/home/stranger/bin:/srv/open/closed/bin:/nowhere:/tools:/usr/bin::";
    const Finished run = host.run(fromDirectory(kStrangers, suse.commandLine({"tree"}, {"PATH=" + path})));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(told(host), "/tools:/usr/bin:/usr/local/sbin:/usr/sbin:/sbin:/bin\n");
    EXPECT_FALSE(host.exists("/var/attacked"));
}

// With the machine's own users, for a fake host has only one. In a child, whose environment nobody misses.
TEST(CallersPathOfUsers, LeadsRootToNoDirectoryOfSomebodyElse) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "needs somebody else";
    }
    const std::string way = "/tmp/cvagent-path-" + std::to_string(getpid());
    std::filesystem::create_directories(way + "/bin");
    ASSERT_EQ(chown(way.c_str(), 65533, 65533), 0);
    // He can have it lead elsewhere when it has been looked at.
    std::filesystem::create_directory_symlink("/usr/lib", way + "/link");
    const auto reduced = [&way] {
        setenv("PATH", (way + "/bin:" + way + ":" + way + "/link:/usr/bin").c_str(), 1);
        cvagent::reduceEnvironment();
        const std::string path = std::getenv("PATH");
        _exit(path == "/usr/lib:/usr/bin:/usr/local/sbin:/usr/sbin:/sbin:/bin" ? 0 : 1);
    };
    EXPECT_EXIT(reduced(), testing::ExitedWithCode(0), "");
    std::filesystem::remove_all(way);
}

HOST_TEST(CallersMask, OpensAndClosesNothing) {
    SuseHost suse(host);
    tellFromWithin(host, "umask");
    for (const std::string mask : {"0", "077"}) {
        const Finished run = host.run(fromDirectory("/", suse.commandLine({"tree"}), "umask " + mask));
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_EQ(told(host), "0022\n") << mask;
    }
}

HOST_TEST(CallersLimits, LeaveNoCoreWithWhatTheProgramKnows) {
    SuseHost suse(host);
    tellFromWithin(host, "ulimit -S -c; ulimit -H -c");
    const Finished run =
        host.run(fromDirectory("/", suse.commandLine({"tree"}), "ulimit -H -c 8 && ulimit -S -c 8"));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(told(host), "0\n8\n") << "a service that a command restarts can raise it again";
}

// A limit of 0 is ignored where the kernel hands cores to a program.
HOST_TEST(CallersLimits, KeepACoreFromAProgramThatCollectsThem) {
    cvagent::prepareSurroundings({});
    rlimit limit{};
    ASSERT_EQ(getrlimit(RLIMIT_CORE, &limit), 0);
    EXPECT_EQ(limit.rlim_cur, std::min<rlim_t>(1, limit.rlim_max));
}

HOST_TEST(CallersLimits, DoNotEndTheProgramInTheMiddleOfAWrite) {
    SuseHost suse(host);
    tellFromWithin(host, "ulimit -S -f; ulimit -S -t");
    const Finished run =
        host.run(fromDirectory("/", suse.commandLine({"tree"}), "ulimit -S -f 8 && ulimit -S -t 1000"));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(told(host), "unlimited\nunlimited\n");
}

// In a child, for a timer of a test would end it.
TEST(CallersTimers, DoNotEndTheProgram) {
    const auto prepared = [] {
        alarm(1000);
        cvagent::prepareSurroundings({});
        _exit(alarm(0) == 0 ? 0 : 1);
    };
    EXPECT_EXIT(prepared(), testing::ExitedWithCode(0), "");
}

// The C library would wait for ever for somebody to write a zone that is a pipe. In a child, whose
// environment nobody misses.
TEST(CallersZone, IsOneOfTheSystem) {
    const auto keeps = [](const std::string& zone) {
        setenv("TZ", zone.c_str(), 1);
        cvagent::reduceEnvironment();
        return std::getenv("TZ") != nullptr;
    };
    const auto reduced = [&keeps] {
        for (const char* zone : {":/etc/localtime", "/usr/share/zoneinfo/Etc/UTC", "Europe/Zurich", "UTC"}) {
            if (!keeps(zone)) {
                _exit(1);
            }
        }
        for (const char* zone : {"/home/x/zone", ":/home/x/zone", "../../../home/x/zone", ":../zone"}) {
            if (keeps(zone)) {
                _exit(2);
            }
        }
        _exit(0);
    };
    EXPECT_EXIT(reduced(), testing::ExitedWithCode(0), "");
}

// As after `exec > >(tee log); exec cvagent watch` in a shell.
HOST_TEST(CallersChildren, AreNoCommandsOfOurs) {
    SuseHost suse(host);
    host.tool("fdisk -ls", hanging());
    const Finished run = host.run(fromDirectory("/", suse.commandLine({"--command-timeout", "0.2", "tree"}),
                                                "{ sleep 999 & } && true"));
    EXPECT_THAT(run.err, HasSubstr("ended after 0.2 s"));
    EXPECT_THAT(run.err, Not(HasSubstr("sleep 999")));
    EXPECT_TRUE(isRunning(host, std::string("sleep\0", 6) + "999"));
    RunningProgram tree =
        host.start(fromDirectory("/", suse.commandLine({"tree"}), "{ sleep 998 & } && true"));
    ASSERT_TRUE(eventually([&] { return isRunning(host, std::string("sleep\0", 6) + "1000"); }));
    tree.signal(SIGTERM);
    EXPECT_EQ(tree.wait().status, 128 + SIGTERM);
    EXPECT_TRUE(isGone(host, std::string("sleep\0", 6) + "1000"));
    EXPECT_TRUE(isRunning(host, std::string("sleep\0", 6) + "998"));
}

HOST_TEST(ClosedDescriptors, NoFileTakesTheirPlace) {
    CvagentRun cvagent(host);
    cvagent.telling("errors");
    const Finished run = host.run(
        fromDirectory("/", cvagent.commandLine({"--log", "/var/log", "tree"}), "exec 0<&- 1>&- 2>&-"));
    EXPECT_EQ(run.status, 1);  // nobody has seen the tree
    EXPECT_EQ(host.read("/opt/vantrel/corvista/data/.lock").value_or("(no file)"), "");
    EXPECT_THAT(host.read("/var/log").value_or(""), HasSubstr("first error"));
    EXPECT_THAT(host.read("/var/log").value_or(""), Not(HasSubstr("computer")));
    EXPECT_THAT(host.read("/var/log").value_or(""), Not(HasSubstr("the plug-in reports")));
}

/// Everything that prints.
const std::vector<std::vector<std::string>> kPrinting = {{"tree"},
                                                         {"tree", "--json"},
                                                         {"get", "computer"},
                                                         {"get", "computer", "--json"},
                                                         {"set", "computer", "OwnerContact", "room 5"},
                                                         {"watch", "--for", "0"},
                                                         {"watch", "--for", "0", "--json"},
                                                         {"properties"},
                                                         {"properties", "--json"},
                                                         {"doctor"},
                                                         {"doctor", "--json"},
                                                         {"--help"},
                                                         {"get", "--help"},
                                                         {"--version"}};

void expectFailedOutput(FakeHost& host, const std::string& before, const std::string& message) {
    for (const std::vector<std::string>& words : kPrinting) {
        const std::vector<std::string> line = CvagentRun(host).telling("early").commandLine(words);
        const Finished run = host.run(fromDirectory("/", line, before));
        const std::string what = words.front() + " " + words.back();
        EXPECT_EQ(run.status, 1) << what;
        if (message.empty()) {
            EXPECT_THAT(run.err, Not(HasSubstr("standard output"))) << what;
        } else {
            EXPECT_THAT(run.err, HasSubstr("cvagent: cannot write to standard output: " + message)) << what;
        }
    }
}

HOST_TEST(StandardOutput, ThatIsClosedIsAFailure) {
    expectFailedOutput(host, "exec 1>&-", "Bad file descriptor");
}

HOST_TEST(StandardOutput, ThatTakesNothingMoreIsAFailure) {
    expectFailedOutput(host, "exec 1>/dev/full", "No space left on device");
}

HOST_TEST(StandardOutput, ThatNobodyReadsAnyMoreNeedsNoMessage) {
    expectFailedOutput(host, "mkfifo /var/fifo; exec 3<>/var/fifo 1>/var/fifo 3>&-; rm /var/fifo", "");
}

}  // namespace
