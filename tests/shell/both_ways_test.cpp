// The plug-in's command lines, run by the agent's own runner and by a real shell: the same bytes, the same
// end, the same tools called in the same order.
#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <set>

#include "agent/shell/runner.h"
#include "tests/shell/both_ways.h"
#include "tests/support/fake_host.h"

namespace {

namespace fs = std::filesystem;

using both_ways::Complaints;
using both_ways::direct;
using both_ways::inShell;
using both_ways::Ran;

/// What a command left behind.
std::vector<std::optional<std::string>> leftBehind(const FakeHost& host) {
    return {host.read("/tmp/fdisk_tmp"), host.read("/tmp/CVIfconfig.txt"), host.read("/tmp/__tmp")};
}

struct Seen {
    Ran ran;
    std::vector<std::string> calls;
    std::vector<std::optional<std::string>> files;
};

Seen look(FakeHost& host, const std::string& command, Ran (*run)(const std::string&, Complaints),
          Complaints complaints) {
    host.clearCalls();
    const Ran ran = run(command, complaints);
    return {ran, host.calls(), leftBehind(host)};
}

/// The names that the host's ifconfig knows; two are enough.
std::vector<std::string> interfacesOf(const std::string& host) {
    std::set<std::string> names;
    const fs::path answers = fs::path(testsDirectory()) / "hosts" / host / "tools/ifconfig";
    std::error_code none;
    for (const auto& entry : fs::directory_iterator(answers, none)) {
        const std::string name = entry.path().filename();
        if (name.find('%') == std::string::npos && name != "-a") {
            names.insert(name);
        }
    }
    std::vector<std::string> some(names.begin(), names.end());
    some.resize(std::min<std::size_t>(some.size(), 2));
    return some.empty() ? std::vector<std::string>{"eth0"} : some;
}

std::vector<std::string> recordedHosts() {
    std::vector<std::string> found;
    for (const auto& entry : fs::directory_iterator(fs::path(CORVISTA_TESTS_DIR) / "hosts")) {
        if (entry.is_directory()) {
            found.push_back(entry.path().filename());
        }
    }
    std::sort(found.begin(), found.end());
    return found;
}

class CommandsOf : public testing::TestWithParam<std::string> {};

TEST_P(CommandsOf, DoTheSameBothWays) {
    inFakeHost([](FakeHost& host) {
        host.copyTree(GetParam());
        host.expectUnrecorded();
        setenv("LC_ALL", "C", 1);
        for (const std::string& interface : interfacesOf(GetParam())) {
            const auto commands = both_ways::productCommands(interface);
            std::vector<Seen> theirs;
            for (const std::string& command : commands) {
                theirs.push_back(look(host, command, inShell, Complaints::unseen));
            }
            for (std::size_t i = 0; i < commands.size(); ++i) {
                const Seen ours = look(host, commands[i], direct, Complaints::unseen);
                EXPECT_FALSE(ours.ran.inShell) << commands[i];
                EXPECT_EQ(ours.ran, theirs[i].ran) << commands[i];
                EXPECT_EQ(ours.calls, theirs[i].calls) << commands[i];
                EXPECT_EQ(ours.files, theirs[i].files) << commands[i];
            }
        }
    });
}

INSTANTIATE_TEST_SUITE_P(Recorded, CommandsOf, testing::ValuesIn(recordedHosts()), [](const auto& host) {
    std::string name = host.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

struct Row {
    const char* command;
    bool inShell = false;  ///< this one is left to a shell
};

// Lines beside the plug-in's own: what else the grammar takes, and what it must not take.
constexpr Row kRows[] = {
    {"cat /dev/zero | cat | head -c 5", true},
    {"cat /etc/lines | head -c 5", true},
    {"cat /etc/*nes", true},
    {"cat /etc/*nes > /tmp/a", true},
    {"cat /etc/line[s]", true},
    {"cat /etc/*nes | grep o"},
    {"cat /etc/*nes 2> /dev/null | grep o | cut -d o -f1"},
    {"cat /etc/l*n*s '/etc/lines' | grep -v two"},
    {"cat /etc/no* 2> /dev/null | grep o"},
    {"cat /etc/no* | grep o"},
    {"echo '*' | cat"},
    {"tool a; cat /etc/*nes | grep o; tool b"},
    {"cat /etc/*nes | grep o > /tmp/a; cat /tmp/a"},
    {"cat /etc/*nes | grep o > /tmp/no*", true},
    {"cat /etc/?ines | grep o", true},
    {"cat /etc/*nes | grep *", true},
    {"echo /etc/*nes | cat", true},
    {"to* a | cat", true},
    {"nosuchtool * 2> /dev/null | cat", true},
    {"script * | cat"},
    {"cat * `tool two` | cat", true},
    {"cat ~/x", true},
    {"cat '/etc/lines'"},
    {"cat \"/etc/lines\""},
    {"cat /etc/\"li\"nes'' | grep ''two", false},
    {"cat $HOME/lines", true},
    {"cat \"$HOME\"/lines", true},
    {"cat \\/etc/lines", true},
    {"cat /etc/lines && echo yes", true},
    {"cat /etc/lines & wait", true},
    {"cat < /etc/lines", true},
    {"(cat /etc/lines)", true},
    {"{ cat /etc/lines; }", true},
    {"! cat /etc/lines", true},
    {"A=b cat /etc/lines", true},
    {"cat /etc/lines # remark", true},
    {"cat /etc/lines;", true},
    {"; cat /etc/lines", true},
    {"", true},
    {" ", true},
    {"|", true},
    {"cat /etc/lines |", true},
    {"cat /etc/lines\ncat /etc/lines", true},
    {"cat /etc/lines | grep \"tw", true},
    {"cat /etc/lines > relative", true},
    {"cat /etc/lines > /tmp/a > /tmp/b", true},
    {"cat /etc/lines > /tmp/a | cat", true},
    {"cat /etc/lines 2> /tmp/errors", true},
    {"cat /etc/lines 2>> /dev/null", true},
    {"cat /etc/lines 3> /dev/null", true},
    {"cat /etc/lines 1> /tmp/a", true},
    {"cat /etc/lines 2>&1", true},
    {"cat /etc/lines>/tmp/a; cat /tmp/a"},
    {"cat /etc/lines >>/tmp/a; cat /etc/lines >>/tmp/a; cat /tmp/a; rm /tmp/a"},
    {"cat /etc/none 2>/dev/null"},
    {"cat /etc/none", true},
    {"cat /etc/none 2>/dev/null; cat /etc/lines"},
    {"cat /etc/none; cat /etc/lines", true},
    {"cat /etc/lines; cat /etc/none"},
    {"grep one /etc/none 2> /dev/null"},
    {"grep one /etc/lines; grep four /etc/lines"},
    {"cat /etc", true},
    {"cat /etc 2> /dev/null"},
    {"grep x /etc 2> /dev/null"},
    {"grep x /proc/net/ 2> /dev/null"},
    {"cat /dev/null", true},
    {"cat /etc/lines /etc/lines"},
    {"cat -n /etc/lines"},
    {"cat -"},
    {"cd /etc; cat /etc/lines", true},
    {"test -f /etc/lines", true},
    {"exit 3", true},
    {"true", true},
    {"printf x", true},
    {"echo one two  three"},
    {"echo 'one  two' \"three\""},
    {"echo -n one", true},
    {"echo 'a\\nb'", true},
    {"echo \"a\\nb\"", true},
    {"echo ab | grep \"a\\\"b\"", true},
    {"echo ab | grep \"a\\\\\"", true},
    {"echo ab | tr -s \"!\""},
    {"echo"},
    {"echo \"\" | cat"},
    {"echo a=b | cut -d= -f2"},
    {"echo a:b:c | cut -d : -f 3"},
    {"echo a:b:c | cut -d : -f 2-3", true},
    {"echo a:b:c | cut -d : -f 1,3", true},
    {"echo a:b:c | cut -c 2", true},
    {"echo a:b:c | cut -d : -f 0", true},
    {"echo abc | tr -d b", true},
    {"echo abc | tr b", true},
    {"echo abc | tr '[:lower:]' '[:upper:]'", true},
    {"echo 'a-b' | tr - +", true},
    {"echo 'a-b' | tr a-c x"},
    {"echo 'aabbcc' | tr -s ab"},
    {"echo 'aabbcc' | tr -s ab xx"},
    {"echo 'aabbcc' | tr c-a x", true},
    {"echo 'one two' | awk '{print $2}'"},
    {"echo 'one two' | awk '{print $NF}'"},
    {"echo 'one two' | awk '{print $0}'", true},
    {"echo 'one two' | awk '{print $1, $2}'", true},
    {"echo 'one two' | grep -c one", true},
    {"echo 'one two' | grep -e one", true},
    {"echo 'one two' | grep -w tw"},
    {"echo 'one two' | grep -viw ONE"},
    {"echo 'one two' | grep 'o.*o'", true},
    {"echo 'one two' | grep 't.o$'"},
    {"echo 'one two' | grep", true},
    {"echo 'one two' | grep -P 'one\\n'", true},
    {"echo 'one two' | grep -P 'one\\n' 2> /dev/null"},
    {"echo 'one two' | grep -P 'one\\ntwo\\n' 2> /dev/null | cat"},
    {"echo 'one two' | grep -P 'one|\\n' 2> /dev/null", true},
    {"echo 'one two' | grep -P 'one\\n*' 2> /dev/null", true},
    {"echo 'one two' | egrep 'x|two'"},
    {"echo 'one two' | egrep 'x|t+wo'", true},
    {"echo x | md5sum"},
    {"echo x | sha1sum"},
    {"echo x | md5sum -b", true},
    {"sha1sum /etc/lines"},
    {"tool a"},
    {"tool a | cat"},
    {"tool b"},
    {"tool b | cat"},
    {"tool a; tool b; tool a"},
    {"tool a > /tmp/a; cat /tmp/a"},
    {"tool c"},
    {"tool c 2> /dev/null"},
    {"tool a > /nosuch/file", true},
    {"tool a > /etc", true},
    {"tool a; tool a > /etc; tool a"},
    {"nosuchtool", true},
    {"nosuchtool 2> /dev/null"},
    {"nosuchtool 2> /dev/null | cat"},
    {"tool a; nosuchtool; tool a"},
    {"/tools/tool a"},
    {"/etc/lines", true},
    {"/etc/lines 2> /dev/null", true},
    {"/nosuch/tool 2> /dev/null"},
    {"script", true},
    {"script | cat", true},
    {"tool a; script; tool a"},
    {"killed"},
    {"killed | cat"},
    {"killed; tool a"},
    {"tool a; killed"},
    {"cat /etc/li`tool word` | grep o"},
    {"cat /etc/li`tool word`", false},
    {"cat /etc/li`tool none` | grep o", false},
    {"cat /etc/li`tool pattern` | grep two"},
    {"cat `tool two` | grep two"},
    {"cat '/etc/a b'`tool word`", true},
    {"cat /proc/self/comm"},
    {"grep a /proc/thread-self/comm"},
    {"echo x > /tmp/a", true},
    {"echo x;-n"},
    {"tool nul | cut -d : -f 1 | grep -v x"},
    {"tool nul | tr a b | grep -v x | cat"},
    {"tool nul | awk '{print $1}' | grep -v x"},
    {"echo x y | awk '{print $1}' > /tmp/a", true},
    {"cat /etc/lines > /tmp/a; cat /tmp/a >> /tmp/a"},
    {"cat /etc/lines > /tmp/a; cat /tmp/a | cat > /tmp/a"},
    {"cat /etc/lines > /tmp/a; grep o /tmp/a > /tmp/a"},
    {"echo `tool two` x"},
    {"echo `tool a; tool a`", true},
    {"echo `tool a` `tool b`", true},
    {"tool a | tool b", true},
    {"tool a | grep `tool b`", true},
    {"\xc3\xa9", true},
    {"echo \xc3\xa9\xff | cut -d ' ' -f1"},
    {"rm /etc/none 2> /dev/null"},
    {"rm /etc/none", true},
    {"rm -rf /etc/none"},
    {"rm /etc 2> /dev/null", true},
    {"rm -f /etc/none"},
};

HOST_TEST(Rows, DoTheSameBothWays) {
    setenv("LC_ALL", "C", 1);
    host.file("/etc/lines", "one\ntwo\nthree\n");
    host.tool("tool a", "from a\n");
    host.tool("tool b", "from b\n", 3);
    host.tool("tool c", {.out = "out\n", .status = 1, .err = "err\n"});
    host.tool("tool word", "nes\n\n");
    host.tool("tool none", "");
    host.tool("tool pattern", "n*s\n");
    host.tool("tool nul", std::string("one\ntwo\n\0x", 10));
    host.tool("tool two", " /etc/lines\n/etc/lines ");
    host.file("/tools/script", "echo from a script\nexit 7\n", 0755);
    host.file("/tools/killed", "#!/bin/sh\nkill -9 $$\n", 0755);
    for (const Row& row : kRows) {
        const Seen ours = look(host, row.command, direct, Complaints::seen);
        EXPECT_EQ(ours.ran.inShell, row.inShell) << row.command;
        if (!ours.ran.inShell) {
            host.remove("/tmp/a");
            const Seen theirs = look(host, row.command, inShell, Complaints::seen);
            Ran expected = theirs.ran;
            // Of a tool that a signal has ended a shell tells on standard error.
            if (expected.err == "Killed\n") {
                expected.err.clear();
            }
            EXPECT_EQ(ours.ran, expected) << row.command;
            EXPECT_EQ(ours.calls, theirs.calls) << row.command;
        } else {
            EXPECT_THAT(ours.calls, testing::IsEmpty()) << row.command;
        }
        host.remove("/tmp/a");
    }
}

}  // namespace
