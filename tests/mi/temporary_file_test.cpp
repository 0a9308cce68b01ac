// What may stand where the plug-in keeps its files in /tmp, and what becomes of it.
#include "mi/temporary_file.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>

#include "tests/support/fake_host.h"
#include "tests/support/world.h"

namespace {

constexpr char kPath[] = "/tmp/ours";
constexpr char kSecret[] = "/etc/secret";

std::string modeOf(const char* path) {
    struct stat found {};
    if (lstat(path, &found) != 0) {
        return "missing";
    }
    return (S_ISREG(found.st_mode) ? "file " : "other ") + std::to_string(found.st_mode & 07777U);
}

/// What somebody may have put there before us.
struct Place {
    const char* description;
    std::function<void(FakeHost&)> prepare;
    bool readable;  ///< as it stands
};

const Place kPlaces[] = {
    {"nothing", [](FakeHost&) {}, false},
    {"a link to a file of ours", [](FakeHost& host) { host.symlink(kPath, kSecret); }, false},
    {"a link to nothing", [](FakeHost& host) { host.symlink(kPath, "/etc/new"); }, false},
    {"a pipe", [](FakeHost&) { EXPECT_EQ(mkfifo(kPath, 0600), 0); }, false},
    {"a second name of a file of ours", [](FakeHost&) { EXPECT_EQ(link(kSecret, kPath), 0); }, false},
    {"a file that its group can write", [](FakeHost& host) { host.file(kPath, "lies", 0620); }, false},
    {"a file that all can write", [](FakeHost& host) { host.file(kPath, "lies", 0602); }, false},
    {"an empty directory", [](FakeHost& host) { host.directory(kPath); }, false},
    {"a file of ours", [](FakeHost& host) { host.file(kPath, "old", 0644); }, true},
};

HOST_TEST(TemporaryFile, TakesThePlaceOfWhateverStoodThereAndLeavesTheRestAlone) {
    for (const Place& place : kPlaces) {
        SCOPED_TRACE(place.description);
        host.remove(kPath);
        host.file(kSecret, "root's", 0640);
        place.prepare(host);
        IC::TemporaryFile file(kPath);
        EXPECT_EQ(file.isOurs(), place.readable);
        EXPECT_TRUE(file.removeAndCreate());
        EXPECT_TRUE(file.isOurs());
        EXPECT_EQ(modeOf(kPath), "file " + std::to_string(0600));
        EXPECT_EQ(host.read(kPath), "");
        EXPECT_EQ(host.read(kSecret), "root's");
        EXPECT_EQ(modeOf(kSecret), "file " + std::to_string(0640));
        EXPECT_FALSE(host.exists("/etc/new"));
    }
}

HOST_TEST(TemporaryFile, OfAStrangerIsNotReadAndDoesNotStopRoot) {
    host.file(kPath, "a stranger's lies", 0644);
    if (!host.giveToStranger(kPath)) {
        GTEST_SKIP() << "the tests do not run as root";
    }
    IC::TemporaryFile file(kPath);
    EXPECT_FALSE(file.isOurs());
    EXPECT_TRUE(file.removeAndCreate());
    EXPECT_TRUE(file.isOurs());
    EXPECT_EQ(host.read(kPath), "");
}

HOST_TEST(TemporaryFile, OfAnotherUserThatCannotBeRemovedIsNotUsed) {
    host.file(kPath, "somebody's", 0666);
    if (seteuid(fake_host::stranger) != 0) {
        GTEST_SKIP() << "the tests do not run as root: there is no other user";
    }
    IC::TemporaryFile file(kPath);
    EXPECT_FALSE(file.removeAndCreate()) << "the directory is sticky";
    EXPECT_FALSE(file.isOurs());
    EXPECT_EQ(seteuid(0), 0);
    EXPECT_EQ(host.read(kPath), "somebody's");
}

HOST_TEST(TemporaryFile, IsPrivateWhateverTheUmask) {
    umask(0);
    IC::TemporaryFile file(kPath);
    EXPECT_TRUE(file.removeAndCreate());
    EXPECT_EQ(modeOf(kPath), "file " + std::to_string(0600));
}

HOST_TEST(TemporaryFile, IsNoneWhereADirectoryCannotBeRemoved) {
    host.file(std::string(kPath) + "/kept", "");
    IC::TemporaryFile file(kPath);
    EXPECT_FALSE(file.removeAndCreate());
    EXPECT_FALSE(file.isOurs());
    host.remove(kPath);
    EXPECT_TRUE(file.removeAndCreate());
    EXPECT_TRUE(file.isOurs()) << "the next time";
}

HOST_TEST(TemporaryFile, LeftByAnEarlierRunIsNotReadWhereItCannotBeReplaced) {
    host.file(kPath, "the host as it was");
    host.readOnly("/tmp");
    IC::TemporaryFile file(kPath);
    EXPECT_FALSE(file.removeAndCreate());
    EXPECT_EQ(host.read(kPath), "the host as it was");
    EXPECT_FALSE(file.isOurs());
}

HOST_TEST(TemporaryFile, IsNoneWithoutItsDirectory) {
    IC::TemporaryFile file("/nowhere/file");
    EXPECT_FALSE(file.removeAndCreate());
    EXPECT_FALSE(file.isOurs());
}

}  // namespace
