// The /tmp that cvagent gives itself.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <filesystem>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/from_directory.h"
#include "tests/agent/suse_host.h"

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

/// What the running programs see of mounts, cvagent first.
std::string mountsOf(const FakeHost& host, const std::string& program) {
    for (int process = 1; process <= 256; ++process) {
        const std::string place = "/proc/" + std::to_string(process);
        if (host.read(place + "/cmdline").value_or("").starts_with(program)) {
            return host.read(place + "/mountinfo").value_or("");
        }
    }
    return "";
}

// Whatever the plug-in's commands make of such files, they never meet them.
HOST_TEST(PrivateTmp, HidesWhatAStrangerHasLaidOut) {
    SuseHost suse(host);
    const std::string expected = suse.run({"tree"}).out;
    host.file("/etc/target", "kept\n");
    host.symlink("/tmp/fdisk_tmp", "/etc/target");
    host.symlink("/tmp/CVIfconfig.txt", "/etc/target");
    ASSERT_EQ(mkfifo("/tmp/__tmp", 0666), 0);
    host.tool("hostname",
              ToolAnswer{.out = "linux\n",
                         .action = "ls -A /tmp > /var/seen; stat -c %a /tmp >> /var/seen; > /tmp/mine"});
    const Finished run = suse.run({"tree"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.out, expected);
    EXPECT_THAT(host.read("/var/seen").value_or(""), Not(HasSubstr("fdisk_tmp")));
    EXPECT_THAT(host.read("/var/seen").value_or(""), testing::EndsWith("1777\n"));
    EXPECT_EQ(host.read("/etc/target"), "kept\n");
    EXPECT_THAT(host.listDirectory("/tmp"), ElementsAre("CVIfconfig.txt", "__tmp", "fdisk_tmp"));
}

/// Copies of the program and all that belongs to it, as an installation has them.
void installBelow(FakeHost& host, const std::string& prefix) {
    for (const auto& [place, original] : std::vector<std::pair<std::string, std::string>>{
             {"/bin/cvagent", CVAGENT_PROGRAM},
             {"/lib/libvantrelcvframework.so.1", FRAMEWORK_FILE},
             {"/lib/libvantrelcvicoshwmi.so.1.0.0", CORVISTA_PLUGIN_FILE},
             {"/lib/corvista/corvista-hosttools", HOSTTOOLS_PROGRAM}}) {
        host.directory(fs::path(prefix + place).parent_path());
        fs::copy_file(original, prefix + place);
    }
    host.symlink(prefix + "/lib/libvantrelcvicoshwmi.so.1", "libvantrelcvicoshwmi.so.1.0.0");
    for (const std::string tool : {"fdisk", "ifconfig", "route"}) {
        host.symlink(prefix + "/lib/corvista/adapters/" + tool + "/" + tool, "../../corvista-hosttools");
    }
}

HOST_TEST(PrivateTmp, HasWhatIsTheAgentsOwn) {
    SuseHost suse(host);
    installBelow(host, "/tmp/checkout/install");
    host.file("/tmp/others/secret", "");
    host.symlink("/tmp/way", "checkout/install");
    host.tool("hostname", ToolAnswer{.out = "linux\n",
                                     .action = "command -v fdisk > /var/seen; ls -A /tmp >> /var/seen"});
    const Finished run = host.run(
        fromDirectory("/tmp/way/bin", {"env", "CORVISTA_DATA_DIR=../../data", "./cvagent", "--host-tools",
                                       "classic", "--log", "/tmp/new.log", "--trace", "trace", "tree"}));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("computer"));
    EXPECT_EQ(host.read("/var/seen").value_or(""),
              "/tmp/checkout/install/lib/corvista/adapters/fdisk/fdisk\ncheckout\nnew.log\n");
    EXPECT_TRUE(host.exists("/tmp/new.log"));
    EXPECT_THAT(host.read("/tmp/checkout/install/bin/trace").value_or(""), HasSubstr("OpenMI"));
    EXPECT_TRUE(host.exists("/tmp/checkout/data/.lock"));
}

HOST_TEST(PrivateTmp, HasAPluginThatLiesInTmpItself) {
    fs::copy_file(FAKE_PLUGIN_FILE, "/tmp/plugin.so");
    host.symlink("/tmp/link.so", "plugin.so");
    fs::copy_file(FAKE_PLUGIN_FILE, "/var/plugin.so");
    host.symlink("/tmp/there.so", "/var/plugin.so");
    for (const std::string plugin : {"/tmp/plugin.so", "/tmp/link.so", "/tmp/there.so"}) {
        const Finished run = CvagentRun(host).plugin(plugin)({"tree"});
        EXPECT_EQ(run.status, 0) << run.err;
    }
}

HOST_TEST(PrivateTmp, HasTheToolsOfTheCallersPath) {
    SuseHost suse(host);
    host.file("/tmp/tools/hostname", "#!/bin/sh\necho from-tmp > /var/seen\n", 0755);
    const Finished run = host.run(suse.commandLine({"tree"}, {"PATH=/tmp/tools:/tools:/usr/bin"}));
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(host.read("/var/seen"), "from-tmp\n");
}

HOST_TEST(PrivateTmp, SeesTheMountsThatTheHostMakesLater) {
    ASSERT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_SHARED, nullptr), 0);
    host.directory("/mnt/late");
    CvagentRun cvagent(host);
    cvagent.telling("churn");
    RunningProgram watch = cvagent.start({"watch"});
    ASSERT_TRUE(watch.waitForOutput("published"));
    ASSERT_EQ(mount("late", "/mnt/late", "tmpfs", 0, nullptr), 0);
    const std::string seen = mountsOf(host, CVAGENT_PROGRAM);
    EXPECT_THAT(seen, HasSubstr(" /mnt/late "));
    EXPECT_THAT(seen, HasSubstr("- tmpfs cvagent "));
    EXPECT_THAT(host.read("/proc/self/mountinfo").value_or(""), Not(HasSubstr("- tmpfs cvagent ")));
}

HOST_TEST(PrivateTmp, OfAUnitIsPrivateEnough) {
    SuseHost suse(host);
    const std::string tmp = "/var/tmp/systemd-private-0123-cvagent.service-abc/tmp";
    host.directory(tmp, 01777);
    host.mountOver("/tmp", [&] { ASSERT_EQ(mount(tmp.c_str(), "/tmp", nullptr, MS_BIND, nullptr), 0); });
    host.tool("hostname", ToolAnswer{.out = "linux\n", .action = "> /tmp/mine"});
    EXPECT_EQ(suse.run({"tree"}).status, 0);
    EXPECT_THAT(host.listDirectory("/tmp"), ElementsAre("mine"));
}

}  // namespace
