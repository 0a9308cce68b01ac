#include <gmock/gmock.h>
#include <gtest/gtest.h>

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
        Words command = {adapter("fdisk")};
        command.insert(command.end(), words.begin(), words.end());
        const Outcome outcome = run(command);
        EXPECT_EQ(outcome.status, 1) << testing::PrintToString(words);
        EXPECT_THAT(outcome.output, IsEmpty());
        EXPECT_THAT(outcome.errors, HasSubstr("fdisk: only lists disks"));
    }
}

TEST(FdiskTool, ADiskThatIsNotThere) {
    const Outcome outcome = run({adapter("fdisk"), "-l", "/dev/sdnone"});
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, IsEmpty());
    EXPECT_EQ(outcome.errors, "fdisk: /dev/sdnone is not a disk of this host\n");
}

TEST(Program, TellsItsToolsAndVersion) {
    const std::string program = adapter("../corvista-hosttools");
    EXPECT_THAT(run({program, "--help"}).output, HasSubstr("fdisk -l"));
    EXPECT_THAT(run({program, "--version"}).output, testing::StartsWith("corvista-hosttools "));
    EXPECT_EQ(run({program, "fdisk", "-l"}).status, 0);
}

TEST(Program, RefusesUnknownTools) {
    const std::string program = adapter("../corvista-hosttools");
    EXPECT_EQ(run({program}).errors, "corvista-hosttools: which tool? Try --help\n");
    const Outcome outcome = run({program, "mount"});
    EXPECT_EQ(outcome.status, 1);
    EXPECT_EQ(outcome.errors, "corvista-hosttools: no such tool: mount. Try --help\n");
}

TEST(Program, FailsWhenItsOutputGoesNowhere) {
    EXPECT_EQ(shell(adapter("../corvista-hosttools") + " --help >/dev/full").status, 1);
}

}  // namespace
