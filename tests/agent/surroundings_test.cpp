// The command line, the data directory, the log files, broken plug-ins.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <set>

#include "agent/core/process.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"
#include "tests/agent/cvagent_run.h"
#include "tests/agent/from_directory.h"
#include "tests/agent/terminal.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

constexpr const char* kData = "/opt/vantrel/corvista/data";

mode_t modeOf(const std::string& path) {
    struct stat found {};
    EXPECT_EQ(stat(path.c_str(), &found), 0) << path;
    return found.st_mode & 07777U;
}

HOST_TEST(CommandLine, HelpIsEverywhere) {
    CvagentRun cvagent(host);
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{"--help"},
                                               {"-h"},
                                               {"tree", "--help"},
                                               {"get", "--help"},
                                               {"set", "--help"},
                                               {"watch", "--help"},
                                               {"properties", "--help"},
                                               {"doctor", "--help"},
                                               {"--version"}}) {
        const Finished run = cvagent(words);
        EXPECT_EQ(run.status, 0) << words.front();
        EXPECT_THAT(run.out, HasSubstr("cvagent"));
        EXPECT_THAT(run.err, IsEmpty());
    }
}

HOST_TEST(CommandLine, WrongUsageEndsWithStatusTwoAndSaysWhereToLook) {
    CvagentRun cvagent(host);
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{},
                                               {"tre"},
                                               {"--nonsense"},
                                               {"get"},
                                               {"set"},
                                               {"set", "computer"},
                                               {"set", "computer", "115"},
                                               {"watch", "--for", "soon"},
                                               {"watch", "--for", "-1"},
                                               {"tree", "extra"},
                                               {"tree", "\x1b[31m"},
                                               {"tree", "--yes"},
                                               {"--log-level", "high", "tree"},
                                               {"--host-tools", "some", "tree"},
                                               {"properties", "computer", "extra"},
                                               {"tree", "get"}}) {
        const Finished run = cvagent(words);
        EXPECT_EQ(run.status, 2) << (words.empty() ? "nothing" : words.back());
        EXPECT_THAT(run.err, StartsWith("cvagent: "));
        EXPECT_THAT(run.err, HasSubstr("--help"));
        EXPECT_THAT(run.err, Not(HasSubstr("\x1b")));
        EXPECT_THAT(run.out, IsEmpty());
    }
    EXPECT_THAT(cvagent.diary(), IsEmpty());
}

HOST_TEST(CommandLine, NamesTheWordThatIsWrong) {
    CvagentRun cvagent(host);
    for (const auto& [words, complaint] : std::vector<std::pair<std::vector<std::string>, std::string>>{
             {{"foo"},
              "there is no command 'foo'; the commands are: tree, get, set, plan, apply, export, diff, "
              "confirm, "
              "rollback, watch, history, properties, doctor"},
             {{"--json", "foo", "eth0"}, "there is no command 'foo'"},
             {{"--host-tools", "some", "tree"}, "'some' is none of: auto, classic, native"},
             {{"--host-tools", "0", "tree"}, "'0' is none of: auto, classic, native"},
             {{"--commands", "ask", "tree"}, "'ask' is none of: direct, shell"},
             {{"--log-level", "0x10", "tree"}, "'0x10' is no decimal number"},
             {{"--log-level", "+1", "tree"}, "'+1' is no decimal number"},
             {{"watch", "--for", "0x1"}, "'0x1' is no number of seconds"},
             {{"watch", "--for", "+1"}, "'+1' is no number of seconds"}}) {
        const Finished run = cvagent(words);
        EXPECT_EQ(run.status, 2) << complaint;
        EXPECT_THAT(run.err, HasSubstr(complaint));
        EXPECT_THAT(run.err, HasSubstr("\nSee: cvagent "));
    }
}

HOST_TEST(Surroundings, SpeakTheLanguageThatTheParsersRead) {
    setenv("LC_ALL", "de_DE.UTF-8", 1);
    cvagent::prepareSurroundings({});
    EXPECT_STREQ(std::getenv("LC_ALL"), "C");
}

HOST_TEST(PreparedProcess, HasAllThatAnAgentNeeds) {
    host.directory("/srv/real", 0700);
    host.symlink("/srv/data", "real");
    std::filesystem::current_path("/srv");
    setenv("CORVISTA_DATA_DIR", "data", 1);
    std::string plugin = "plugin.so";
    cvagent::ProcessSettings settings;
    settings.files = {&plugin};
    settings.log.file = "log";
    settings.hostTools = cvagent::HostTools::native;
    close(STDIN_FILENO);
    const cvagent::PreparedProcess process(settings);
    struct stat input {};
    struct stat nothing {};
    EXPECT_EQ(fstat(STDIN_FILENO, &input), 0);
    EXPECT_EQ(stat("/dev/null", &nothing), 0);
    EXPECT_EQ(input.st_rdev, nothing.st_rdev) << "no file of the agent's takes its place";
    EXPECT_EQ(plugin, "/srv/plugin.so");
    EXPECT_EQ(process.data().path(), "/srv/real/");
    EXPECT_STREQ(std::getenv("CORVISTA_DATA_DIR"), "/srv/real/") << "where the plug-ins look";
    EXPECT_TRUE(host.exists("/srv/log"));
    EXPECT_EQ(process.agentSettings().data->path(), "/srv/real/");
    EXPECT_NE(process.agentSettings().log, nullptr);
    EXPECT_NE(cvagent::messageDescriptor(), STDERR_FILENO);
    EXPECT_NE(cvagent::StopSignals::descriptor(), -1);
    EXPECT_EQ(std::filesystem::current_path(), "/");
}

HOST_TEST(DataDirectory, IsMadeForItsOwnerAlone) {
    CvagentRun cvagent(host);
    EXPECT_EQ(cvagent({"tree"}).status, 0);
    EXPECT_EQ(modeOf(kData), 0700U);
    EXPECT_EQ(modeOf("/opt/vantrel/corvista"), 0755U);
    EXPECT_EQ(cvagent.setting("CORVISTA_DATA_DIR=/var/other")({"tree"}).status, 0);
    EXPECT_EQ(modeOf("/var/other"), 0700U);
}

HOST_TEST(DataDirectory, KeepsTheModeItHas) {
    host.directory(kData, 0750);
    EXPECT_EQ(CvagentRun(host)({"tree"}).status, 0);
    EXPECT_EQ(modeOf(kData), 0750U);
}

HOST_TEST(DataDirectory, IsHeldByOneAgent) {
    CvagentRun cvagent(host);
    cvagent.telling("churn");
    RunningProgram first = cvagent.start({"watch"});
    ASSERT_TRUE(first.waitForOutput("published"));
    for (const std::vector<std::string>& words : std::vector<std::vector<std::string>>{
             {"tree"}, {"get", "computer"}, {"set", "computer", "115", "x"}, {"watch", "--for", "0"}}) {
        const Finished second = cvagent(words);
        EXPECT_EQ(second.status, 5);
        EXPECT_THAT(second.err,
                    HasSubstr("another agent holds the data directory '/opt/vantrel/corvista/data/'"));
    }
    EXPECT_EQ(cvagent({"properties"}).status, 0);
    first.signal(SIGKILL);
    EXPECT_EQ(first.wait().status, 128 + SIGKILL);
    EXPECT_EQ(cvagent({"tree"}).status, 0);
}

HOST_TEST(DataDirectory, ThatCannotBeMadeIsNamed) {
    host.file("/opt/vantrel", "a file");
    const Finished run = CvagentRun(host)({"tree"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("'/opt/vantrel/corvista/data/'"));
    EXPECT_THAT(run.err, HasSubstr("CORVISTA_DATA_DIR=DIRECTORY"));
    const Finished empty = CvagentRun(host).setting("CORVISTA_DATA_DIR=")({"tree"});
    EXPECT_EQ(empty.status, 2);
    EXPECT_THAT(empty.err, HasSubstr("CORVISTA_DATA_DIR is empty"));
}

HOST_TEST(QuietCommands, LeaveStandardErrorAloneWhereThereIsNothingToSendItTo) {
    ASSERT_EQ(umount2("/dev/null", MNT_DETACH), 0);
    host.remove("/dev/null");
    const cvagent::QuietCommands quiet;
    EXPECT_EQ(cvagent::messageDescriptor(), STDERR_FILENO);
    EXPECT_EQ(open("/dev/null", O_WRONLY | O_CLOEXEC), -1);
}

const std::filesystem::path kForAll = "/tmp";  // $TMPDIR may lie below a directory that is closed to others

TEST(WithoutRoot, SaysWhatWillBeMissingAndUsesTheHome) {
    const std::filesystem::path home = kForAll / ("cvagent-home-" + std::to_string(getpid()));
    makeForNobody(home);
    const OnTerminal run = runAsNobody(
        {CVAGENT_PROGRAM, "--host-tools", "native", "--plugin", FAKE_PLUGIN_FILE, "tree"}, home.string());
    const bool kept = std::filesystem::is_directory(home / ".local/state/corvista/data");
    std::filesystem::remove_all(home);
    if (run.status == 127) {
        GTEST_SKIP() << "the build tree is closed to other users";
    }
    EXPECT_EQ(run.status, 0) << run.output;
    EXPECT_THAT(run.output, HasSubstr("without root some facts will be missing"));
    EXPECT_THAT(run.output, HasSubstr("hard-drive:sda"));
    EXPECT_TRUE(kept);
}

TEST(WithoutRoot, KeepsTheDataWhereTheUserKeepsState) {
    const std::filesystem::path state = kForAll / ("cvagent-state-" + std::to_string(getpid()));
    makeForNobody(state);
    const OnTerminal run = runAsNobody({"/usr/bin/env", "XDG_STATE_HOME=" + state.string(), CVAGENT_PROGRAM,
                                        "--host-tools", "native", "--plugin", FAKE_PLUGIN_FILE, "tree"},
                                       "/nonexistent");
    const bool kept = std::filesystem::is_directory(state / "corvista/data");
    std::filesystem::remove_all(state);
    if (run.status == 126) {
        GTEST_SKIP() << "the build tree is closed to other users";
    }
    EXPECT_EQ(run.status, 0) << run.output;
    EXPECT_TRUE(kept);
}

TEST(WithoutRoot, WithoutAHomeThereIsNoPlaceForData) {
    const OnTerminal run = runAsNobody({CVAGENT_PROGRAM, "--plugin", FAKE_PLUGIN_FILE, "tree"}, "");
    if (run.status == 127) {
        GTEST_SKIP() << "the build tree is closed to other users";
    }
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.output, HasSubstr("there is no place for data; set CORVISTA_DATA_DIR=DIRECTORY"));
}

HOST_TEST(Logs, GoToTheFilesNamed) {
    const Finished run =
        CvagentRun(host).telling("errors")({"--log", "/tmp/log", "--trace", "/tmp/trace", "tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(host.read("/tmp/log").value_or(""), HasSubstr("6000 Fake fake_plugin:1 fake: first error\n"));
    EXPECT_THAT(host.read("/tmp/trace").value_or(""), HasSubstr("first error\n"));
    EXPECT_EQ(modeOf("/tmp/log"), 0600U);
    EXPECT_THAT(run.err, HasSubstr("the plug-in reports: first error"));
}

HOST_TEST(Logs, GoToFilesWithBracketsInTheirNames) {
    CvagentRun cvagent(host);
    const Finished run =
        host.run(fromDirectory("/tmp", cvagent.commandLine({"--log", "[a,b]", "--trace", "[c]", "tree"})));
    EXPECT_THAT(host.listDirectory("/tmp"), ElementsAre("[a,b]", "[c]")) << run.err;
    for (const std::vector<std::string>& words : std::vector<std::vector<std::string>>{
             {"--plugin", "[d]", "tree"}, {"watch", "--for", "0", "--exec", "[d]"}}) {
        EXPECT_THAT(host.run(fromDirectory("/tmp", cvagent.commandLine(words))).err, HasSubstr("'/tmp/[d]'"));
    }
}

HOST_TEST(Logs, GoToStandardErrorFromTheLevelAskedFor) {
    CvagentRun cvagent(host);
    cvagent.telling("errors");
    const Finished shown = cvagent({"--log-level", "6000", "tree"});
    EXPECT_THAT(shown.err, HasSubstr("6000 Fake fake_plugin:1 fake: first error\n"));
    EXPECT_THAT(shown.err, Not(HasSubstr("the plug-in reports")));
}

HOST_TEST(Logs, AFileThatCannotBeWrittenEndsTheCommand) {
    CvagentRun cvagent(host);
    const Finished run = cvagent({"--log", "/nowhere/log", "tree"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("cannot write to '/nowhere/log'"));
    EXPECT_THAT(cvagent.diary(), IsEmpty());
}

// Who laid it there would read what is written, or have it written where he likes.
HOST_TEST(Logs, DoNotGoToAFileOfAnother) {
    CvagentRun cvagent(host);
    cvagent.telling("errors");
    host.directory("/home/me", 01777);
    host.file("/etc/private", "old\n", 0600);
    host.file("/home/me/file", "", 0666);
    host.symlink("/home/me/link", "/etc/private");
    ASSERT_EQ(link("/etc/private", "/home/me/second"), 0);
    ASSERT_EQ(mkfifo("/home/me/fifo", 0666), 0);
    const Finished second = cvagent({"--log", "/home/me/second", "tree"});
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.err, HasSubstr("belongs to somebody else or has a second name"));
    for (const std::string file : {"/home/me/file", "/home/me/link", "/home/me/fifo"}) {
        if (!host.giveToStranger(file)) {
            GTEST_SKIP() << "there is no stranger";
        }
        const Finished run = cvagent({"--log", file, "tree"});
        EXPECT_EQ(run.status, 1) << file;
        EXPECT_THAT(run.err, HasSubstr("cannot write to '" + file + "'"));
    }
    EXPECT_EQ(host.read("/home/me/file"), "");
    EXPECT_EQ(host.read("/etc/private"), "old\n");
    EXPECT_THAT(cvagent.diary(), IsEmpty());
}

HOST_TEST(Logs, GoThroughALinkOfOurs) {
    CvagentRun cvagent(host);
    cvagent.telling("errors");
    host.directory("/home/me");
    host.symlink("/home/me/link", "/var/log");
    EXPECT_EQ(cvagent({"--log", "/home/me/link", "tree"}).status, 0);
    EXPECT_THAT(host.read("/var/log").value_or(""), HasSubstr("first error"));
    const Finished shown = cvagent({"--log", "/dev/fd/2", "tree"});
    EXPECT_EQ(shown.status, 0);
    EXPECT_THAT(shown.err, HasSubstr("first error"));
}

HOST_TEST(BrokenPlugins, EachHaveAMessageOfTheirOwn) {
    host.file("/tmp/text.so", "no library");
    host.file("/tmp/empty.so", "");
    std::set<std::string> messages;
    const auto expect = [&](CvagentRun cvagent, const std::string& message) {
        const Finished run = cvagent({"tree"});
        EXPECT_EQ(run.status, 1) << message;
        EXPECT_THAT(run.err, HasSubstr(message));
        EXPECT_THAT(run.out, IsEmpty());
        EXPECT_TRUE(messages.insert(run.err).second) << message;
    };
    expect(CvagentRun(host).plugin("/nowhere.so"), "there is no plug-in file '/nowhere.so'");
    expect(CvagentRun(host).plugin("/tmp/text.so"), "cannot load the plug-in '/tmp/text.so'");
    expect(CvagentRun(host).plugin("/tmp/empty.so"), "cannot load the plug-in '/tmp/empty.so'");
    expect(CvagentRun(host).plugin("/tmp"), "cannot load the plug-in '/tmp'");
    expect(CvagentRun(host).plugin(FRAMEWORK_FILE), "is a library but no plug-in: it has no OpenMI");
    expect(CvagentRun(host).telling("fail"), "refused to start: OpenMI returned 7 (not licensed)");
    expect(CvagentRun(host).telling("null"), "is broken: its OpenMI returned no interface");
    expect(CvagentRun(host).telling("throw"), "threw an exception: not today");
    expect(CvagentRun(host).telling("throwseven"), "threw an unknown exception");
    expect(CvagentRun(host).telling("badstart"), "did not initialize: no host here");
    expect(CvagentRun(host).telling("throwstart"), "threw an exception: cannot start");
}

HOST_TEST(Plugins, AreFoundBesideTheProgram) {
    const Finished run = host.run({CVAGENT_PROGRAM, "--host-tools", "native", "tree", "--json"});
    EXPECT_EQ(run.status, 0) << run.err;
    const std::string directory = std::filesystem::path(CORVISTA_PLUGIN_FILE).parent_path();
    EXPECT_THAT(run.out, StartsWith("{\n  \"plugin\": \"" + directory + "/libvantrelcvicoshwmi.so.1\",\n"));
}

HOST_TEST(Plugins, ThatAreNotBesideTheProgramAreMissed) {
    const std::string program = host.read(CVAGENT_PROGRAM).value_or("");
    host.file("/opt/bin/cvagent", program, 0755);
    host.file("/opt/lib/libvantrelcvframework.so.1", host.read(FRAMEWORK_FILE).value_or(""));
    const Finished run = host.run({"/opt/bin/cvagent", "tree"});
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(
        run.err,
        "cvagent: there is no libvantrelcvicoshwmi.so.1 beside this program, which lies in '/opt/bin'; name "
        "the plug-in with --plugin FILE\n");
}

HOST_TEST(BrokenPlugins, ThatCannotStopAreNamedAndTheCommandCounts) {
    const Finished thrown = CvagentRun(host).telling("throwstop")({"tree"});
    EXPECT_EQ(thrown.status, 0);
    EXPECT_THAT(thrown.out, HasSubstr("hard-drive:sda"));
    EXPECT_THAT(thrown.err, StartsWith("cvagent: unload of '"));
    EXPECT_THAT(thrown.err, testing::EndsWith(" threw an exception: cannot stop\n"));
    const Finished seven = CvagentRun(host).telling("sevenstop")({"tree"});
    EXPECT_EQ(seven.status, 0);
    EXPECT_THAT(seven.err, testing::EndsWith(" threw an unknown exception\n"));
}

HOST_TEST(BrokenPlugins, ThatFailedToStartAreStillUnloaded) {
    CvagentRun cvagent(host);
    cvagent.telling("badstart churn")({"tree"});
    EXPECT_THAT(cvagent.diary(), testing::EndsWith("unload\n"));
}

}  // namespace
