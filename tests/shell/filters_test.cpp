// Every kind of stage that the plug-in's commands use, against the real tools, with input that no host
// prints.
#include <gmock/gmock.h>

#include "agent/shell/filters/filters.h"
#include "tests/shell/both_ways.h"
#include "tests/support/fake_host.h"

namespace {

using both_ways::Complaints;
using both_ways::direct;
using both_ways::inShell;
using both_ways::Ran;

constexpr const char* kStages[] = {
    "cat",
    "grep b",
    "grep ^b",
    "grep 'b$'",
    "grep '^b.$'",
    "grep ''",
    "grep '^'",
    "grep '$'",
    "grep '^$'",
    "grep .",
    "grep a.c",
    "grep -v b",
    "grep -w b",
    "grep -vw 'a b'",
    "grep -w a.c",
    "grep -i 'A B'",
    "grep -iv A",
    "egrep 'b|c c|x'",
    "cut -d ' ' -f1",
    "cut -d ' ' -f3",
    "cut -d: -f2",
    "cut -d '=' -f2",
    "cut -d a -f9",
    "tr -s ' '",
    "tr -s '*' ' '",
    "tr '[A-Z]' '[a-z]'",
    "tr ab c",
    "tr -s abc xy",
    "awk '{print $1}'",
    "awk '{print $5}'",
    "awk '{print $NF}'",
    "md5sum",
    "sha1sum",
};

std::vector<std::string> inputs() {
    using namespace std::string_literals;
    std::string manyLines;
    for (int i = 0; i < 5000; ++i) {
        manyLines += "a b " + std::to_string(i) + (i % 3 == 0 ? ":x=y\n" : " c  c\n");
    }
    return {""s,
            "\n"s,
            "\n\n\n"s,
            "b"s,
            "b\n"s,
            "a b\nb\nab\nba\n b \n_b\nb_\nb-\nA B\nabc\na\n"s,
            "a b c:d=e f\n"s,
            "  lead and  trail  \n \n\t\n\ttab\tbed\t\n"s,
            ":\n::\n=\na:\n:a"s,
            "a\vb c\fd e\rf g\r\n"s,
            "**a  **  b** c\n* *\n"s,
            "\xff\xfe b \x80\n\xc3\xa9 b\n\xe2\x82"s,
            "b\0b\nb\n"s,
            "x\n\0\nb\n"s,
            "x\0"s,
            "\0b"s,
            "a\0c\nabc\0"s,
            "]^_`ABCXYZ[{\\}\n"s,
            std::string(70000, 'b') + "\nb b\n",
            std::string(300, ' ') + "b\n" + std::string(5000, '*'),
            manyLines};
}

HOST_TEST(Filters, PrintWhatTheToolsPrint) {
    setenv("LC_ALL", "C", 1);
    for (const std::string& input : inputs()) {
        host.file("/etc/input", input);
        for (const std::string stage : kStages) {
            const std::string command = "cat /etc/input | " + stage;
            const Ran ours = direct(command, Complaints::seen);
            EXPECT_FALSE(ours.inShell) << command;
            EXPECT_EQ(ours, inShell(command, Complaints::seen)) << command << " of " << input.substr(0, 200);
        }
    }
}

HOST_TEST(Filters, ReadAFileAsTheToolsDo) {
    setenv("LC_ALL", "C", 1);
    for (const std::string& input : inputs()) {
        host.file("/etc/input", input);
        for (const std::string command : {"cat /etc/input", "grep b /etc/input", "grep -v b /etc/input",
                                          "grep ^b /etc/input", "egrep 'b|x' /etc/input"}) {
            const Ran ours = direct(command, Complaints::seen);
            EXPECT_FALSE(ours.inShell) << command;
            EXPECT_EQ(ours, inShell(command, Complaints::seen)) << command << " of " << input.substr(0, 200);
        }
    }
}

HOST_TEST(Filters, LeaveALargeFileToGrepItself) {
    setenv("LC_ALL", "C", 1);
    host.file("/etc/input", "b\n" + std::string(70000, 'a') + '\n' + std::string(1, '\0') + '\n');
    for (const std::string command : {"grep b /etc/input", "egrep 'b|x' /etc/input"}) {
        EXPECT_EQ(direct(command, Complaints::seen), inShell(command, Complaints::seen)) << command;
    }
}

HOST_TEST(Filters, HandALineThatIsTooLongToNobody) {
    setenv("LC_ALL", "C", 1);
    host.file("/etc/input", std::string(20UL << 20U, 'b'));
    EXPECT_EQ(direct("cat /etc/input | grep b", Complaints::seen).out, "");
    EXPECT_EQ(direct("cat /etc/input | grep b", Complaints::seen).status, 2 << 8);
    EXPECT_EQ(direct("cat /etc/input | tr -s b", Complaints::seen).out, "b");
}

/// A file that can be read so far and no further.
class BrokenFile : public cvagent::shell::TextSource {
public:
    using TextSource::TextSource;
    bool failed() const override { return true; }
};

TEST(Filters, GrepTakesNoHalfLineOfAFileThatCannotBeReadOn) {
    using cvagent::shell::Manner;
    const std::vector<std::string> words = {"b"};
    const auto grep = cvagent::shell::makeGrep(words, Manner{});
    grep->readFrom(std::make_unique<BrokenFile>("a\nb\nb and"));
    std::string out;
    while (grep->pull(out)) {
    }
    EXPECT_EQ(out, "b\n");
    EXPECT_EQ(grep->status(), 2);
}

/// Has another program stand for a tool, as on a host that has it as its own.
void install(FakeHost& host, const std::string& tool, const std::string& program) {
    host.toolMissing(tool);
    host.symlink("/usr/bin/" + tool, "/.bin/" + program);
}

void compareAll(FakeHost& host, const std::vector<std::string>& commands) {
    for (const std::string& input : inputs()) {
        // What no other tool has made anything else of is left out, for each line here starts a shell.
        if (input.find_first_of(std::string("\0\t\v_", 4)) == std::string::npos && !input.ends_with('*')) {
            continue;
        }
        host.file("/etc/input", input);
        for (const std::string& command : commands) {
            const Ran ours = direct(command, Complaints::unseen);
            EXPECT_FALSE(ours.inShell) << command;
            EXPECT_EQ(ours, inShell(command, Complaints::unseen))
                << command << " of " << input.substr(0, 200);
        }
    }
}

HOST_TEST(Filters, PrintWhatGawkPrints) {
    if (!host.exists("/.bin/gawk")) {
        GTEST_SKIP() << "gawk is not installed here";
    }
    setenv("LC_ALL", "C", 1);
    const std::vector<std::string> commands = {
        "cat /etc/input | awk '{print $1}'", "cat /etc/input | awk '{print $5}'",
        "cat /etc/input | awk '{print $NF}'", "cat /etc/input | awk '{print $1}' | grep -v b"};
    if (host.exists("/.bin/mawk")) {  // whichever of the two is the host's own
        install(host, "awk", "mawk");
        compareAll(host, commands);
    }
    install(host, "awk", "gawk");
    ASSERT_NE(inShell("awk --version | grep 'GNU Awk'", Complaints::seen).out, "");
    compareAll(host, commands);
    for (const char* variable : {"GAWK_READ_TIMEOUT", "GAWK_PERSIST_FILE", "AWKBUFSIZE"}) {
        setenv(variable, "1", 1);
        EXPECT_TRUE(direct("echo b | awk '{print $1}'", Complaints::unseen).inShell) << variable;
        unsetenv(variable);
    }
}

/// As on a host that has them all from busybox, of the release that the filters know.
bool installBusybox(FakeHost& host) {
    for (const std::string tool :
         {"awk", "cat", "cut", "egrep", "grep", "head", "md5sum", "rm", "sha1sum", "tr"}) {
        install(host, tool, "busybox");
    }
    return inShell("/.bin/busybox | head -n 1", Complaints::unseen)
        .out.starts_with("BusyBox v1.35.0 (Debian");
}

HOST_TEST(Filters, PrintWhatBusyboxPrints) {
    setenv("LC_ALL", "C", 1);
    if (!installBusybox(host)) {
        GTEST_SKIP() << "no busybox is installed here, or another release of it";
    }
    std::vector<std::string> commands = {"cat /etc/input", "grep b /etc/input", "grep -v b /etc/input",
                                         "grep ^b /etc/input", "egrep 'b|x' /etc/input"};
    for (const std::string stage : kStages) {
        commands.push_back("cat /etc/input | " + stage);
    }
    commands.emplace_back("cat /etc/input | cut -d ' ' -f1 | grep -v x | awk '{print $1}' | cat");
    compareAll(host, commands);
}

HOST_TEST(Filters, LeaveToBusyboxWhatItSaysInItsOwnWay) {
    setenv("LC_ALL", "C", 1);
    if (!installBusybox(host)) {
        GTEST_SKIP() << "no busybox is installed here, or another release of it";
    }
    host.file("/etc/input", "b c\n");
    for (const std::string command :
         {"cat /etc/none", "cat /etc/none 2> /dev/null", "cat /etc 2> /dev/null",
          "grep b /etc/none 2> /dev/null", "grep b /etc 2> /dev/null", "rm /etc/none 2> /dev/null",
          "rm -rf /etc/none", "cat /etc/input | grep -P 'b\\nc' 2> /dev/null",
          "cat /etc/input | cut -d ' ' -f1 > /tmp/out; cat /tmp/out",
          "cat /etc/input > /tmp/out; cat /tmp/out", "grep b /etc/input > /tmp/out; rm /tmp/out"}) {
        const Ran theirs = inShell(command, Complaints::seen);
        const Ran ours = direct(command, Complaints::seen);
        EXPECT_TRUE(ours.inShell || ours == theirs) << command;
    }
    host.directory("/var/full");
    host.fullDisk("/var/full");
    EXPECT_TRUE(direct("cat /etc/input | cut -d ' ' -f1 > /var/full/out", Complaints::seen).inShell);
    EXPECT_EQ(direct("cat /etc/input > /var/full/out", Complaints::seen),
              inShell("cat /etc/input > /var/full/out", Complaints::seen));
}

}  // namespace
