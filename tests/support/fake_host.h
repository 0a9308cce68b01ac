#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "tests/support/host_test.h"
#include "tests/support/program.h"
#include "tests/support/texts_are.h"

/// What a scripted tool does when it is called.
struct ToolAnswer {
    std::string out;
    int status = 0;
    std::string err = {};
    int delayMilliseconds = 0;
    std::string action = {};  ///< a shell script, run before `out` is printed, with the arguments as $1...
};

/// One attempt to set the clock, which only the recorder has seen.
struct ClockCall {
    std::string function;  ///< settimeofday, clock_settime, adjtime...
    std::int64_t seconds;
    std::int64_t microseconds;
    bool timeZone;  ///< a time-zone argument was given
};

/// The host a test runs on: a root directory, process table, network and host name of its own. Code under
/// test reads its absolute paths (/etc, /proc/net/dev, /tmp...) and runs its shell commands there; nothing
/// reaches the machine.
///
///     HOST_TEST(Gateway, IsTheSecondField) {
///         host.file("/proc/net/dev", "...");
///         host.tool("route -n", "0.0.0.0 10.0.0.1 0.0.0.0 UG 0 0 0 eth0\n");
///         EXPECT_EQ(IC::getIPV4Gateway("eth0"), "10.0.0.1");
///         EXPECT_THAT(host.calls(), TextsAre("route -n"));
///     }
///
/// The host starts with empty /etc, /proc/net, /sys, /tmp, /var, /opt; with the shell and the plain text
/// tools (cat, grep, awk, cut...) in /usr/bin; without any tool that looks at a host or changes one; and with
/// shutdown, reboot, halt, poweroff, service, rpm and hwclock, which are only recorded. No time zone,
/// language or agent setting is inherited. Paths are absolute. What cannot be done throws, which fails the
/// test. One thread sets a host up; reading it (calls, read, exists) is fine from any.
class FakeHost {
public:
    FakeHost();
    ~FakeHost();
    FakeHost(const FakeHost&) = delete;
    FakeHost& operator=(const FakeHost&) = delete;

    // --- Files. Parent directories are created as needed.
    void file(const std::string& path, const std::string& content, mode_t mode = 0644);
    void directory(const std::string& path, mode_t mode = 0755);
    void symlink(const std::string& path, const std::string& target);
    /// Makes another user of the host its owner. False where nobody can: the tests do not run as root.
    [[nodiscard]] bool giveToStranger(const std::string& path);
    void remove(const std::string& path);  ///< a file or a whole directory; fine when there is none
    std::optional<std::string> read(const std::string& path) const;  ///< nothing when it cannot be read
    bool exists(const std::string& path) const;                      ///< a dangling link exists
    /// The names in a directory, sorted; empty when there is none.
    std::vector<std::string> listDirectory(const std::string& path) const;

    /// From here on a write below the path (a file or directory) fails with EROFS.
    void readOnly(const std::string& path);
    /// From here on the directory keeps its files, but a write below it finds no space (ENOSPC).
    void fullDisk(const std::string& path);
    /// Mounts something over a directory; this build and the tests' sources, should they lie below it, stay.
    void mountOver(const std::string& path, const std::function<void()>& mounting);
    /// Ends the last readOnly or fullDisk of the path; what fullDisk let through is gone with it.
    void restore(const std::string& path);

    /// Installs a recorded host: a path, or a name below tests/hosts (see the README there).
    void copyTree(const std::string& recordedHost);

    // --- Tools. A command is the tool's name and its exact arguments, one blank between; a word with a blank
    // in it is written 'in quotes'. "name %any" answers for all arguments that have no answer of their own. A
    // name with a slash ("/usr/sbin/vpdupdate") is a tool called by its path. A tool called with arguments
    // nobody recorded prints nothing, exits with 97 and fails the test at its end.
    void tool(const std::string& command, const std::string& out, int status = 0);
    void tool(const std::string& command, const ToolAnswer& answer);
    /// The first call gets the first answer and so on; further calls get the last one.
    void toolInTurn(const std::string& command, const std::vector<ToolAnswer>& answers);
    void toolMissing(const std::string& name);  ///< as if it were not installed, as most are at the start
    void recordOnly(const std::string& name);   ///< any arguments, prints nothing, status 0
    void realTool(const std::string& name);     ///< the machine's own program, not recorded
    void expectUnrecorded();                    ///< calls without an answer do not fail this test
    std::vector<std::string> unrecorded() const;

    /// The calls of scripted tools in the order they began, written like the commands above.
    std::vector<std::string> calls() const;
    std::vector<std::string> callsOf(const std::string& name) const;
    void clearCalls();

    // --- Clock. Setting it succeeds and changes nothing, here and in programs of this build started with
    // run.
    std::vector<ClockCall> clockCalls() const;
    void clockFails(int error);  ///< setting the clock fails with this errno; 0 ends that

    // --- The rest of the host.
    void setHostName(const std::string& name);  ///< "localhost" at the start
    /// Shows the real sysfs and /proc/net of this host's own network, with the loopback up and nothing else
    /// in it.
    void useKernelNetwork();

    /// Runs a program (found on PATH, no shell) to its end; killed, and the test failed, after the limit.
    Finished run(const std::vector<std::string>& words,
                 std::chrono::seconds limit = std::chrono::seconds(600));
    /// Starts one beside the test.
    RunningProgram start(const std::vector<std::string>& words);

private:
    void answer(const std::string& command, const ToolAnswer& answer, unsigned turn);
    void installTool(const std::string& name);

    bool unrecordedExpected_ = false;
    unsigned programs_ = 0;
    std::vector<int> ballast_;  // open descriptors of the unlinked files that keep disks full
};

/// Where this build and the tests' sources are; both can be read in every fake host.
std::string buildDirectory();
std::string testsDirectory();
