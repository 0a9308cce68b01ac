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
    HostCommand command(formatCommand("printf 'one\\n\\n%s'", "three"));
    ASSERT_TRUE(command.started());
    EXPECT_EQ(command.nextLine(), "one\n");
    EXPECT_EQ(command.nextLine(), "\n");
    EXPECT_EQ(command.nextLine(), "three");
    EXPECT_EQ(command.nextLine(), std::nullopt);
}

HOST_TEST(HostCommand, GivesALongLineInPiecesOf511Characters) {
    HostCommand command(std::string("printf '%0600d\\n' 0"));
    EXPECT_EQ(command.nextLine(), std::string(511, '0'));
    EXPECT_EQ(command.nextLine(), std::string(89, '0') + "\n");
    HostCommand narrow(std::string("printf '%0200d\\n' 0"));
    EXPECT_EQ(narrow.nextLine(127), std::string(127, '0'));
}

HOST_TEST(HostCommand, YieldsNoLineForAMissingTool) {
    host.toolMissing("ethtool");
    HostCommand command(std::string("ethtool eth0 2> /dev/null"));
    EXPECT_TRUE(command.started());
    EXPECT_EQ(command.nextLine(), std::nullopt);
}

HOST_TEST(HostCommand, NeverRunsACommandOf512Bytes) {
    const std::string name(512 - std::string("touch /tmp/").size(), 'x');
    LogCapture capture;
    HostCommand command(formatCommand("touch /tmp/%s", name.c_str()));
    EXPECT_FALSE(command.started());
    EXPECT_EQ(command.nextLine(), std::nullopt);
    EXPECT_FALSE(HostCommand::fromText("touch /tmp/" + name).started());
    EXPECT_EQ(capture.messages(6000).size(), 2U);
    EXPECT_TRUE(host.listDirectory("/tmp").empty());
}

HOST_TEST(HostCommand, NeverRunsWhatCannotBeWrittenInTheHostsLetters) {
    const auto command = formatCommand("echo %ls", L"\u6771");
    EXPECT_EQ(command, std::nullopt);
    EXPECT_FALSE(HostCommand(command).started());
}

HOST_TEST(HostCommand, RunsACommandOf511Bytes) {
    const std::string padding(511 - std::string("echo ").size(), 'x');
    HostCommand command(formatCommand("echo %s", padding.c_str()));
    ASSERT_TRUE(command.started());
    EXPECT_EQ(command.nextLine(), padding + "\n");
}

HOST_TEST(HostCommand, IsReadAsFarAsASaneOneGoes) {
    LogCapture capture;
    HostCommand command(std::string("yes"));
    std::size_t read = 0;
    while (const auto line = command.nextLine()) {
        read += line->size();
    }
    EXPECT_EQ(read, IC::kMostOutput);
    EXPECT_EQ(capture.messages(6000), std::vector<std::string>{"Output too long, the rest is not read: yes"});
}

HOST_TEST(HostCommand, ZerosAreReadAsFarToo) {
    IC::PlainCommand command(std::string("cat /dev/zero"));
    std::size_t lines = 0;
    while (command.nextLine()) {
        ++lines;
    }
    EXPECT_LE(lines, IC::kMostOutput / IC::kCommandBuffer + 1);
}

HOST_TEST(CommandsCutOff, AreThoseWhoseShellWasKilled) {
    const unsigned int before = IC::commandsCutOff();
    { HostCommand killed(std::string("kill -KILL $$")); }
    EXPECT_EQ(IC::commandsCutOff(), before + 1);
    { IC::PlainCommand plain(std::string("kill -KILL $$")); }
    EXPECT_EQ(IC::commandsCutOff(), before + 2);
}

// No exit status is examined, whatever its number means elsewhere.
HOST_TEST(CommandsCutOff, AreNoneThatEndedOtherwise) {
    const unsigned int before = IC::commandsCutOff();
    for (const std::string command :
         {"echo; exit 3", "exit 130", "exit 137", "exit 192", "exit 255", "sh -c 'kill -KILL $$'; exit $?",
          "sh -c 'kill -KILL $$' | cat", "kill -TERM $$", "kill -SEGV $$", "yes", "yes | cat"}) {
        { HostCommand fine(command); }
        EXPECT_EQ(IC::commandsCutOff(), before) << command;
    }
}

HOST_TEST(PlainCommand, IsNotCounted) {
    const int before = MyProcess::cnt;
    IC::PlainCommand command(std::string("echo line"));
    EXPECT_EQ(MyProcess::cnt, before);
    EXPECT_EQ(command.nextLine(), "line\n");
    EXPECT_EQ(command.nextLine(), std::nullopt);
}

HOST_TEST(PlainCommand, LeavesNoProcessBehind) {
    { const IC::PlainCommand command(std::string("true")); }
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD);
}

HOST_TEST(RunToEnd, HasRunWhenItReturns) {
    IC::runToEnd("sleep 0.1; echo done > /tmp/done");
    EXPECT_EQ(host.read("/tmp/done"), "done\n");
}

}  // namespace
