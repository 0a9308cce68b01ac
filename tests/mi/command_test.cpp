#include "mi/command.h"

#include <sys/wait.h>

#include <cerrno>

#include "mi/my_process.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"

namespace {

using IC::formatCommand;
using IC::HostCommand;
using IC::MyProcess;

HOST_TEST(MyProcess, CountsOpenPipesAndLogsNothingForACharacterString) {
    const int before = MyProcess::cnt;
    LogCapture capture;
    {
        MyProcess process;
        EXPECT_NE(process.mypopen("true", "r"), nullptr);
        EXPECT_EQ(MyProcess::cnt, before + 1);
    }
    EXPECT_EQ(MyProcess::cnt, before);
    EXPECT_TRUE(capture.messages().empty());
}

HOST_TEST(MyProcess, LogsTheCountForAString) {
    const std::string count = std::to_string(MyProcess::cnt + 1);
    LogCapture capture;
    MyProcess process;
    EXPECT_NE(process.mypopen(std::string("true"), "r"), nullptr);
    EXPECT_EQ(capture.messages(3000), std::vector<std::string>{"mypopen():  Count value " + count});
}

HOST_TEST(MyProcess, LeavesTheCountRaisedWhenTheCommandCouldNotBeStarted) {
    const int before = MyProcess::cnt;
    {
        const NoDescriptors none;
        MyProcess process;
        EXPECT_EQ(process.mypopen("true", "r"), nullptr);
    }
    EXPECT_EQ(MyProcess::cnt, before + 1);
}

HOST_TEST(HostCommand, GivesLinesAsTheyComeAndNothingAtTheEnd) {
    HostCommand command("printf 'one\\n\\nthree'");
    ASSERT_TRUE(command.started());
    EXPECT_EQ(command.nextLine(), "one\n");
    EXPECT_EQ(command.nextLine(), "\n");
    EXPECT_EQ(command.nextLine(), "three");
    EXPECT_EQ(command.nextLine(), std::nullopt);
}

HOST_TEST(HostCommand, GivesALongLineInPiecesOf511Characters) {
    HostCommand command("printf '%0600d\\n' 0");
    EXPECT_EQ(command.nextLine(), std::string(511, '0'));
    EXPECT_EQ(command.nextLine(), std::string(89, '0') + "\n");
    HostCommand narrow("printf '%0200d\\n' 0");
    EXPECT_EQ(narrow.nextLine(127), std::string(127, '0'));
}

HOST_TEST(HostCommand, YieldsNoLineForAMissingTool) {
    host.toolMissing("ethtool");
    HostCommand command("ethtool eth0 2> /dev/null");
    EXPECT_TRUE(command.started());
    EXPECT_EQ(command.nextLine(), std::nullopt);
}

HOST_TEST(HostCommand, NeverRunsACommandOf512Bytes) {
    const std::string name(512 - std::string("touch /tmp/").size(), 'x');
    LogCapture capture;
    HostCommand command(formatCommand("touch /tmp/%s", name));
    EXPECT_FALSE(command.started());
    EXPECT_EQ(command.nextLine(), std::nullopt);
    EXPECT_EQ(capture.messages(6000).size(), 1U);
    EXPECT_TRUE(host.listDirectory("/tmp").empty());
}

HOST_TEST(HostCommand, RunsACommandOf511Bytes) {
    const std::string padding(511 - std::string("echo ").size(), 'x');
    HostCommand command(formatCommand("echo %s", padding));
    ASSERT_TRUE(command.started());
    EXPECT_EQ(command.nextLine(), padding + "\n");
}

HOST_TEST(HostCommand, IsReadAsFarAsASaneOneGoes) {
    EXPECT_EQ(IC::kMostOutput, 64U * 1024 * 1024);
    LogCapture capture;
    HostCommand command("yes $(printf %0255d 0)");
    std::size_t read = 0;
    while (const auto line = command.nextLine()) {
        read += line->size();
    }
    EXPECT_EQ(read, IC::kMostOutput);
    EXPECT_EQ(capture.messages(6000),
              std::vector<std::string>{"Output too long, the rest is not read: yes $(printf %0255d 0)"});
}

HOST_TEST(HostCommand, ZerosAreReadAsFarToo) {
    IC::PlainCommand command("cat /dev/zero");
    std::size_t lines = 0;
    while (command.nextLine()) {
        ++lines;
    }
    EXPECT_LE(lines, IC::kMostOutput / IC::kCommandBuffer + 1);
}

HOST_TEST(CommandsCutOff, AreThoseWhoseShellWasKilled) {
    const unsigned int before = IC::commandsCutOff();
    { HostCommand killed("kill -KILL $$"); }
    EXPECT_EQ(IC::commandsCutOff(), before + 1);
    { IC::PlainCommand plain("kill -KILL $$"); }
    EXPECT_EQ(IC::commandsCutOff(), before + 2);
}

// No exit status is examined, whatever its number means elsewhere.
HOST_TEST(CommandsCutOff, AreNoneThatEndedOtherwise) {
    const unsigned int before = IC::commandsCutOff();
    for (const IC::Command& command : std::initializer_list<IC::Command>{
             "echo; exit 3", "exit 130", "exit 137", "exit 192", "exit 255", "sh -c 'kill -KILL $$'; exit $?",
             "sh -c 'kill -KILL $$' | cat", "kill -TERM $$", "kill -SEGV $$", "yes", "yes | cat"}) {
        { HostCommand fine(command); }
        EXPECT_EQ(IC::commandsCutOff(), before) << command.shown();
    }
}

HOST_TEST(PlainCommand, IsNotCounted) {
    const int before = MyProcess::cnt;
    IC::PlainCommand command("echo line");
    EXPECT_EQ(MyProcess::cnt, before);
    EXPECT_EQ(command.nextLine(), "line\n");
    EXPECT_EQ(command.nextLine(), std::nullopt);
}

HOST_TEST(PlainCommand, LeavesNoProcessBehind) {
    { const IC::PlainCommand command("true"); }
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD);
}

HOST_TEST(RunToEnd, HasRunWhenItReturns) {
    IC::runToEnd("sleep 0.1; echo done > /tmp/done");
    EXPECT_EQ(host.read("/tmp/done"), "done\n");
}

}  // namespace
