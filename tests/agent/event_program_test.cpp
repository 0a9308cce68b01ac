// watch --exec: the administrator's program on each alert; and several plug-ins on the command line.
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/hostile_host.h"

namespace {

using testing::HasSubstr;
using testing::Not;
using Json = nlohmann::ordered_json;

constexpr const char* kProgram = "/opt/on-alert";

/// The program, with what it does before it ends.
void install(FakeHost& host, const std::string& script) {
    host.file(kProgram, "#!/bin/sh\n" + script, 0755);
}

HOST_TEST(EventProgram, GetsTheEventAsJson) {
    install(host, "pwd > /var/where\ncat > /var/event\necho printed\n");
    const RunningProgram watch = CvagentRun(host).telling("alert churn").start({"watch", "--exec", kProgram});
    EXPECT_TRUE(eventually([&] { return watch.err().find("printed\n") != std::string::npos; }));
    EXPECT_EQ(host.read("/var/where"), "/\n");
    const Json event = Json::parse(*host.read("/var/event"));
    EXPECT_EQ(event["event"], "alert");
    EXPECT_EQ(event["message"], "NIC is Offline ");
    EXPECT_EQ(event["class"], "network-port");
    EXPECT_EQ(event["property"].dump(), R"({"id":123,"name":"LinkState","before":"12","after":"12"})");
    EXPECT_GT(event["number"], 0);
    EXPECT_THAT(watch.out(), Not(HasSubstr("printed")));
}

HOST_TEST(EventProgram, HasDefaultSignalsAndOnlyTheStandardDescriptors) {
    install(host,
            "exec 3>&- 4>&-\nls /proc/self/fd > /var/descriptors\n"
            "grep -E '^Sig(Blk|Ign)' /proc/self/status > /var/signals\n");
    const Finished run = host.run({"sh", "-c", [&] {
                                       std::string line = "trap '' INT USR1; exec";
                                       CvagentRun cvagent(host);
                                       for (const std::string& word : cvagent.telling("early").commandLine(
                                                {"watch", "--for", "0", "--exec", kProgram})) {
                                           line += " '" + word + "'";
                                       }
                                       return line;
                                   }()});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(host.read("/var/descriptors"), "0\n1\n2\n3\n");  // 3 is the listed directory
    std::istringstream signals(*host.read("/var/signals"));
    std::string blocked;
    std::string ignored;
    signals >> blocked >> blocked >> ignored >> ignored;
    EXPECT_EQ(blocked, "0000000000000000");
    constexpr unsigned long long kLibrarysOwn = 0x180000000;  // posix_spawn of glibc leaves them ignored
    EXPECT_EQ(std::stoull(ignored, nullptr, 16) & ~kLibrarysOwn, 0U);
}

HOST_TEST(EventProgram, ThatFailsIsToldAndStopsNothing) {
    install(host, "exit 3\n");
    const Finished run = CvagentRun(host).telling("early late")({"watch", "--for", "0", "--exec", kProgram});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("cvagent: '/opt/on-alert' for event 1 failed with status 3\n"));
    EXPECT_THAT(run.err, HasSubstr("cvagent: '/opt/on-alert' for event 2 failed with status 3\n"));
}

HOST_TEST(EventProgram, ThatIsNoneIsWrongUsage) {
    const Finished run = CvagentRun(host)({"watch", "--for", "0", "--exec", "/nowhere"});
    EXPECT_EQ(run.status, 2);
    EXPECT_THAT(run.err, HasSubstr("cannot run '/nowhere': No such file or directory"));
    const Finished directory = CvagentRun(host)({"watch", "--for", "0", "--exec", "/opt"});
    EXPECT_EQ(directory.status, 2);
    EXPECT_THAT(directory.err, HasSubstr("cannot run '/opt': Is a directory"));
    host.file("/opt/text", "no program\n", 0755);
    const Finished text = CvagentRun(host).telling("early")({"watch", "--for", "0", "--exec", "/opt/text"});
    EXPECT_EQ(text.status, 0);
    EXPECT_THAT(text.err, HasSubstr("cannot run '/opt/text' for event 1: Exec format error"));
}

HOST_TEST(EventProgram, HasANameAndSomeTime) {
    for (const std::vector<std::string>& words :
         {std::vector<std::string>{"--exec", ""}, {"--exec", "/bin/true", "--exec-timeout", "0"}}) {
        std::vector<std::string> line = {"watch", "--for", "0"};
        line.insert(line.end(), words.begin(), words.end());
        EXPECT_EQ(CvagentRun(host)(line).status, 2) << words.back();
    }
}

HOST_TEST(EventProgram, ThatHangsIsKilledWithItsDescendants) {
    install(host, "trap '' TERM\nsleep 1000 &\n(sleep 1001 &)\necho $$ > /var/process\nsleep 1002\n");
    const Finished run = CvagentRun(host).telling("early late")(
        {"watch", "--for", "0.3", "--exec", kProgram, "--exec-timeout", "0.2"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("for event 1 took too long and was ended\n"));
    EXPECT_THAT(run.err, HasSubstr("for event 2 took too long and was ended\n"));
    EXPECT_TRUE(isGone(host, "sleep"));
}

HOST_TEST(EventProgram, ASignalEndsItAtOnce) {
    install(host, "echo > /var/started\nsleep 1000\n");
    CvagentRun cvagent(host);
    RunningProgram watch = cvagent.telling("early").start({"watch", "--exec", kProgram});
    ASSERT_TRUE(eventually([&] { return host.read("/var/started").has_value(); }));
    watch.signal(SIGTERM);
    const Finished run = watch.wait(std::chrono::seconds(10));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(cvagent.diary(), testing::EndsWith("unload\n"));
    EXPECT_THAT(run.err, HasSubstr("for event 1 was ended, for cvagent was told to stop\n"));
    EXPECT_THAT(run.err, Not(HasSubstr("took too long")));
}

/// Stands between a process and whoever waits for it: killed, it stays there, as one that waits for a device.
class Tracer {
public:
    explicit Tracer(pid_t traced) : process_(fork()) {
        if (process_ == 0) {
            ptrace(PTRACE_SEIZE, traced, nullptr, nullptr);
            for (;;) {
                pause();
            }
        }
    }
    Tracer(const Tracer&) = delete;
    Tracer& operator=(const Tracer&) = delete;
    ~Tracer() {
        kill(process_, SIGKILL);
        waitpid(process_, nullptr, 0);
    }

private:
    pid_t process_;
};

HOST_TEST(EventProgram, ThatCannotBeKilledHoldsUpNothing) {
    install(host,
            "[ -e /var/process ] && exec echo next\n"
            "echo $$ > /var/new && mv /var/new /var/process\nexec sleep 1000\n");
    RunningProgram watch = CvagentRun(host)
                               .telling("early late")
                               .start({"watch", "--for", "1", "--exec", kProgram, "--exec-timeout", "0.8"});
    ASSERT_TRUE(eventually([&] { return host.read("/var/process").has_value(); }));
    const Tracer tracer(std::stoi(*host.read("/var/process")));
    const Finished run = watch.wait(std::chrono::seconds(10));
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("for event 1 took too long and cannot be killed; it is left behind\n"));
    EXPECT_THAT(run.err, HasSubstr("next\n"));
}

HOST_TEST(EventProgram, ThatReadsNothingGetsWhatItTakes) {
    install(host, "exec 0<&-\nsleep 0.05\n");
    const Finished run =
        CvagentRun(host).telling("early longalert late")({"watch", "--for", "0", "--exec", kProgram});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, Not(HasSubstr("/opt/on-alert")));
}

HOST_TEST(EventProgram, ThatVanishesIsTold) {
    install(host, "rm /opt/on-alert\n");
    const Finished run = CvagentRun(host).telling("early late")({"watch", "--for", "0", "--exec", kProgram});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("cannot run '/opt/on-alert' for event 2: No such file or directory\n"));
}

HOST_TEST(EventProgram, ThatForksForEverIsEndedWithAllItHasStarted) {
    install(host,
            "for i in 1 2 3 4 5 6 7 8 9; do { while :; do sleep 1000 & sleep 0.01; done; } & done\nwait\n");
    const Finished run = CvagentRun(host).telling("early late")(
        {"watch", "--for", "0.2", "--exec", kProgram, "--exec-timeout", "0.2"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("for event 2 took too long and was ended\n"));
    EXPECT_TRUE(isGone(host, "sleep"));
}

HOST_TEST(SeveralPlugins, MakeOneTreeAndOneThatFailsIsTold) {
    CvagentRun cvagent(host);
    const Finished both = cvagent({"--plugin", CORVISTA_PLUGIN_FILE, "tree", "--json"});
    EXPECT_EQ(both.status, 0) << both.err;
    const Json tree = Json::parse(both.out);
    EXPECT_EQ(tree["plugin"], FAKE_PLUGIN_FILE);
    EXPECT_EQ(tree["plugins"].size(), 2U);
    const Finished one = cvagent({"--plugin", "/nowhere.so", "get", "computer", "HostName"});
    EXPECT_EQ(one.status, 1);
    EXPECT_THAT(one.out, HasSubstr("HostName  fake\n"));
    EXPECT_EQ(one.err,
              "cvagent: there is no plug-in file '/nowhere.so'; name the right one with --plugin FILE\n");
}

}  // namespace
