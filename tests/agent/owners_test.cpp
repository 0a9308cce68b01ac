// Who counts as the system, and who as somebody else.
#include "agent/core/owners.h"

#include <gtest/gtest.h>
#include <sys/xattr.h>

#include <array>
#include <cerrno>

#include "tests/support/fake_host.h"

namespace {

using cvagent::isTheSystem;
using cvagent::othersCanWrite;

constexpr uid_t kUser = 1000;
constexpr uid_t kNobodysId = 65534;

struct stat directoryOf(uid_t user, gid_t group, mode_t mode) {
    struct stat found {};
    found.st_mode = S_IFDIR | mode;
    found.st_uid = user;
    found.st_gid = group;
    return found;
}

/// On a host where mia has a group of her own.
bool canWrite(uid_t user, gid_t group, mode_t mode = 0775) {
    return othersCanWrite("/srv", directoryOf(user, group, mode));
}

void layOut(FakeHost& host, const std::string& members = "", const std::string& moreUsers = "") {
    host.directory("/srv");
    host.file("/etc/nsswitch.conf", "passwd: files\ngroup: files\n");
    host.file("/etc/passwd",
              "root:x:0:0::/root:/bin/sh\nmia:x:1000:1000::/home/mia:/bin/sh\n"
              "ben:x:1001:100::/home/ben:/bin/sh\n" +
                  moreUsers);
    host.file("/etc/group", "root:x:0:\nusers:x:100:\nmia:x:1000:" + members + "\nben:x:1001:\n");
}

HOST_TEST(OthersCanWrite, WhereEverybodyCanAndWhereAGroupCan) {
    layOut(host);
    EXPECT_TRUE(canWrite(kUser, kUser, 0757));
    EXPECT_TRUE(canWrite(kUser, 100)) << "a group of several";
    EXPECT_TRUE(canWrite(kUser, 77)) << "a group without a name";
    EXPECT_TRUE(canWrite(77, 77)) << "a user without a name";
    EXPECT_TRUE(canWrite(kUser, 1001)) << "somebody else's group";
    EXPECT_TRUE(canWrite(1001, 1001)) << "not the group that the user has";
    EXPECT_TRUE(canWrite(0, 0));
    EXPECT_FALSE(canWrite(kUser, 100, 0755));
}

// As on hosts that give every user a group of his own and a umask of 002.
HOST_TEST(OthersCanWrite, IsNotSaidOfAUsersOwnGroup) {
    layOut(host);
    EXPECT_FALSE(canWrite(kUser, kUser));
    layOut(host, "mia");
    EXPECT_FALSE(canWrite(kUser, kUser));
    layOut(host, "mia,ben");
    EXPECT_TRUE(canWrite(kUser, kUser));
    layOut(host, "", "eve:x:1002:1000::/home/eve:/bin/sh\n");
    EXPECT_TRUE(canWrite(kUser, kUser));
}

HOST_TEST(OthersCanWrite, WhereAnAccessListGrantsIt) {
    layOut(host);
    // Version 2; the owner, a user by number, the group, the mask and the others.
    constexpr std::array<unsigned char, 44> kList = {
        2, 0, 0,    0,    1,    0,    7,    0, 0xff, 0xff, 0xff, 0xff, 2,    0,    7,
        0, 0, 0,    0,    0,    4,    0,    5, 0,    0xff, 0xff, 0xff, 0xff, 0x10, 0,
        7, 0, 0xff, 0xff, 0xff, 0xff, 0x20, 0, 5,    0,    0xff, 0xff, 0xff, 0xff};
    if (setxattr("/srv", "system.posix_acl_access", kList.data(), kList.size(), 0) != 0) {
        GTEST_SKIP() << "a file system without access lists";
    }
    EXPECT_TRUE(canWrite(kUser, kUser));
}

HOST_TEST(TheSystem, IsRootAndNotTheUserNobody) {
    EXPECT_TRUE(isTheSystem(0));
    EXPECT_FALSE(isTheSystem(kUser));
    host.remove("/proc/self");
    host.file("/proc/self/uid_map", "         0          0 4294967295\n");
    EXPECT_FALSE(isTheSystem(kNobodysId));
}

HOST_TEST(TheSystem, InAUsersContainerHasNoNumber) {
    host.remove("/proc/self");
    host.file("/proc/self/uid_map", "         0       1000          1\n         1     100000      65536\n");
    EXPECT_TRUE(isTheSystem(kNobodysId));
    EXPECT_FALSE(isTheSystem(kUser));
}

}  // namespace
