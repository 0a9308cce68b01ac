// What a runner that only looks like a shell gets wrong.
#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <thread>

#include "agent/shell/child.h"
#include "agent/shell/runner.h"
#include "agent/shell/starts.h"
#include "tests/shell/both_ways.h"
#include "tests/support/fake_host.h"

namespace {

using both_ways::Complaints;
using both_ways::direct;
using both_ways::inShell;
using cvagent::shell::closeCommand;
using cvagent::shell::openCommand;
using cvagent::shell::openInShell;

/// The error that the system has for whoever wants a process; 0 for none.
std::atomic<int> spawnFails = 0;
/// Seconds by which the clock is ahead of the file systems' one.
std::atomic<time_t> clockIsAhead = 0;

/// A command line that is known to be run without a shell.
class Running {
public:
    explicit Running(const char* command) : stream_(openCommand(command).value()) {}
    Running(const Running&) = delete;
    Running& operator=(const Running&) = delete;
    ~Running() {
        if (stream_ != nullptr) {
            end();
        }
    }

    std::string line() {
        char text[512] = "";
        return fgets(text, sizeof text, stream_) != nullptr ? text : "";
    }
    int end() { return closeCommand(std::exchange(stream_, nullptr)).value(); }

private:
    FILE* stream_;
};

void inC() {
    setenv("LC_ALL", "C", 1);
}

std::vector<pid_t> childrenOfThisThread() {
    std::ifstream in("/proc/self/task/" + std::to_string(gettid()) + "/children");
    return {std::istream_iterator<pid_t>(in), {}};
}

void waitFor(const std::function<bool()>& condition) {
    for (int i = 0; i < 10000 && !condition(); ++i) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    EXPECT_TRUE(condition());
}

/// As when a tool leaves a process behind that keeps its pipe open.
HOST_TEST(Traps, WhatIsCutOffIsReadNoFurther) {
    inC();
    host.tool("leaver", ToolAnswer{.out = "half\n", .action = "sleep 1000 &"});
    Running command("leaver | cat");
    EXPECT_EQ(command.line(), "half\n");
    const std::vector<pid_t> read = cvagent::shell::readBy(gettid());
    ASSERT_EQ(read.size(), 1);
    std::thread other([process = read.front()] {
        EXPECT_TRUE(cvagent::shell::cutOff(process));
        EXPECT_FALSE(cvagent::shell::cutOff(process));
    });
    EXPECT_EQ(command.line(), "");
    other.join();
    EXPECT_EQ(command.end(), SIGKILL);
    EXPECT_THAT(cvagent::shell::readBy(gettid()), testing::IsEmpty());
}

// A command with a variable is a shell's, which becomes its one tool.
HOST_TEST(Traps, WhatAShellHasLeftBehindIsCutOffToo) {
    inC();
    host.tool("leaver", ToolAnswer{.out = "half\n", .action = "sleep 1000 &"});
    ASSERT_FALSE(openCommand("leaver $NONE"));
    FILE* const stream = openInShell("leaver $NONE");
    char text[512] = "";
    EXPECT_STREQ(fgets(text, sizeof text, stream), "half\n");
    const std::vector<pid_t> read = cvagent::shell::readBy(gettid());
    ASSERT_EQ(read.size(), 1);
    EXPECT_EQ(cvagent::shell::commandOf(read.front()), "leaver $NONE");
    std::thread other([process = read.front()] { EXPECT_TRUE(cvagent::shell::cutOff(process)); });
    EXPECT_EQ(fgets(text, sizeof text, stream), nullptr);
    other.join();
    EXPECT_EQ(closeCommand(stream), SIGKILL);
}

HOST_TEST(Traps, WhatIsLeftToAShellEndsAsItDoesUnderPopen) {
    inC();
    for (const char* const command :
         {"exit 7", "kill -TERM $$", "kill -KILL $$", "none 2> /dev/null", "echo a; echo b >&2; exit 3",
          "echo \"$0 $#\"", "(exit 9)", "sh -c 'kill -9 $$'; exit 5", ""}) {
        const both_ways::Ran expected = inShell(command, Complaints::seen);
        FILE* const stream = openInShell(command);
        std::string out;
        for (char text[512] = ""; fgets(text, sizeof text, stream) != nullptr;) {
            out += text;
        }
        EXPECT_EQ(out, expected.out) << command;
        EXPECT_EQ(closeCommand(stream), expected.status) << command;
    }
}

HOST_TEST(Traps, AShellForWhichThereIsNoProcessIsNone) {
    inC();
    spawnFails = EAGAIN;
    const unsigned long before = cvagent::shell::notStarted().count;
    EXPECT_EQ(openInShell("exit 0"), nullptr);
    EXPECT_EQ(errno, EAGAIN);
    EXPECT_EQ(cvagent::shell::notStarted().count, before + 1);
    spawnFails = 0;
}

HOST_TEST(Traps, AScriptedToolIsRun) {
    inC();
    host.tool("grep b", "scripted\n");
    host.file("/etc/lines", "a\nb\n");
    EXPECT_TRUE(direct("cat /etc/lines | grep b", Complaints::seen).inShell);
    EXPECT_EQ(direct("grep b", Complaints::seen).out, "scripted\n");
    EXPECT_THAT(host.calls(), TextsAre("grep b"));
}

HOST_TEST(Traps, AToolThatWasCopiedElsewhereIsNotTheSystems) {
    inC();
    host.directory("/opt/bin");
    std::filesystem::copy_file("/usr/bin/grep", "/opt/bin/grep");
    const std::string before = std::getenv("PATH");
    setenv("PATH", ("/opt/bin:" + before).c_str(), 1);
    EXPECT_TRUE(direct("echo b | grep b", Complaints::seen).inShell);
    setenv("PATH", before.c_str(), 1);
    EXPECT_FALSE(direct("echo b | grep b", Complaints::seen).inShell);
}

HOST_TEST(Traps, AMissingToolIsMissing) {
    inC();
    setenv("PATH", "/tools", 1);
    EXPECT_TRUE(direct("echo b | grep b", Complaints::unseen).inShell);
    EXPECT_EQ(direct("cat /etc/hosts 2> /dev/null", Complaints::seen).status, 127 << 8);
    setenv("PATH", ".:/usr/bin", 1);
    EXPECT_TRUE(direct("cat /etc/hosts 2> /dev/null", Complaints::seen).inShell);
}

HOST_TEST(Traps, WhatChangesTheToolsIsLeftToThem) {
    for (const char* variable : {"LC_ALL", "LC_CTYPE", "LC_COLLATE", "LC_MESSAGES", "LANG"}) {
        unsetenv("LC_ALL");
        EXPECT_FALSE(direct("echo b | grep b", Complaints::seen).inShell) << variable;
        setenv(variable, "de_DE.UTF-8", 1);
        EXPECT_TRUE(direct("echo b | grep b", Complaints::seen).inShell) << variable;
        unsetenv(variable);
    }
    setenv("LANG", "de_DE.UTF-8", 1);
    inC();
    EXPECT_FALSE(direct("echo b | grep b", Complaints::seen).inShell);
    setenv("POSIXLY_CORRECT", "1", 1);
    EXPECT_TRUE(direct("echo b | grep b", Complaints::seen).inShell);
}

HOST_TEST(Traps, TheFirstToolIsStartedAtOnceAndNotWaitedFor) {
    inC();
    host.tool(
        "slow",
        ToolAnswer{.out = "done\n", .status = 0, .action = "until [ -e /tmp/go ]; do sleep 0.01; done"});
    Running running("slow | cat");
    waitFor([&] { return !host.calls().empty(); });
    host.file("/tmp/go", "");
    EXPECT_EQ(running.line(), "done\n");
    EXPECT_EQ(running.end(), 0);
}

HOST_TEST(Traps, ToolsStartOneAfterTheOther) {
    inC();
    host.tool("first",
              ToolAnswer{.out = "1\n", .status = 0, .action = "until [ -e /tmp/go ]; do sleep 0.01; done"});
    host.tool("second", "2\n");
    Running running("first; second | cat");
    waitFor([&] { return !host.calls().empty(); });
    EXPECT_THAT(host.calls(), TextsAre("first"));
    host.file("/tmp/go", "");
    EXPECT_EQ(running.line(), "1\n");
    EXPECT_EQ(running.line(), "2\n");
    EXPECT_EQ(running.end(), 0);
    EXPECT_THAT(host.calls(), TextsAre("first", "second"));
}

HOST_TEST(Traps, OutputWithoutEndEndsWhenNobodyReads) {
    inC();
    for (const char* command : {"yes", "yes | cat", "yes | tr y z", "yes | grep y | cut -d y -f2"}) {
        Running running(command);
        EXPECT_NE(running.line(), "");
        const int status = running.end();
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 128 + SIGPIPE) << command;
    }
    EXPECT_EQ(inShell("cat /dev/zero | cat | head -c 5", Complaints::seen).status, 0);
}

HOST_TEST(Traps, AGigabyteDoesNotPileUp) {
    inC();
    const auto peak = [] {
        rusage usage{};
        getrusage(RUSAGE_SELF, &usage);
        return usage.ru_maxrss;
    };
    Running running("yes | grep y | cut -d ' ' -f1 | tr y z");
    running.line();
    const long before = peak();
    for (int i = 0; i < 2000000; ++i) {
        ASSERT_EQ(running.line(), "z\n");
    }
    EXPECT_LT(peak() - before, 4096) << "KiB";
}

HOST_TEST(Traps, WhatFollowsIsDoneAlsoWhenNobodyReads) {
    inC();
    host.tool("tool", "some\n");
    host.file("/tmp/gone", "");
    Running running("tool; tool | cat; rm /tmp/gone");
    EXPECT_EQ(running.end(), 0);
    EXPECT_FALSE(host.exists("/tmp/gone"));
    EXPECT_THAT(host.calls(), TextsAre("tool", "tool"));
}

HOST_TEST(Traps, AKilledCommandEndsAsAKilledShell) {
    inC();
    host.tool("tool", "");
    for (const char* command : {"sleep 100", "sleep 100 | cat; tool", "cat `sleep 100` | cat; tool"}) {
        Running running(command);
        const auto children = childrenOfThisThread();
        ASSERT_EQ(children.size(), 1U) << command;
        EXPECT_EQ(cvagent::shell::commandOf(children.front()), command);
        cvagent::shell::noteKill(children.front());
        kill(children.front(), SIGKILL);
        EXPECT_EQ(running.line(), "");
        const int status = running.end();
        EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << command;
    }
    EXPECT_THAT(host.calls(), testing::IsEmpty());
    EXPECT_EQ(cvagent::shell::commandOf(getpid()), "");
}

HOST_TEST(Traps, AToolThatSomebodyElseKillsIsNoKilledCommand) {
    inC();
    host.tool("tool", "after\n");
    Running running("sleep 100; tool");
    kill(childrenOfThisThread().at(0), SIGKILL);
    EXPECT_EQ(running.line(), "after\n");
    EXPECT_EQ(running.end(), 0);
}

HOST_TEST(Traps, NothingIsOpenedThatCanHang) {
    inC();
    ASSERT_EQ(mkfifo("/tmp/fifo", 0600), 0);
    host.symlink("/tmp/link", "/tmp/fifo");
    host.symlink("/tmp/away", "/proc/version");
    for (const char* command :
         {"cat /tmp/fifo 2> /dev/null", "cat /tmp/link 2> /dev/null", "cat /dev/zero | cat",
          "grep x /dev/tty 2> /dev/null", "cat /etc/lines > /tmp/fifo", "cat /.proc/kmsg 2> /dev/null"}) {
        EXPECT_FALSE(openCommand(command).has_value()) << command;
    }
}

HOST_TEST(Traps, WhoReadsAPipeSeesNoneThatComesAndGoes) {
    inC();
    host.file("/etc/lines", "some\n");
    ASSERT_EQ(mkfifo("/tmp/fifo", 0600), 0);
    const int reader = open("/tmp/fifo", O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    EXPECT_FALSE(openCommand("cat /etc/lines > /tmp/fifo").has_value());
    pollfd asked{reader, POLLIN, 0};
    EXPECT_EQ(poll(&asked, 1, 0), 0) << "its writer has gone";
    close(reader);
}

HOST_TEST(Traps, AFileThatCannotBeReadIsToldAsTheToolsTellIt) {
    inC();
    const std::string file = "/.proc/" + std::to_string(getpid()) + "/mem";  // EIO at its begin
    for (const std::string& command : {"cat " + file, "grep x " + file, "grep -v x " + file,
                                       "cat " + file + " 2> /dev/null | grep x", "egrep 'a|b' " + file}) {
        const auto ours = direct(command, Complaints::seen);
        EXPECT_FALSE(ours.inShell) << command;
        EXPECT_EQ(ours, inShell(command, Complaints::seen)) << command;
    }
}

HOST_TEST(Traps, WithoutProcessesThereIsNoCommand) {
    inC();
    host.file("/etc/lines", "some\n");
    const auto before = cvagent::shell::notStarted().count;
    spawnFails = EAGAIN;
    for (const char* command : {"seq 3", "seq 3 | cat", "cat `seq 3` | cat", "cat /etc/li* | cat"}) {
        errno = 0;
        EXPECT_EQ(openCommand(command), std::optional<FILE*>(nullptr)) << command;
        EXPECT_EQ(errno, EAGAIN) << command;
    }
    EXPECT_EQ(cvagent::shell::runCommand("seq 3"), -1);
    EXPECT_EQ(cvagent::shell::notStarted().count, before + 5);
    EXPECT_EQ(Running("cat /etc/lines | grep o").line(), "some\n");
    {
        Running running("cat /etc/lines; seq 3; cat /etc/lines");
        EXPECT_EQ(running.line(), "some\n");
        EXPECT_EQ(running.line(), "");
        EXPECT_EQ(running.end(), 2 << 8);
    }
    spawnFails = 0;
    EXPECT_EQ(Running("seq 3").line(), "1\n");
}

HOST_TEST(Traps, AHugeFileIsReadByWhatCanBeKilled) {
    inC();
    host.file("/etc/huge", "");
    std::filesystem::resize_file("/etc/huge", 1ULL << 40U);
    for (const char* command : {"cat /etc/huge | grep x", "grep x /etc/huge"}) {
        Running running(command);
        const auto children = childrenOfThisThread();
        ASSERT_EQ(children.size(), 1U) << command;
        kill(children.front(), SIGKILL);
        EXPECT_EQ(running.line(), "") << command;
    }
}

HOST_TEST(Traps, AFileThatGrowsWhileItIsReadComesToAnEnd) {
    inC();
    host.file("/etc/grows", "");
    FILE* const stream = openCommand("cat /etc/grows").value();
    constexpr std::size_t kSize = 256UL << 20U;
    std::filesystem::resize_file("/etc/grows", kSize);
    std::vector<char> buffer(1UL << 20U);
    std::size_t read = 0;
    for (std::size_t got = 0; (got = fread(buffer.data(), 1, buffer.size(), stream)) > 0;) {
        read += got;
    }
    EXPECT_LT(read, kSize);
    EXPECT_EQ(closeCommand(stream), 1 << 8);
}

HOST_TEST(Traps, AKillOfLongAgoIsNotAnotherProcesses) {
    inC();
    bool met = false;
    for (int attempt = 0; attempt < 20 && !met; ++attempt) {
        pid_t last = 0;
        {
            const Running running("sleep 0");
            last = childrenOfThisThread().at(0);
        }
        for (pid_t next = last + 1; next < last + 40; ++next) {
            cvagent::shell::noteKill(next);
        }
        Running running("sleep 100");
        const pid_t process = childrenOfThisThread().at(0);
        met = process > last && process < last + 40;
        kill(process, SIGKILL);
        EXPECT_EQ(running.end(), (128 + SIGKILL) << 8);
    }
    EXPECT_TRUE(met);
}

// UndefinedBehaviorSanitizer looks at an object through a pipe.
#if !defined(__SANITIZE_ADDRESS__)
HOST_TEST(Traps, WantOfDescriptorsIsOverWhenThereAreSomeAgain) {
    inC();
    host.file("/etc/lines", "b\n");
    rlimit before{};
    getrlimit(RLIMIT_NOFILE, &before);
    for (rlim_t most = 3; most < 16; ++most) {
        const rlimit few{most, before.rlim_max};
        setrlimit(RLIMIT_NOFILE, &few);
        const auto stream = openCommand("cat /etc/lines | grep b");
        if (stream && *stream != nullptr) {
            closeCommand(*stream);
        }
    }
    setrlimit(RLIMIT_NOFILE, &before);
    EXPECT_EQ(Running("cat /etc/lines | grep b").line(), "b\n");
}
#endif

/// As long ago as a change must be to be told from one that follows.
void madeLongAgo(const std::string& directory) {
    std::filesystem::last_write_time(directory,
                                     std::filesystem::file_time_type::clock::now() - std::chrono::hours(1));
}

HOST_TEST(Traps, AToolThatAppearsIsSeenAtOnce) {
    inC();
    host.directory("/opt/bin");
    host.symlink("/opt/bin/cut", "/opt/later");
    host.directory("/opt/empty");
    host.symlink("/opt/way", "/opt/empty");
    host.file("/opt/other/grep", "#!/bin/sh\necho scripted\n", 0755);
    const std::string before = std::getenv("PATH");
    setenv("PATH", ("/opt/bin:" + before).c_str(), 1);
    // What has just changed is looked at each time; and when that was cannot be set.
    clockIsAhead = 3;
    for (int turn = 0; turn < 2; ++turn) {
        EXPECT_FALSE(direct("echo b:c | grep b | cut -d : -f1", Complaints::seen).inShell);
    }
    host.file("/opt/later", "#!/bin/sh\necho linked\n", 0755);
    EXPECT_EQ(inShell("echo b:c | cut -d : -f1", Complaints::seen).out, "linked\n");
    EXPECT_TRUE(direct("echo b:c | cut -d : -f1", Complaints::seen).inShell);
    host.file("/opt/bin/grep", "#!/bin/sh\necho scripted\n", 0755);
    EXPECT_TRUE(direct("echo b | grep b", Complaints::seen).inShell);
    host.remove("/opt/bin/grep");
    EXPECT_FALSE(direct("echo b | grep b", Complaints::seen).inShell);
    setenv("PATH", ("/opt/way:" + before).c_str(), 1);
    EXPECT_FALSE(direct("echo b | grep b", Complaints::seen).inShell);
    host.remove("/opt/way");
    host.symlink("/opt/way", "/opt/other");
    EXPECT_TRUE(direct("echo b | grep b", Complaints::seen).inShell);
    setenv("PATH", ("/opt/bin:" + before).c_str(), 1);
    host.file("/opt/bin/grep", "#!/bin/sh\necho scripted\n", 0755);
    madeLongAgo("/opt/bin");
    EXPECT_TRUE(direct("echo b | grep b", Complaints::seen).inShell);
}

HOST_TEST(Traps, AFileLimitEndsNobodyButTheTool) {
    inC();
    host.file("/etc/lines", "some\n");
    const rlimit none{1, RLIM_INFINITY};
    setrlimit(RLIMIT_FSIZE, &none);
    EXPECT_FALSE(openCommand("cat /etc/lines > /tmp/out").has_value());
}

HOST_TEST(Traps, AFullDiskIsToldAsTheToolsTellIt) {
    inC();
    host.file("/etc/lines", std::string(100000, 'b') + "\nb\n");
    host.directory("/var/full");
    host.fullDisk("/var/full");
    for (const char* command :
         {"cat /etc/lines | grep b > /var/full/out", "egrep 'a|b' /etc/lines > /var/full/out",
          "cat /etc/lines | cut -d a -f1 > /var/full/out"}) {
        const auto ours = direct(command, Complaints::unseen);
        EXPECT_FALSE(ours.inShell);
        EXPECT_EQ(ours, inShell(command, Complaints::unseen)) << command;
    }
}

HOST_TEST(Traps, DescriptorsAreNotLeftBehindNorHandedOn) {
    inC();
    const auto open = [] {
        const std::filesystem::directory_iterator all("/proc/self/fd");
        return std::distance(begin(all), end(all));
    };
    direct("seq 3 > /tmp/out", Complaints::seen);
    const auto before = open();
    const std::string handedOn = direct("ls /proc/self/fd", Complaints::seen).out;
    {
        const Running outer("sleep 0.01 | cat");
        const Running file("cat /tmp/out");
        EXPECT_EQ(direct("ls /proc/self/fd", Complaints::seen).out, handedOn);
    }
    direct("echo x | cat; sleep 0 > /tmp/out; cat /tmp/out", Complaints::seen);
    EXPECT_EQ(open(), before);
    close(STDIN_FILENO);
    close(STDOUT_FILENO);
    EXPECT_EQ(Running("seq 1").line(), "1\n");
}

HOST_TEST(Traps, ManyThreadsRunCommandsSideBySide) {
    inC();
    host.file("/etc/lines", "one\ntwo\n");
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([] {
            for (int turn = 0; turn < 20; ++turn) {
                EXPECT_EQ(Running("cat /etc/lines | grep two").line(), "two\n");
                EXPECT_EQ(Running("seq 3 | grep 3; echo x").line(), "3\n");
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

}  // namespace

// Stands in front of the C library's for the runner in this program.
extern "C" __attribute__((visibility("default"))) int posix_spawn(pid_t* process, const char* path,
                                                                  const posix_spawn_file_actions_t* actions,
                                                                  const posix_spawnattr_t* attributes,
                                                                  char* const words[],
                                                                  char* const variables[]) {
    using Spawn = int (*)(pid_t*, const char*, const posix_spawn_file_actions_t*, const posix_spawnattr_t*,
                          char* const[], char* const[]);
    static const auto next = reinterpret_cast<Spawn>(dlsym(RTLD_NEXT, "posix_spawn"));
    const int error = spawnFails;
    return error != 0 ? error : next(process, path, actions, attributes, words, variables);
}

extern "C" __attribute__((visibility("default"))) int clock_gettime(clockid_t clock, timespec* now) noexcept {
    static const auto next =
        reinterpret_cast<int (*)(clockid_t, timespec*)>(dlsym(RTLD_NEXT, "clock_gettime"));
    const int result = next(clock, now);
    now->tv_sec += clock == CLOCK_REALTIME && result == 0 ? clockIsAhead.load() : 0;
    return result;
}
