// File systems: where they are mounted, what may be asked for their room, and what lies on them.
#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <fstream>

#include "plugins/hardware/storage/mounts.h"
#include "plugins/hardware/storage/own_devices.h"
#include "plugins/hardware/storage/storage.h"
#include "tests/hardware/storage_host.h"

namespace {

using hardware::Class;
using hardware::DeviceAccess;
using hardware::DeviceFile;
using hardware::Room;
using hardware_test::factsOf;
using hardware_test::StorageHost;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::Pair;
using testing::UnorderedElementsAre;

constexpr const char* kMounts = "/proc/1/mountinfo";

void addDrive(const StorageHost& host) {
    host.block("sda", "pci0/ata1/host0/target0:0:0/0:0:0:0", "8:0");
    host.partition("sda", "sda1", "8:1");
    host.file("/proc/1/root/", "");
    host.devices->space = [](const auto&) { return Room{1000, 400}; };
}

TEST(Mounts, ARowIsTakenApart) {
    StorageHost host;
    host.file(kMounts,
              R"(36 35 98:0 /mnt1 /mnt\0402\012\134x rw,noatime master:1 shared:7 - ext3 /dev/ro\011ot rw
37 35 0:60 / /none rw - tmpfs  rw
38 35 0:61 / relative rw - tmpfs t rw
no row at all
39 35 0:62 /
40 35 0:63 / /\99\04 rw - x /\999 rw)");
    const auto found = hardware::mounts(host.asNobody());
    ASSERT_EQ(found.size(), 3U);
    EXPECT_EQ(found[0].where, "/mnt 2\n\\x");
    EXPECT_EQ(found[0].source, "/dev/ro\tot");
    EXPECT_EQ(found[0].number + " " + found[0].type + " " + found[0].id + " " + found[0].under,
              "98:0 ext3 36 35");
    EXPECT_EQ(found[1].source, "") << "a source without a name";
    EXPECT_EQ(found[2].where, "/\\99\\04");
}

TEST(Mounts, ThoseOfThisProcessWhereOthersCannotBeRead) {
    StorageHost host;
    host.file("/proc/self/mountinfo", "22 1 8:1 / /home rw - ext4 /dev/sda1 rw");
    EXPECT_EQ(hardware::mounts(host.asNobody()).size(), 1U);
    EXPECT_THAT(hardware::mounts(StorageHost().asNobody()), IsEmpty());
}

std::vector<std::string> roomsAskedFor(const std::string& mountinfo) {
    StorageHost host;
    addDrive(host);
    host.file(kMounts, mountinfo);
    const auto facts = factsOf(host.asRoot(), Class::fileSystem, "sda1");
    std::vector<std::string> asked = host.devices->asked();
    std::erase_if(asked, [](const std::string& one) { return !one.starts_with("room: "); });
    EXPECT_EQ(facts.contains("Free"), !asked.empty());
    return asked;
}

TEST(FileSystemRoom, IsAskedForWhereTheFirstProcessSeesIt) {
    EXPECT_THAT(roomsAskedFor("22 1 8:1 / / rw - ext4 /dev/root rw"), ElementsAre("room: /proc/1/root/"));
    EXPECT_THAT(roomsAskedFor("22 1 0:20 / / rw - tmpfs x rw\n23 22 8:1 / /a\\040b rw - ext4 /dev/sda1 rw"),
                ElementsAre("room: /proc/1/root/a b"));
}

TEST(FileSystemRoom, IsAskedForAmongItsOwnMountsWhereTheFirstProcessIsOutOfReach) {
    StorageHost host;
    addDrive(host);
    host.remove("/proc/1/root");
    host.file(kMounts, "22 1 8:1 / /srv rw - ext4 /dev/sda1 rw");
    EXPECT_FALSE(factsOf(host.asRoot(), Class::fileSystem, "sda1").contains("Size"));
    host.file("/proc/self/mountinfo", "99 1 8:1 / /sandbox/srv rw - ext4 /dev/sda1 rw");
    const auto facts = factsOf(host.asRoot(), Class::fileSystem, "sda1");
    EXPECT_EQ(facts.at("Size") + " " + facts.at("Free") + " " + facts.at("MountPoints"), "1000 400 /srv");
    EXPECT_THAT(host.devices->asked(), Contains("room: /sandbox/srv"));
}

TEST(FileSystemRoom, IsNotAskedForThroughWhatLiesOverIt) {
    const std::string below = "22 1 0:20 / / rw - tmpfs x rw\n23 22 8:1 / /srv/data rw - ext4 /dev/sda1 rw\n";
    EXPECT_THAT(roomsAskedFor(below + "24 23 0:50 / /srv/data rw - nfs4 gone:/x rw"), IsEmpty());
    EXPECT_THAT(roomsAskedFor(below + "24 22 0:50 / /srv rw - nfs4 gone:/x rw"), IsEmpty());
    EXPECT_THAT(roomsAskedFor(below + "24 23 0:50 / /srv/data/inside rw - nfs4 gone:/x rw"),
                ElementsAre("room: /proc/1/root/srv/data"));
    EXPECT_THAT(roomsAskedFor(below + "24 22 0:50 / /srv/dat rw - nfs4 gone:/x rw"),
                ElementsAre("room: /proc/1/root/srv/data"));
}

TEST(FileSystemRoom, IsNotAskedForBehindAServer) {
    const std::string server = "22 1 0:20 / / rw - tmpfs x rw\n23 22 0:50 / /net rw - nfs gone:/x rw\n";
    EXPECT_THAT(roomsAskedFor(server + "24 23 8:1 / /net/disk rw - ext4 /dev/sda1 rw"), IsEmpty());
    EXPECT_THAT(roomsAskedFor(server + "24 23 8:1 / /net/disk rw - ext4 /dev/sda1 rw\n"
                                       "25 22 8:1 / /disk rw - ext4 /dev/sda1 rw"),
                ElementsAre("room: /proc/1/root/disk"));
}

TEST(FileSystemRoom, MountsThatStandOnOneAnotherInARingDoNoHarm) {
    EXPECT_THAT(roomsAskedFor("22 23 8:1 / /a rw - ext4 x rw\n23 22 8:1 / /a rw - ext4 x rw"),
                ElementsAre("room: /proc/1/root/a"));
}

TEST(FileSystemRoom, OneThatHangsCostsNothingElse) {
    StorageHost host;
    addDrive(host);
    const auto gate = std::make_shared<hardware_test::Gate>();
    host.devices->space = [gate](const auto&) {
        gate->wait();
        return std::nullopt;
    };
    host.file(kMounts, "22 1 8:1 / /stuck rw - fuseblk /dev/sda1 rw");
    const auto facts = factsOf(host.asRoot(std::chrono::milliseconds(30)), Class::fileSystem, "sda1");
    EXPECT_EQ(facts.at("MountPoints"), "/stuck");
    EXPECT_FALSE(facts.contains("Size"));
    gate->open();
}

TEST(FileSystems, AUsersFileSystemThatNamesADriveIsNotOnIt) {
    StorageHost host;
    addDrive(host);
    host.file(kMounts,
              "22 1 0:77 / /home/u/x rw - fuse.x /dev/sda1 rw\n23 1 0:78 / /home/u/y rw - fuse /dev/sda1 rw");
    EXPECT_THAT(hardware::listFileSystems(host.asRoot()), IsEmpty());
    EXPECT_THAT(host.devices->asked(), IsEmpty()) << "nor is a drive that may sleep read for it";
}

TEST(FileSystems, WithUdevNoDeviceIsRead) {
    StorageHost host;
    addDrive(host);
    host.file("/sys/class/block/sda/queue/rotational", "0");
    host.file("/run/udev/data/b8:1",
              "E:ID_FS_TYPE=ext4\nE:ID_FS_USAGE=filesystem\nE:ID_FS_LABEL=a_b\nE:ID_FS_UUID=1");
    EXPECT_THAT(hardware::listFileSystems(host.asRoot()), ElementsAre("sda1"));
    EXPECT_THAT(
        factsOf(host.asRoot(), Class::fileSystem, "sda1"),
        UnorderedElementsAre(Pair("FileSystemType", "ext4"), Pair("Label", "a_b"), Pair("UUID", "1")));
    EXPECT_THAT(host.devices->asked(), IsEmpty());
}

DeviceAccess::Contents xfsOnPartitions(const DeviceFile& device) {
    return device.number == "8:1" ? DeviceAccess::Contents{{"TYPE", "xfs"},
                                                           {"USAGE", "filesystem"},
                                                           {"LABEL", "it"},
                                                           {"UUID", "7"}}
                                  : DeviceAccess::Contents{{"TYPE", "LVM2_member"}, {"USAGE", "raid"}};
}

TEST(FileSystems, WithoutUdevASolidStateDriveIsRead) {
    StorageHost host;
    addDrive(host);
    host.devices->inside = xfsOnPartitions;
    host.file("/sys/class/block/sda/queue/rotational", "0");
    EXPECT_THAT(hardware::listFileSystems(host.asRoot()), ElementsAre("sda1"));
    EXPECT_THAT(factsOf(host.asRoot(), Class::fileSystem, "sda1"),
                UnorderedElementsAre(Pair("FileSystemType", "xfs"), Pair("Label", "it"), Pair("UUID", "7")));
    EXPECT_THAT(host.devices->asked(), Contains("contents: /dev/sda1 8:1"));
}

TEST(FileSystems, WithoutUdevATurningDriveIsReadWhileItIsMounted) {
    StorageHost host;
    addDrive(host);
    host.devices->inside = xfsOnPartitions;
    host.file("/sys/class/block/sda/queue/rotational", "1");
    EXPECT_THAT(hardware::listFileSystems(host.asRoot()), IsEmpty());
    EXPECT_THAT(host.devices->asked(), IsEmpty());
    host.file(kMounts, "22 1 8:1 / / rw - xfs /dev/sda1 rw");
    EXPECT_EQ(factsOf(host.asRoot(), Class::fileSystem, "sda1").at("Label"), "it");
}

TEST(FileSystems, ADriveThatTheKernelLetsSleepIsNotRead) {
    StorageHost host;
    addDrive(host);
    host.file("/sys/class/block/sda/queue/rotational", "0");
    host.file("/sys/class/block/sda/device/power/runtime_status", "suspended");
    host.file(kMounts, "22 1 8:1 / / rw - xfs /dev/sda1 rw");
    EXPECT_EQ(factsOf(host.asRoot(), Class::fileSystem, "sda1").at("FileSystemType"), "xfs");
    hardware::listFileSystems(host.asRoot());
    EXPECT_THAT(host.devices->asked(), Not(Contains(HasSubstr("contents"))));
}

/// A swap area: the smallest thing that libblkid knows.
std::string swapImage() {
    constexpr std::size_t kPage = 4096;
    std::string image(16 * kPage, '\0');
    image[1024] = 1;   // version
    image[1028] = 15;  // last page
    image.replace(1036, 16, "0123456789abcdef");
    image.replace(1052, 9,
                  "ex\x1b"
                  "mple 1");
    image.replace(kPage - 10, 10, "SWAPSPACE2");
    const std::string path =
        std::filesystem::temp_directory_path() / ("swap-image-" + std::to_string(getpid()));
    std::ofstream(path) << image;
    return path;
}

TEST(Contents, LibblkidTellsWhatLiesInAnImage) {
    void* const library = dlopen("libblkid.so.1", RTLD_NOW);
    if (library == nullptr) {
        GTEST_SKIP() << "this host has no libblkid for a program of " << sizeof(void*) * 8 << " bits";
    }
    dlclose(library);
    const std::string path = swapImage();
    const int image = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const auto contents = hardware::probe(image);
    close(image);
    std::filesystem::remove(path);
    EXPECT_THAT(contents,
                UnorderedElementsAre(Pair("TYPE", "swap"), Pair("USAGE", "other"), Pair("LABEL", "ex?mple 1"),
                                     Pair("UUID", "30313233-3435-3637-3839-616263646566")));
}

TEST(Contents, WhatIsNoFileSystemTellsNothing) {
    const int nothing = open("/dev/null", O_RDONLY | O_CLOEXEC);
    EXPECT_THAT(hardware::probe(nothing), IsEmpty());
    close(nothing);
    EXPECT_THAT(hardware::probe(-1), IsEmpty());
}

TEST(OwnDevices, AFileOfAnotherSortOrNumberIsNotOpened) {
    const auto isOpen = [](const DeviceFile& file) { return hardware::OpenDevice(file).isOpen(); };
    constexpr auto kCharacter = DeviceFile::Sort::character;
    EXPECT_TRUE(isOpen({"/dev/null", "1:3", "", kCharacter}));
    EXPECT_FALSE(isOpen({"/dev/null", "1:5", "", kCharacter}));
    EXPECT_FALSE(isOpen({"/dev/null", "1:3", ""}));
    EXPECT_FALSE(isOpen({"/dev/stdin", "1:3", "", kCharacter})) << "a link";
    EXPECT_FALSE(isOpen({"/nowhere", "1:3", "", kCharacter}));
    EXPECT_FALSE(hardware::ownDevices()->nvmeLog({"/dev/null", "1:3", "", kCharacter}, 2, 512));
    EXPECT_FALSE(hardware::ownDevices()->scsi({"/dev/null", "1:3", "", kCharacter}, {3, 0, 0, 0, 18, 0}, 18));
}

TEST(OwnDevices, RoomIsWhatStatvfsSays) {
    const auto room = hardware::ownDevices()->room("/");
    ASSERT_TRUE(room);
    EXPECT_GT(room->size.value_or(0), room->free.value_or(0));
    EXPECT_FALSE(hardware::ownDevices()->room("/nowhere/at/all"));
    EXPECT_FALSE(hardware::ownDevices()->room("/proc")) << "one without blocks";
}

}  // namespace
