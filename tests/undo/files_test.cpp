// Files that a change has touched are put back with all that they had, and nobody else's.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <filesystem>

#include "agent/undo/saved_state.h"
#include "tests/support/fake_host.h"

namespace {

namespace fs = std::filesystem;
using cvagent::undo::FileState;
using cvagent::undo::fileStateOf;
using cvagent::undo::SavedState;
using cvagent::undo::takeBack;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

struct Times {
    timespec accessed{1'000'000'000, 111'222'333};
    timespec modified{1'100'000'000, 444'555'666};
};

void giveTimes(const std::string& path, const Times& times = {}) {
    const timespec both[] = {times.accessed, times.modified};
    EXPECT_EQ(utimensat(AT_FDCWD, path.c_str(), both, AT_SYMLINK_NOFOLLOW), 0) << path;
}

void expectTimes(const std::string& path) {
    struct stat found {};
    ASSERT_EQ(lstat(path.c_str(), &found), 0) << path;
    EXPECT_EQ(found.st_mtim.tv_sec, Times().modified.tv_sec) << path;
    EXPECT_EQ(found.st_mtim.tv_nsec, Times().modified.tv_nsec) << path;
}

const std::vector<std::string> kPaths{"/etc/hosts", "/etc/new",       "/etc/resolv.conf",
                                      "/etc/gone",  "/etc/d",         "/etc/d/inside",
                                      "/etc/made",  "/etc/made/deep", "/etc/untouched"};

class Files : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.file("/etc/hosts", "127.0.0.1 localhost\n", 0640);
        isStrangers_ = host.giveToStranger("/etc/hosts");
        hasAttributes_ = setxattr("/etc/hosts", "user.note", "kept\0too", 8, 0) == 0;
        host.symlink("/etc/resolv.conf", "../run/resolv.conf");
        host.file("/etc/gone", "it was here\n");
        host.directory("/etc/d", 0750);
        host.file("/etc/d/inside", "deep\n");
        host.file("/etc/untouched", "as ever\n");
        for (const char* each : {"/etc/hosts", "/etc/resolv.conf", "/etc/gone", "/etc/d/inside", "/etc/d"}) {
            giveTimes(each);
        }
    }
    static void change(FakeHost& host) {
        host.remove("/etc/hosts");
        host.file("/etc/hosts", "192.0.2.7 db1\n", 0644);
        host.file("/etc/new", "new\n");
        host.remove("/etc/resolv.conf");
        host.file("/etc/resolv.conf", "nameserver 192.0.2.53\n");
        host.remove("/etc/gone");
        host.remove("/etc/d");
        host.file("/etc/made/deep", "made\n");
    }
    void expectOld(FakeHost& host) const {
        EXPECT_EQ(host.read("/etc/hosts"), "127.0.0.1 localhost\n");
        struct stat found {};
        ASSERT_EQ(stat("/etc/hosts", &found), 0);
        EXPECT_EQ(found.st_mode & 07777U, 0640U);
        EXPECT_EQ(found.st_uid != 0, isStrangers_);
        if (hasAttributes_) {
            std::string value(16, '\0');
            const ssize_t size = getxattr("/etc/hosts", "user.note", value.data(), value.size());
            EXPECT_EQ(value.substr(0, size > 0 ? static_cast<std::size_t>(size) : 0),
                      std::string("kept\0too", 8));
        }
        EXPECT_FALSE(host.exists("/etc/new"));
        EXPECT_EQ(fs::read_symlink("/etc/resolv.conf"), "../run/resolv.conf");
        EXPECT_EQ(host.read("/etc/gone"), "it was here\n");
        EXPECT_EQ(host.read("/etc/d/inside"), "deep\n");
        EXPECT_EQ(fs::status("/etc/d").permissions(), fs::perms(0750));
        EXPECT_FALSE(host.exists("/etc/made"));
        for (const char* each : {"/etc/hosts", "/etc/resolv.conf", "/etc/gone", "/etc/d/inside", "/etc/d"}) {
            expectTimes(each);
        }
        for (const std::string& name : host.listDirectory("/etc")) {
            EXPECT_EQ(name.find("corvista-undo"), std::string::npos) << name;
        }
    }
    bool hasAttributes_ = false;
    bool isStrangers_ = false;
};

HOST_TEST_F(Files, ComeBackWithAllThatTheyHad) {
    const SavedState before = SavedState::of(kPaths);
    EXPECT_EQ(before.obstacle(), "");
    change(host);
    const SavedState left = before.again();
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty());
    expectOld(host);
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty()) << "once more";
    expectOld(host);
}

HOST_TEST_F(Files, ComeBackWhereTheChangeWasCutOff) {
    const SavedState before = SavedState::of(kPaths);
    change(host);
    EXPECT_THAT(takeBack(before, nullptr, before.again()).notes, IsEmpty());
    expectOld(host);
}

HOST_TEST_F(Files, ThatSomebodyElseHasChangedSinceStay) {
    const SavedState before = SavedState::of(kPaths);
    change(host);
    const SavedState left = before.again();
    host.file("/etc/hosts", "somebody else's\n");
    host.file("/etc/untouched", "his, too\n");
    host.file("/etc/made/his", "his\n");
    EXPECT_THAT(
        takeBack(before, &left, before.again()).notes,
        testing::UnorderedElementsAre("/etc/hosts has been changed by somebody else since and stays as it is",
                                      HasSubstr("/etc/made is not put back: ")));
    EXPECT_EQ(host.read("/etc/hosts"), "somebody else's\n");
    EXPECT_EQ(host.read("/etc/untouched"), "his, too\n");
    EXPECT_EQ(host.read("/etc/gone"), "it was here\n");
    EXPECT_EQ(host.listDirectory("/etc/made"), std::vector<std::string>{"his"});
}

HOST_TEST_F(Files, ThatAreMountedComeBackInTheirPlace) {
    host.file("/run/real-hosts", "mounted\n", 0600);
    ASSERT_EQ(mount("/run/real-hosts", "/etc/hosts", nullptr, MS_BIND, nullptr), 0);
    const SavedState before = SavedState::of({"/etc/hosts"});
    host.file("/run/real-hosts", "changed\n");
    const SavedState left = before.again();
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty());
    EXPECT_EQ(host.read("/run/real-hosts"), "mounted\n");
    EXPECT_EQ(host.read("/etc/hosts"), "mounted\n");
}

/// Who may write in a directory on the way to a file leads nobody elsewhere with a link.
HOST_TEST_F(Files, AreReachedThroughNoLinkThatHasComeSince) {
    host.file("/opt/place/settings", "old\n");
    host.file("/var/precious/settings", "precious\n");
    const SavedState before = SavedState::of({"/opt/place/settings"});
    host.remove("/opt/place");
    host.symlink("/opt/place", "/var/precious");
    EXPECT_THAT(takeBack(before, nullptr, before.again()).notes,
                ElementsAre(HasSubstr("/opt/place/settings is not put back: ")));
    EXPECT_EQ(host.read("/var/precious/settings"), "precious\n");
    EXPECT_EQ(cvagent::undo::withoutLinks("/opt/place/settings"), "/var/precious/settings");
    EXPECT_EQ(cvagent::undo::withoutLinks("/opt/place/none/none"), "/var/precious/none/none");
}

HOST_TEST_F(Files, ThatCannotBeKeptAreNamed) {
    ASSERT_EQ(mkfifo("/etc/pipe", 0600), 0);
    EXPECT_EQ(SavedState::of({"/etc/hosts", "/etc/pipe"}).obstacle(), "/etc/pipe: it is no file");
    host.file("/etc/huge", "");
    ASSERT_EQ(truncate("/etc/huge", 17 << 20), 0);
    EXPECT_THAT(SavedState::of({"/etc/huge"}).obstacle(), HasSubstr("/etc/huge: "));
    EXPECT_EQ(fileStateOf("/etc/hosts/below").type, FileState::Type::absent);
}

HOST_TEST_F(Files, OfAFullDiskAreTold) {
    const SavedState before = SavedState::of({"/etc/hosts", "/etc/gone"});
    host.file("/etc/hosts", "changed\n");
    host.readOnly("/etc");
    EXPECT_THAT(takeBack(before, nullptr, before.again()).notes,
                ElementsAre(HasSubstr("/etc/hosts is not put back: Read-only")));
    host.restore("/etc");
    EXPECT_THAT(takeBack(before, nullptr, before.again()).notes, IsEmpty());
    EXPECT_EQ(host.read("/etc/hosts"), "127.0.0.1 localhost\n");
}

/// What a file system or a container does not let one set is no reason to keep the rest away.
HOST_TEST_F(Files, ComeBackWithoutAnAttributeThatTheyCannotHave) {
    SavedState before = SavedState::of({"/etc/hosts", "/etc/resolv.conf", "/etc/d"});
    for (FileState& each : before.files) {
        each.attributes["nobody.knows"] = "this";
    }
    host.file("/etc/hosts", "changed\n");
    host.remove("/etc/resolv.conf");
    host.remove("/etc/d");
    std::vector<std::string> notes = takeBack(before, nullptr, before.again()).notes;
    EXPECT_THAT(notes, testing::UnorderedElementsAre(
                           HasSubstr("/etc/hosts is put back without all its attributes: "),
                           HasSubstr("/etc/resolv.conf is put back without all its attributes: "),
                           HasSubstr("/etc/d is put back without all its attributes: ")));
    EXPECT_EQ(host.read("/etc/hosts"), "127.0.0.1 localhost\n");
    EXPECT_EQ(fs::read_symlink("/etc/resolv.conf"), "../run/resolv.conf");
    EXPECT_EQ(fs::status("/etc/d").permissions(), fs::perms(0750));
    expectTimes("/etc/hosts");
}

HOST_TEST_F(Files, BringTheHostsNameBack) {
    host.setHostName("db1");
    const SavedState before = SavedState::of({});
    host.setHostName("other");
    const SavedState left = before.again();
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty());
    EXPECT_EQ(SavedState::of({}).hostName, "db1");
    host.setHostName("his");
    EXPECT_THAT(takeBack(before, &left, before.again()).notes, IsEmpty());
    EXPECT_EQ(SavedState::of({}).hostName, "his");
}

/// That is before anything can be put back.
HOST_TEST_F(Files, BringTheNameBackThatTheHostHasStartedWith) {
    host.setHostName("db1");
    host.file("/etc/hostname", "db1\n");
    SavedState before = SavedState::of({"/etc/hostname"});
    before.boot = "another one";
    host.setHostName("new");
    EXPECT_THAT(takeBack(before, nullptr, before.again()).notes, IsEmpty());
    EXPECT_EQ(SavedState::of({}).hostName, "new") << "the file has not been touched";
    host.file("/etc/hostname", "new\n");
    EXPECT_THAT(takeBack(before, nullptr, before.again()).notes, IsEmpty());
    EXPECT_EQ(SavedState::of({}).hostName, "db1");
}

}  // namespace
