// What a plug-in finds in the program that loads it.
#include <gmock/gmock.h>
#include <unistd.h>

#include <atomic>
#include <sstream>
#include <thread>

#include "agent/shell/starts.h"
#include "tests/agent/cvagent_run.h"
#include "tests/agent/hostile_host.h"
#include "tests/agent/suse_host.h"

namespace {

using testing::HasSubstr;
using testing::UnorderedElementsAre;

std::vector<std::string> linesOf(const std::string& text) {
    std::istringstream in(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);) {
        lines.push_back(line);
    }
    return lines;
}

// What carries a version is a library's own, of which the program holds the data.
HOST_TEST(TheProgram, ExportsPopenPcloseAndSystemAlone) {
    host.realTool("nm");
    std::vector<std::string> own;
    for (const std::string& line : linesOf(host.run({"nm", "-D", "--defined-only", CVAGENT_PROGRAM}).out)) {
        const std::string name = line.substr(line.rfind(' ') + 1);
        const bool sanitizers = name.starts_with("__asan") || name.starts_with("__tsan") ||
                                name.starts_with("__ubsan") || name.starts_with("__lsan");
        if (name.find('@') == std::string::npos && !sanitizers) {
            own.push_back(name);
        }
    }
    EXPECT_THAT(own, UnorderedElementsAre("popen", "pclose", "system"));
}

HOST_TEST(ThePlugin, FindsThemInTheProgram) {
    const SuseHost suse(host);
    RunningProgram tree =
        host.start(suse.commandLine({"tree"}, {"LD_DEBUG=bindings", "LD_DEBUG_OUTPUT=/bindings"}));
    const std::string output = "/bindings." + std::to_string(tree.pid());
    ASSERT_TRUE(eventually([&] { return !host.calls().empty(); }));  // all is bound before
    const std::string bindings = host.read(output).value_or("");
    for (const std::string name : {"popen", "pclose", "system"}) {
        EXPECT_THAT(bindings, HasSubstr("binding file " CORVISTA_PLUGIN_FILE " [0] to " CVAGENT_PROGRAM
                                        " [0]: normal symbol `" +
                                        name + "'"));
    }
}

// A tool that another command starts meanwhile would hold it open.
HOST_TEST(APipe, IsNoOtherCommands) {
    CvagentRun cvagent(host);
    EXPECT_EQ(cvagent.telling("pipe")({"tree"}).status, 0);
    EXPECT_THAT(cvagent.diary(), HasSubstr("closed on exec\nended with 7\n"));
}

/// The state of a thread of this process, as the kernel's letter.
char stateOf(const FakeHost& host, pid_t thread) {
    const std::string status = host.read("/proc/self/task/" + std::to_string(thread) + "/stat").value_or("");
    return status.substr(status.rfind(')') + 1 + 1, 1).front();
}

HOST_TEST(AStop, HoldsWhoWouldStartACommand) {
    cvagent::shell::declareStop();
    static std::atomic<pid_t> caller{0};  // static: the thread stays where it is
    static std::atomic<bool> begun{false};
    std::thread([] {
        caller = gettid();
        const cvagent::shell::Start start;
        begun = true;
    }).detach();
    ASSERT_TRUE(eventually([&] { return caller != 0 && stateOf(host, caller) == 'S'; }));
    EXPECT_FALSE(begun);
    EXPECT_EQ(cvagent::shell::startsUnderWay(), 0);
}

}  // namespace
