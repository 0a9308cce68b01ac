#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/resource.h>

#include "hosttools/applet.h"
#include "tests/hosttools/host_tree.h"
#include "tests/hosttools/network_namespace.h"
#include "tests/hosttools/process.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;

TEST(FdiskTool, ListsThisHostWithoutTouchingIt) {
    const Outcome all = run({adapter("fdisk"), "-ls"});
    EXPECT_EQ(all.status, 0);
    EXPECT_EQ(run({adapter("fdisk"), "-l"}).output, all.output);
    EXPECT_EQ(run({adapter("fdisk"), "-l", "-u"}).output, all.output);
}

TEST(FdiskTool, RefusesWhatIsNotAListing) {
    const std::vector<Words> refused = {{},    {"-s", "/dev/sda1"}, {"/dev/sda"}, {"-d"}, {"-lx"},
                                        {"-"}, {"--list"}};
    for (const Words& words : refused) {
        Words command = {"env", "HOSTTOOLS_HANDED_OVER=already", adapter("fdisk")};
        command.insert(command.end(), words.begin(), words.end());
        const Outcome outcome = run(command);
        EXPECT_EQ(outcome.status, 1) << testing::PrintToString(words);
        EXPECT_THAT(outcome.output, IsEmpty());
        EXPECT_THAT(outcome.errors,
                    HasSubstr("fdisk: not done here: '" + (words.empty() ? "" : words.front()) + "'"));
    }
}

TEST(FdiskTool, ADiskThatIsNotThere) {
    const Outcome outcome = run({adapter("fdisk"), "-l", "/dev/sdnone"});
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, IsEmpty());
    EXPECT_EQ(outcome.errors, "fdisk: /dev/sdnone is not a disk of this host\n");
}

TEST(FdiskTool, ListsTheDisksThatAreNamedInTheirOrder) {
    if (!canUnshare()) GTEST_SKIP() << "namespaces are not available";
    HostTree tree("many");
    tree.addBytes("dev/sda", "");
    tree.addBytes("run/lock/none", "");
    tree.addBytes("dev/null", "");
    const auto onTheTree = [&] {
        enterPrivate(
            {{"/sys", tree.root() + "/sys"}, {"/run", tree.root() + "/run"}, {"/dev", tree.root() + "/dev"}});
    };
    const Outcome outcome = run({adapter("fdisk"), "-l", "/dev/sdb", "/dev/sdnone", "/dev/sda"}, onTheTree);
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.errors, HasSubstr("fdisk: /dev/sdnone is not a disk of this host\n"));
    const std::size_t second = outcome.output.find("Disk /dev/sdb");
    ASSERT_NE(second, std::string::npos) << outcome.output;
    EXPECT_GT(outcome.output.find("Disk /dev/sda:"), second);
    EXPECT_EQ(outcome.output.find("Disk /dev/sdz"), std::string::npos);
    EXPECT_EQ(run({adapter("fdisk"), "-l", "/dev/sdb"}, onTheTree).status, 0);
}

/// While it lives, the process can open nothing.
class NothingToOpen {
public:
    NothingToOpen() {
        getrlimit(RLIMIT_NOFILE, &before_);
        const rlimit none{0, before_.rlim_max};
        setrlimit(RLIMIT_NOFILE, &none);
    }
    NothingToOpen(const NothingToOpen&) = delete;
    NothingToOpen& operator=(const NothingToOpen&) = delete;
    ~NothingToOpen() { setrlimit(RLIMIT_NOFILE, &before_); }

private:
    rlimit before_{};
};

std::string complaintOf(const char* tool, const std::vector<const char*>& words) {
    hosttools::Host host;
    hosttools::Answer answer;
    const NothingToOpen none;
    EXPECT_EQ(hosttools::findApplet(tool)->run(words, host, answer), 1);
    EXPECT_EQ(answer.out.str(), "");
    return answer.errors.str();
}

TEST(Tools, SayWhyTheyCannotAskTheKernel) {
    EXPECT_EQ(complaintOf("ifconfig", {}), "ifconfig: netlink: Too many open files\n");
    EXPECT_EQ(complaintOf("ifconfig", {"lo"}),
              "ifconfig: lo: error fetching interface information: Too many open files\n");
    EXPECT_EQ(complaintOf("route", {"-n"}), "route: can't open '/proc/net/route': Too many open files\n");
}

TEST(Program, TellsItsToolsAndVersion) {
    EXPECT_THAT(run({HOSTTOOLS_PROGRAM, "--help"}).output, HasSubstr("fdisk -l"));
    EXPECT_THAT(run({HOSTTOOLS_PROGRAM, "--version"}).output, testing::StartsWith("corvista-hosttools "));
    EXPECT_EQ(run({HOSTTOOLS_PROGRAM, "fdisk", "-l"}).status, 0);
}

TEST(Program, RefusesUnknownTools) {
    EXPECT_EQ(run({HOSTTOOLS_PROGRAM}).errors, "corvista-hosttools: which tool? Try --help\n");
    const Outcome outcome = run({HOSTTOOLS_PROGRAM, "mount"});
    EXPECT_EQ(outcome.status, 1);
    EXPECT_EQ(outcome.errors, "corvista-hosttools: no such tool: mount. Try --help\n");
}

TEST(Program, FailsWhenItsOutputGoesNowhere) {
    EXPECT_EQ(shell(HOSTTOOLS_PROGRAM " --help >/dev/full").status, 1);
}

}  // namespace
