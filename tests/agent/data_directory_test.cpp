// Who may own the data directory and the way to it, and who may hold it.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "tests/agent/cvagent_run.h"
#include "tests/agent/suse_host.h"
#include "tests/agent/terminal.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char* kFixed = "/opt/vantrel/corvista/data";

Finished treeWith(FakeHost& host, const std::string& directory) {
    return CvagentRun(host).setting("CORVISTA_DATA_DIR=" + directory)({"tree"});
}

void expectRefused(FakeHost& host, const std::string& directory, const std::string& place,
                   const std::string& reason = "can be written by others") {
    const Finished run = treeWith(host, directory);
    EXPECT_EQ(run.status, 1) << directory;
    EXPECT_THAT(run.err, HasSubstr("is not safe: '" + place + "' " + reason));
    EXPECT_THAT(run.err, HasSubstr("or name another one with CORVISTA_DATA_DIR=DIRECTORY"));
}

HOST_TEST(UnsafeData, ADirectoryThatOthersCanWriteIsRefused) {
    for (const mode_t mode : {0777U, 0770U, 01777U}) {
        host.directory("/var/mine", mode);
        expectRefused(host, "/var/mine", "/var/mine");
        expectRefused(host, "/var/mine/.", "/var/mine");
        EXPECT_THAT(host.listDirectory("/var/mine"), IsEmpty());
    }
}

HOST_TEST(UnsafeData, NothingIsMadeBehindAPlaceThatOthersCanWrite) {
    host.directory("/srv/open", 0777);
    host.symlink("/srv/open/link", "/etc");
    expectRefused(host, "/srv/open/link/data", "/srv/open");
    EXPECT_FALSE(host.exists("/etc/data"));
    expectRefused(host, "/srv/open/new/data", "/srv/open");
    EXPECT_FALSE(host.exists("/srv/open/new"));
    host.symlink("/var/way", "../srv/open/link");
    expectRefused(host, "/var/way/data", "/srv/open");
}

HOST_TEST(UnsafeData, InADirectoryWhereEverybodyHasFilesOfHisOwnOursIsFine) {
    host.directory("/srv/sticky", 01777);
    EXPECT_EQ(treeWith(host, "/srv/sticky/mine").status, 0);
    EXPECT_TRUE(host.exists("/srv/sticky/mine/.lock"));
}

HOST_TEST(UnsafeData, LinksOfOursLeadOn) {
    host.directory("/srv/real");
    host.symlink("/var/lib/there", "/srv/./real");
    host.symlink("/var/here", "lib/../lib/there");
    EXPECT_EQ(treeWith(host, "/var/here/data").status, 0);
    EXPECT_TRUE(host.exists("/srv/real/data/.lock"));
    host.symlink("/var/round", "round");
    const Finished run = treeWith(host, "/var/round");
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err,
                HasSubstr("cannot use the data directory '/var/round/': Too many levels of symbolic links"));
}

HOST_TEST(UnsafeData, TheFixedDirectoryIsHeldToTheSame) {
    host.directory(kFixed, 0777);
    const Finished run = treeWith(host, "/var/mine");
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("'/opt/vantrel/corvista/data' can be written by others"));
    EXPECT_THAT(run.err, HasSubstr("settings of interfaces are saved there whatever CORVISTA_DATA_DIR is"));
}

// With the machine's own users, for a fake host has only one; nothing is written.
TEST(UnsafeDataOfUsers, WhatBelongsToSomebodyElseIsRefused) {
    const OnTerminal run = runAsNobody(
        {"/usr/bin/env", "CORVISTA_DATA_DIR=/usr", CVAGENT_PROGRAM, "--plugin", FAKE_PLUGIN_FILE, "tree"},
        "/");
    if (run.status == 126) {
        GTEST_SKIP() << "the build tree is closed to other users";
    }
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.output, HasSubstr("is not safe: '/usr' belongs to somebody else (user 0)"));
}

TEST(UnsafeDataOfUsers, AWayThroughSomebodyElsesDirectoryIsRefused) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "needs somebody else";
    }
    constexpr uid_t kStranger = 65533;
    const std::string way = "/tmp/cvagent-way-" + std::to_string(getpid());
    ASSERT_EQ(mkdir(way.c_str(), 0755), 0);
    ASSERT_EQ(chown(way.c_str(), kStranger, kStranger), 0);
    makeForNobody(way + "/mine");
    const OnTerminal run = runAsNobody({"/usr/bin/env", "CORVISTA_DATA_DIR=" + way + "/mine", CVAGENT_PROGRAM,
                                        "--plugin", FAKE_PLUGIN_FILE, "tree"},
                                       "/");
    const bool isUntouched = std::filesystem::is_empty(way + "/mine");
    std::filesystem::remove_all(way);
    if (run.status == 126) {
        GTEST_SKIP() << "the build tree is closed to other users";
    }
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.output, HasSubstr("is not safe: '" + way + "' belongs to somebody else (user 65533)"));
    EXPECT_TRUE(isUntouched);
}

HOST_TEST(DataLock, IsAFileForItsOwnerAlone) {
    host.file(std::string(kFixed) + "/.lock", "", 0666);
    EXPECT_EQ(CvagentRun(host)({"tree"}).status, 0);
    struct stat found {};
    ASSERT_EQ(stat((std::string(kFixed) + "/.lock").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0600U);
}

// Whoever may read a directory may hold it so.
HOST_TEST(DataLock, IsNotTheDirectoryThatAnybodyCanHold) {
    host.directory(kFixed, 0755);
    const int directory = open(kFixed, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    ASSERT_EQ(flock(directory, LOCK_EX), 0);
    const Finished run = CvagentRun(host)({"tree"});
    EXPECT_EQ(run.status, 0) << run.err;
    close(directory);
}

HOST_TEST(DataLock, NoLinkIsFollowedAndNothingButAFileIsTaken) {
    host.file("/etc/target", "kept\n", 0644);
    host.symlink(std::string(kFixed) + "/.lock", "/etc/target");
    EXPECT_EQ(CvagentRun(host)({"tree"}).status, 1);
    EXPECT_EQ(host.read("/etc/target"), "kept\n");
    host.remove(std::string(kFixed) + "/.lock");
    ASSERT_EQ(mkfifo((std::string(kFixed) + "/.lock").c_str(), 0600), 0);
    EXPECT_EQ(CvagentRun(host)({"tree"}).status, 1);
}

HOST_TEST(DataLock, CoversTheSavedSettingsOfAnAgentWithAnotherDirectory) {
    CvagentRun first(host);
    first.telling("churn");
    RunningProgram watch = first.start({"watch"});
    ASSERT_TRUE(watch.waitForOutput("published"));
    host.file(std::string(kFixed) + "/ifcfg-eth0", "BOOTPROTO=static\n");
    SuseHost suse(host);
    const Finished second = host.run(suse.commandLine({"tree"}, {"CORVISTA_DATA_DIR=/var/other"}));
    EXPECT_EQ(second.status, 5);
    EXPECT_THAT(second.err,
                HasSubstr("another agent holds the data directory '/opt/vantrel/corvista/data/'"));
    EXPECT_THAT(second.err, HasSubstr("settings of interfaces are saved there"));
    EXPECT_EQ(host.read(std::string(kFixed) + "/ifcfg-eth0"), "BOOTPROTO=static\n");
}

// The listings in /tmp have one name for all agents of a user, and his are in the /tmp that everybody sees.
TEST(DataLockOfUsers, CoversTheListingsOfAnAgentWithAnotherDirectory) {
    const std::string home = "/tmp/cvagent-two-" + std::to_string(getpid());
    makeForNobody(home);
    const std::vector<std::string> tree = {"/usr/bin/env",   "CORVISTA_DATA_DIR=" + home + "/other",
                                           CVAGENT_PROGRAM,  "--host-tools",
                                           "native",         "--plugin",
                                           FAKE_PLUGIN_FILE, "tree"};
    const OnTerminal alone = runAsNobody(tree, home);
    const std::string lockFile = home + "/.local/state/corvista/data/.lock";
    const int lock = open(lockFile.c_str(), O_RDWR | O_CLOEXEC);
    const bool isHeld = lock >= 0 && flock(lock, LOCK_EX | LOCK_NB) == 0;
    const OnTerminal second = runAsNobody(tree, home);
    // One that is not safe is nothing to hold.
    std::filesystem::permissions(home + "/.local", std::filesystem::perms::all);
    const OnTerminal unsafe = runAsNobody(tree, home);
    close(lock);
    std::filesystem::remove_all(home);
    if (alone.status == 127 || alone.status == 126) {
        GTEST_SKIP() << "the build tree is closed to other users";
    }
    EXPECT_EQ(alone.status, 0) << alone.output;
    EXPECT_TRUE(isHeld);
    EXPECT_EQ(second.status, 5) << second.output;
    EXPECT_THAT(second.output, HasSubstr("files in /tmp have the same names whatever CORVISTA_DATA_DIR is"));
    EXPECT_EQ(unsafe.status, 0) << unsafe.output;
}

HOST_TEST(DataLock, OfTheFixedDirectoryIsDoneWithoutWhereItCannotBeMade) {
    host.file("/opt/vantrel", "a file");
    EXPECT_EQ(treeWith(host, "/var/other").status, 0);
}

HOST_TEST(DataDirectoryOfAUser, LosesNothingToTheAdapters) {
    host.file("/home/x/host-tools/notes", "years of work\n");
    host.symlink("/home/x/host-tools/fdisk", "notes");
    host.directory("/home/x", 0700);
    host.tool("ifconfig lo", "lo        Link encap:Local Loopback  \n");
    const Finished run =
        host.run({"env", "CORVISTA_DATA_DIR=/home/x", CVAGENT_PROGRAM, "--plugin", FAKE_PLUGIN_FILE, "tree"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(host.read("/home/x/host-tools/notes"), "years of work\n");
    EXPECT_THAT(host.listDirectory("/home/x"), ElementsAre(".lock", "host-tools"));
    EXPECT_THAT(host.listDirectory("/home/x/host-tools"), ElementsAre("fdisk", "notes"));
}

}  // namespace
