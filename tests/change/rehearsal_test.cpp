// Hosts that are not as a rehearsal would like them.
#include "agent/change/rehearsal.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <linux/capability.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <syscall.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>

#include "agent/change/name_service.h"
#include "agent/change/recorders.h"
#include "agent/core/data_directory.h"
#include "tests/change/rehearsed.h"

namespace {

using cvagent::change::Change;
using cvagent::change::FileChange;
using cvagent::change::Plan;
using cvagent::change::PlannedCommand;
using testing::HasSubstr;

constexpr const char* kConfig = "ip-config:eth0";

/// A host with one link whose name server can be set.
void addLink(FakeHost& host) {
    host.copyTree("suse-two-nics");
    host.expectUnrecorded();
    moveRecords(host);
}

const std::vector<Change> kNameServer{{kConfig, 94, {"192.0.2.153"}}};

std::string after(const Plan& plan, const std::string& path) {
    for (const auto& file : plan.files) {
        if (file.path == path) {
            return file.after ? file.after->content : "(gone)";
        }
    }
    return "(unchanged)";
}

HOST_TEST(Rehearsal, FollowsALinkIntoRun) {
    addLink(host);
    host.file("/run/systemd/resolve/stub.conf", "nameserver 127.0.0.53\n");
    host.remove("/etc/resolv.conf");
    host.symlink("/etc/resolv.conf", "../run/systemd/resolve/stub.conf");
    const Plan plan = rehearsed(kNameServer);
    EXPECT_EQ(plan.answers[0].problem, "");
    EXPECT_THAT(after(plan, "/run/systemd/resolve/stub.conf"), HasSubstr("nameserver 192.0.2.153"));
    EXPECT_EQ(after(plan, "/etc/resolv.conf"), "(unchanged)");
    EXPECT_EQ(host.read("/run/systemd/resolve/stub.conf"), "nameserver 127.0.0.53\n");
}

HOST_TEST(Rehearsal, FollowsALinkOutOfAllThatIsWrittenElse) {
    addLink(host);
    host.file("/var/elsewhere/resolv.conf", "nameserver 127.0.0.53\n");
    host.remove("/etc/resolv.conf");
    host.symlink("/etc/resolv.conf", "/var/elsewhere/resolv.conf");
    const Plan plan = rehearsed(kNameServer);
    EXPECT_THAT(after(plan, "/var/elsewhere/resolv.conf"), HasSubstr("nameserver 192.0.2.153"));
    EXPECT_EQ(host.read("/var/elsewhere/resolv.conf"), "nameserver 127.0.0.53\n");
}

HOST_TEST(Rehearsal, SaysOfWhichFileItTellsNoContent) {
    addLink(host);
    std::string content = "nameserver 127.0.0.53\n";
    while (content.size() <= 1U << 20U) {
        content += "# a long comment, as nobody writes it\n";
    }
    host.file("/etc/resolv.conf", content);
    const Plan plan = rehearsed(kNameServer);
    EXPECT_THAT(
        plan.unforeseen,
        testing::Contains("What changes within /etc/resolv.conf: it is longer than 1 MiB, or cannot be "
                          "read."));
}

HOST_TEST(Rehearsal, TakesAFileThatIsMountedForWhatItIs) {
    addLink(host);
    host.file("/var/containers/resolv.conf", "nameserver 127.0.0.11\n");
    host.file("/etc/resolv.conf", "");
    ASSERT_EQ(mount("/var/containers/resolv.conf", "/etc/resolv.conf", nullptr, MS_BIND, nullptr), 0);
    const Plan plan = rehearsed(kNameServer);
    EXPECT_THAT(after(plan, "/etc/resolv.conf"), HasSubstr("nameserver 192.0.2.153"));
    EXPECT_EQ(plan.files[0].before->content, "nameserver 127.0.0.11\n");
    EXPECT_EQ(host.read("/etc/resolv.conf"), "nameserver 127.0.0.11\n");
    EXPECT_EQ(host.read("/var/containers/resolv.conf"), "nameserver 127.0.0.11\n");
}

/// As the agent itself mounts what is its own below a /tmp of its own.
HOST_TEST(Rehearsal, HasThePluginThatIsMountedBelowTmp) {
    addLink(host);
    const std::filesystem::path plugin = CORVISTA_PLUGIN_FILE;
    host.directory("/tmp/checkout");
    ASSERT_EQ(mount(plugin.parent_path().c_str(), "/tmp/checkout", nullptr, MS_BIND, nullptr), 0);
    const Plan plan = rehearsed(kNameServer, "/tmp/checkout/" + plugin.filename().string());
    EXPECT_THAT(after(plan, "/etc/resolv.conf"), HasSubstr("nameserver 192.0.2.153"));
}

HOST_TEST(Rehearsal, IsNotHeldByPipesLinksInCirclesAndManyMounts) {
    addLink(host);
    host.symlink("/etc/one", "two");
    host.symlink("/etc/two", "one");
    host.symlink("/etc/nowhere", "/no/such/place");
    ASSERT_EQ(mkfifo("/etc/pipe", 0600), 0);
    host.file("/etc/\x1b[2J\nname", "odd");
    for (int at = 0; at < 200; ++at) {
        const std::string place = "/etc/mounts/" + std::to_string(at);
        host.directory(place);
        ASSERT_EQ(mount("/var", place.c_str(), nullptr, MS_BIND, nullptr), 0);
    }
    const Plan plan = rehearsed(kNameServer);
    EXPECT_THAT(after(plan, "/etc/resolv.conf"), HasSubstr("nameserver 192.0.2.153"));
    for (int at = 0; at < 200; ++at) {
        umount2(("/etc/mounts/" + std::to_string(at)).c_str(), MNT_DETACH);
    }
}

/// A list of hosts that are to be blocked has megabytes.
HOST_TEST(Rehearsal, TellsThatAFileChangesThatIsTooLongToBeTold) {
    addLink(host);
    std::string servers;
    while (servers.size() <= 1U << 20U) {
        servers += "# nothing but a long file\n";
    }
    host.file("/etc/resolv.conf", servers + "nameserver 192.0.2.53\n");
    host.file("/etc/long", servers);
    const Plan plan = rehearsed(kNameServer);
    const auto file = std::ranges::find(plan.files, "/etc/resolv.conf", &FileChange::path);
    ASSERT_NE(file, plan.files.end());
    EXPECT_TRUE(file->before->withheld && file->after->withheld);
    EXPECT_EQ(after(plan, "/etc/long"), "(unchanged)");
}

HOST_TEST(Rehearsal, TakesWhatAnAgentAtWorkHolds) {
    addLink(host);
    const cvagent::DataDirectory held;
    EXPECT_EQ(whyNotRehearsed(kNameServer), "");
}

HOST_TEST(Rehearsal, TellsWhatIsNoChange) {
    addLink(host);
    const Plan plan = rehearsed({{"no-such-node", 94, {"192.0.2.1"}},
                                 {kConfig, 95, {"1"}},
                                 {kConfig, 94, {"name server"}},
                                 {kConfig, 94, {"192.0.2.1"}}});
    ASSERT_EQ(plan.answers.size(), 4U);
    for (std::size_t at = 0; at < 3; ++at) {
        EXPECT_NE(plan.answers[at].problem, "") << at;
    }
    EXPECT_EQ(plan.answers[3].problem, "");
    EXPECT_EQ(plan.answers[3].property, "DNSServers");
}

HOST_TEST(Rehearsal, RecordsWhatNoNamespaceKeepsApart) {
    addLink(host);
    host.tool("shutdown -h now", ToolAnswer{.out = "", .action = "touch /etc/ran"});
    const Plan plan = rehearsed({{"computer", 123, {"12"}}, {"computer", 126, {"2026-11-20T21:03:00Z"}}});
    ASSERT_EQ(plan.commands.size(), 2U);
    EXPECT_EQ(plan.commands[0].text, "shutdown -h now");
    EXPECT_TRUE(plan.commands[0].recorded);
    EXPECT_EQ(plan.commands[1].text, "settimeofday 1795208580");
    EXPECT_TRUE(plan.commands[1].recorded);
    EXPECT_EQ(plan.commands[1].change, 1U);
    EXPECT_EQ(after(plan, "/etc/ran"), "(unchanged)");
    EXPECT_THAT(host.callsOf("shutdown"), testing::IsEmpty());
    EXPECT_TRUE(host.clockCalls().empty());
}

/// From here on this process and its children are as a user's: without any right. The one that is left lets a
/// process whose number is 0 keep it in a user namespace, as any user can keep his.
void giveUpRights() {
    for (int right = 0; prctl(PR_CAPBSET_READ, right, 0, 0, 0) >= 0; ++right) {
        ASSERT_TRUE(right == CAP_SETFCAP || prctl(PR_CAPBSET_DROP, right, 0, 0, 0) == 0);
    }
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    __user_cap_data_struct none[2]{};
    ASSERT_EQ(syscall(SYS_capset, &header, none), 0);
}

/// The kernel shows a process table of its own only to who sees all of the present one.
void showWholeProc() {
    for (const char* cover :
         {"/.proc/sys/net", "/.proc/sys", "/.proc/sysrq-trigger", "/.proc/irq", "/.proc/bus", "/.proc/fs"}) {
        umount2(cover, MNT_DETACH);
    }
}

HOST_TEST(Rehearsal, TriesAsAUserOnCopies) {
    addLink(host);
    host.file("/run/systemd/resolve/stub.conf", "nameserver 127.0.0.53\n");
    host.remove("/etc/resolv.conf");
    host.symlink("/etc/resolv.conf", "../run/systemd/resolve/stub.conf");
    ASSERT_EQ(mkfifo("/etc/pipe", 0600), 0);
    showWholeProc();
    giveUpRights();
    const auto files = writtenPart(host);
    const Plan plan = rehearsed(kNameServer);
    EXPECT_EQ(plan.answers[0].problem, "");
    EXPECT_THAT(after(plan, "/run/systemd/resolve/stub.conf"), HasSubstr("nameserver 192.0.2.153"));
    EXPECT_EQ(after(plan, "/etc/pipe"), "(unchanged)");
    EXPECT_THAT(plan.unforeseen, testing::Contains(HasSubstr("as a user")));
    EXPECT_EQ(writtenPart(host), files);
}

HOST_TEST(Rehearsal, TriesAsAUserWhoseDataLieInTmp) {
    addLink(host);
    host.directory("/tmp/of a user", 0700);
    setenv("CORVISTA_DATA_DIR", "/tmp/of a user", 1);
    showWholeProc();
    giveUpRights();
    const cvagent::DataDirectory held;
    const auto files = host.listDirectory("/tmp/of a user");
    EXPECT_EQ(whyNotRehearsed(kNameServer), "");
    EXPECT_EQ(host.listDirectory("/tmp/of a user"), files);
}

HOST_TEST(Rehearsal, SaysWhyThereIsNoUserNamespace) {
    addLink(host);
    enterJail(host);
    giveUpRights();
    const auto files = writtenPart(host);
    EXPECT_THAT(whyNotRehearsed(kNameServer),
                HasSubstr("the host allows no user namespace here: Operation not permitted"));
    EXPECT_EQ(writtenPart(host), files);
}

/// The copy's host name is set although nothing there may set one.
HOST_TEST(Rehearsal, SetsTheHostsNameWithoutAUserNamespace) {
    addLink(host);
    host.realTool("hostname");
    host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");
    enterJail(host);
    const Plan plan = rehearsed({{kConfig, 97, {"earth"}}, {kConfig, 98, {"example.org"}}});
    EXPECT_EQ(plan.answers[1].failure(), "");
    EXPECT_THAT(plan.kernelAfter, testing::Contains("host name earth.example.org"));
    EXPECT_THAT(after(plan, "/etc/hosts"), HasSubstr("earth.example.org\tearth"));
    const auto set = std::ranges::find(plan.commands, "hostname earth", &PlannedCommand::text);
    ASSERT_NE(set, plan.commands.end());
    EXPECT_FALSE(set->recorded);
}

HOST_TEST(Rehearsal, SaysThatUserNamespacesAreSwitchedOff) {
    addLink(host);
    showWholeProc();
    std::string map;
    std::getline(std::ifstream("/.proc/self/uid_map"), map);
    if (map.find("4294967295") != std::string::npos) {
        GTEST_SKIP() << "the limit would be the machine's";
    }
    std::ofstream("/.proc/sys/user/max_user_namespaces") << "0" << std::flush;
    EXPECT_EQ(whyNotRehearsed(kNameServer), "") << "root can do without";
    giveUpRights();
    EXPECT_THAT(whyNotRehearsed(kNameServer), HasSubstr("user.max_user_namespaces"));
}

TEST(Recorders, AreKnownByTheProgramThatACommandBeginsWith) {
    using cvagent::change::isRecorded;
    for (const char* command : {"shutdown -h now", "rpm -qa | grep dhcpv6*",
                                "cat /etc/x|/sbin/service a restart", "true;reboot", "echo `hwclock -r`"}) {
        EXPECT_TRUE(isRecorded(command)) << command;
    }
    for (const char* command : {"", "hostname reboot", "grep service /etc/x", "cat /sbin/shutdown | wc"}) {
        EXPECT_FALSE(isRecorded(command)) << command;
    }
}

TEST(NameService, AsksFilesAlone) {
    using cvagent::change::withoutServers;
    EXPECT_EQ(withoutServers(""), "hosts: files\n");
    EXPECT_EQ(withoutServers("# all\npasswd:\tfiles systemd sss\ngroup: ldap\nhosts: files "
                             "mdns4_minimal [NOTFOUND=return] dns myhostname # last\nhalf line"),
              "passwd: files\ngroup: files\nhosts: files myhostname\n");
}

/// A program in place of the rehearsal's.
std::string whyNotWith(FakeHost& host, const std::string& script,
                       std::chrono::seconds longest = std::chrono::seconds(60),
                       const std::vector<Change>& changes = kNameServer) {
    host.file("/opt/other", "#!/bin/sh\n" + script + "\n", 0755);
    cvagent::change::RehearsalSettings settings;
    settings.program = "/opt/other";
    settings.longest = longest;
    try {
        rehearse(settings, changes);
        return "";
    } catch (const cvagent::change::CannotRehearse& reason) {
        return reason.what();
    }
}

HOST_TEST(Rehearsal, TakesNothingForAPlanThatIsNone) {
    EXPECT_THAT(whyNotWith(host, "echo junk"), HasSubstr("has failed"));
    EXPECT_THAT(whyNotWith(host, "exit 1"), HasSubstr("has failed"));
    EXPECT_THAT(whyNotWith(host, "echo '{\"plan\": {}}'"), HasSubstr("has failed"));
    EXPECT_THAT(whyNotWith(host, "echo '{\"cannot\": \"not today\"}'"), HasSubstr("not today"));
    EXPECT_THAT(whyNotWith(host, "head -c 20000000 /dev/zero | tr '\\0' '['"), HasSubstr("too much"));
    const std::chrono::seconds soon(1);
    EXPECT_THAT(whyNotWith(host, "exec cat", soon), HasSubstr("in time"));
    const Change endless{kConfig, 94, {std::string(4U << 20U, 'x')}};
    EXPECT_THAT(whyNotWith(host, "while :; do :; done", soon, {endless}), HasSubstr("in time"));
    host.remove("/opt/other");
    cvagent::change::RehearsalSettings settings;
    settings.program = "/no/such/program";
    EXPECT_THROW(rehearse(settings, kNameServer), cvagent::change::CannotRehearse);
}

}  // namespace
