#include "agent/shell/mounts.h"

#include <gmock/gmock.h>

namespace {

using cvagent::shell::localMountOf;

constexpr const char* kMounts =
    "20 1 8:1 / / rw,relatime shared:1 - ext4 /dev/sda1 rw\n"
    "21 20 0:5 / /proc rw shared:2 - proc proc rw\n"
    "22 20 0:6 / /tmp rw - tmpfs tmpfs rw\n"
    "23 20 0:7 / /net rw shared:3 master:1 - nfs4 server:/ rw\n"
    "24 23 0:8 / /net/deep rw - tmpfs tmpfs rw\n"
    "25 20 0:9 / /my\\040disk rw - ext4 /dev/sdb1 rw\n"
    "26 20 0:10 / /twice rw - ext4 /dev/sdc1 rw\n"
    "27 26 0:11 / /twice rw - fuse.sshfs host: rw\n"
    "28 20 0:12 / /auto rw - autofs systemd-1 rw\n";

TEST(Mounts, TellOnWhichLocalFileSystemAPathLies) {
    EXPECT_EQ(localMountOf("/etc/hosts", kMounts), "/");
    EXPECT_EQ(localMountOf("/proc/net/dev", kMounts), "/proc");
    EXPECT_EQ(localMountOf("/tmp/a/b", kMounts), "/tmp");
    EXPECT_EQ(localMountOf("/tmpfile", kMounts), "/");
    EXPECT_EQ(localMountOf("/my disk/file", kMounts), "/my disk");
}

TEST(Mounts, KnowNothingOfWhatLiesElsewhere) {
    for (const char* path :
         {"/net/file", "/net/deep/file", "/twice/file", "/auto/x", "relative", "", "/tmp/../net/x"}) {
        EXPECT_EQ(localMountOf(path, kMounts), std::nullopt) << path;
    }
    for (const char* mounts : {"", "\n", "20 1 8:1 / /\n", "20 1 8:1 / / rw shared:1 -\n",
                               "20 1 8:1 / / rw - nfs server:/ rw\n"}) {
        EXPECT_EQ(localMountOf("/etc/hosts", mounts), std::nullopt) << mounts;
    }
}

}  // namespace
