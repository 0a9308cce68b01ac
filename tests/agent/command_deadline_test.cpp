#include "agent/core/command_deadline.h"

#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>

#include "agent/cli/options.h"
#include "agent/cli/print.h"
#include "agent/core/plugin.h"
#include "tests/agent/hostile_host.h"
#include "tests/support/shell.h"

namespace {

using namespace std::chrono_literals;
using cvagent::CommandDeadline;
using cvagent::CommandScope;
using testing::IsEmpty;

constexpr int kKilled = 128 + SIGKILL;

HOST_TEST(CommandDeadline, EndsAPipelineThatHangsAndTellsItsReader) {
    const CommandDeadline deadline(0.3s, cvagent::complain);
    const CommandScope scope(CommandScope::read);
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(shell("sleep 1000 | cat").status, kKilled);
    EXPECT_GE(std::chrono::steady_clock::now() - start, 0.3s);
    EXPECT_EQ(scope.complaint(), "timed out after 0.3 s: sleep 1000 | cat");
    EXPECT_TRUE(isGone(host, "sleep"));
}

/// What it has left behind keeps its pipe open.
HOST_TEST(CommandDeadline, EndsTheReadingOfACommandThatHasEnded) {
    host.tool("leaver", ToolAnswer{.out = "half\n", .action = "sleep 1000 &"});
    for (const char* const command : {"leaver", "leaver | cat", "leaver $NONE"}) {
        const CommandDeadline deadline(0.3s, cvagent::complain);
        const CommandScope scope(CommandScope::read);
        EXPECT_EQ(shell(command).status, kKilled) << command;
        EXPECT_EQ(scope.complaint(), std::string("timed out after 0.3 s: ") + command);
    }
    EXPECT_TRUE(isRunning(host, "sleep"));
}

HOST_TEST(CommandDeadline, EndsTheReadingOfACommandThatIsKilledWithoutWhatItHasLeftBehind) {
    host.tool("leaver", ToolAnswer{.out = "", .action = "(sleep 1000 &) ; sleep 1000"});
    std::vector<std::string> told;
    {
        const CommandDeadline deadline(0.3s, [&told](const std::string& text) { told.push_back(text); });
        EXPECT_EQ(shell("leaver").status, kKilled);
    }
    EXPECT_EQ(told.size(), 1);
}

HOST_TEST(CommandDeadline, LetsWhoIsToldCallThePlugin) {
    bool told = false;
    {
        const CommandDeadline deadline(0.1s, [&told](const std::string&) {
            const CommandScope scope(CommandScope::read);
            told = true;
        });
        shell("sleep 1000");
    }
    EXPECT_TRUE(told);
}

HOST_TEST(CommandDeadline, GivesEveryCommandTheWholeTime) {
    const CommandDeadline deadline(2s, cvagent::complain);
    const CommandScope scope(CommandScope::read);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(shell("sleep 0.7; true").status, 0);
    }
    EXPECT_THAT(scope.complaint(), IsEmpty());
}

HOST_TEST(CommandDeadline, TellsNobodyElse) {
    const CommandDeadline deadline(2s, cvagent::complain);
    std::string other = "not asked";
    std::thread quick([&other] {
        const CommandScope scope(CommandScope::read);
        for (int i = 0; i < 7; ++i) {
            shell("sleep 0.3; true");
        }
        other = scope.complaint();
    });
    const CommandScope scope(CommandScope::read);
    shell("sleep 1000");
    quick.join();
    EXPECT_EQ(scope.complaint(), "timed out after 2 s: sleep 1000");
    EXPECT_THAT(other, IsEmpty());
}

HOST_TEST(CommandDeadline, AWriteMayTakeTenTimesAsLong) {
    const CommandDeadline deadline(0.2s, cvagent::complain);
    const CommandScope scope(CommandScope::write);
    EXPECT_EQ(shell("sleep 0.4; true").status, 0);
    EXPECT_THAT(scope.complaint(), IsEmpty());
    EXPECT_EQ(shell("sleep 1000; true").status, kKilled);
    EXPECT_EQ(scope.complaint(), "timed out after 2 s: sleep 1000; true");
}

HOST_TEST(CommandDeadline, WarnsTheUserOfWhatHasNoReader) {
    testing::internal::CaptureStderr();
    {
        const CommandDeadline deadline(0.2s, cvagent::complain);
        shell("sleep 1000");
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "cvagent: a command of the plug-in was ended after 0.2 s; what it would have told is missing: "
              "sleep 1000\n");
}

HOST_TEST(CommandDeadline, ZeroIsNone) {
    const CommandDeadline deadline(0s, cvagent::complain);
    EXPECT_EQ(shell("sleep 0.2; true").status, 0);
}

TEST(CommandDeadline, IsTenSecondsWhenNobodyAsks) {
    EXPECT_EQ(cvagent::Options().commandSeconds, 10);
}

HOST_TEST(CommandDeadline, ACommandThatHasEndedIsNotKilled) {
    FILE* pipe = popen("true", "r");
    while (std::fgetc(pipe) != EOF) {
    }
    siginfo_t ended{};
    ASSERT_EQ(waitid(P_ALL, 0, &ended, WEXITED | WNOWAIT), 0);
    testing::internal::CaptureStderr();
    {
        const CommandDeadline deadline(0.1s, cvagent::complain);
        std::this_thread::sleep_for(0.3s);  // nobody has taken its status yet
    }
    EXPECT_THAT(testing::internal::GetCapturedStderr(), IsEmpty());
    EXPECT_EQ(pclose(pipe), 0);
}

// As after Ctrl-Z and fg, or when the machine under a virtual machine was held up.
HOST_TEST(CommandDeadline, TheTimeThatTheProgramWasStoppedDoesNotCount) {
    const pid_t program = fork();
    if (program == 0) {
        setpgid(0, 0);
        const CommandDeadline deadline(2s, cvagent::complain);
        _exit(shell("while [ ! -e /go ]; do sleep 0.02; done").status == 0 ? 0 : 1);
    }
    std::this_thread::sleep_for(0.3s);
    kill(-program, SIGSTOP);
    std::this_thread::sleep_for(2.2s);
    host.file("/go", "");
    kill(-program, SIGCONT);
    int status = -1;
    EXPECT_EQ(waitpid(program, &status, 0), program);
    EXPECT_EQ(status, 0);
}

HOST_TEST(ProcessTree, AChildIsKnownByItsStart) {
    FILE* pipe = popen("sleep 1000", "r");
    const auto children = QX::childrenOf(gettid());
    ASSERT_EQ(children.size(), 1U);
    EXPECT_GT(children.front().started, 0U);
    QX::ChildProcess another = children.front();
    ++another.started;
    EXPECT_FALSE(QX::killChild(gettid(), another));
    EXPECT_EQ(QX::childrenOf(gettid()), children);
    EXPECT_TRUE(QX::killChild(gettid(), children.front()));
    pclose(pipe);
    EXPECT_THAT(QX::childrenOf(gettid()), IsEmpty());
    EXPECT_FALSE(QX::killChild(gettid(), children.front()));
}

}  // namespace
