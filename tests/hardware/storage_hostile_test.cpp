// Storage on hosts that are not as they should be: devices that go, numbers that no one can count to, links
// that lead in rings, and more of everything than usual.
#include <gmock/gmock.h>

#include <ctime>

#include "plugins/hardware/storage/storage.h"
#include "tests/hardware/storage_host.h"

namespace {

using hardware::Class;
using hardware_test::factsOf;
using hardware_test::StorageHost;
using testing::Each;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr const char* kBus = "pci0/ata1/host0/target0:0:0/0:0:0:0";

TEST(HostileStorage, ADeviceThatGoesAfterItWasListedHasNoFacts) {
    StorageHost host;
    host.block("sda", kBus, "8:0");
    host.partition("sda", "sda1", "8:1");
    host.file("/sys/class/block/md0/md/level", "raid1");
    host.file("/sys/class/block/dm-0/dm/name", "x");
    host.file("/proc/1/mountinfo", "22 1 8:1 / / rw - ext4 /dev/sda1 rw");
    const hardware::Host seen = host.asRoot();
    ASSERT_THAT(hardware::listDrives(seen), ElementsAre("sda"));
    ASSERT_THAT(hardware::listPartitions(seen), ElementsAre("sda1"));
    ASSERT_THAT(hardware::listFileSystems(seen), ElementsAre("sda1"));
    ASSERT_THAT(hardware::listArrays(seen), ElementsAre("md0"));
    ASSERT_THAT(hardware::listMappings(seen), ElementsAre("dm-0"));
    host.remove("/sys");
    EXPECT_THAT(factsOf(seen, Class::drive, "sda"), IsEmpty());
    EXPECT_THAT(factsOf(seen, Class::partition, "sda1"), IsEmpty());
    EXPECT_THAT(factsOf(seen, Class::fileSystem, "sda1"), IsEmpty());
    EXPECT_THAT(factsOf(seen, Class::array, "md0"), IsEmpty());
    EXPECT_THAT(factsOf(seen, Class::mapping, "dm-0"), IsEmpty());
    EXPECT_THAT(hardware::listDrives(seen), IsEmpty());
}

TEST(HostileStorage, NumbersThatNobodyCanCountToAreLeftOut) {
    StorageHost host;
    host.block("sda", kBus, "8:0", "36028797018963967");
    EXPECT_EQ(factsOf(host.asRoot(), Class::drive, "sda").at("Size"), "18446744073709551104");
    for (const char* size :
         {"36028797018963968", "18446744073709551615", "18446744073709551616", "-1", "", "1 2", "x"}) {
        host.file("/sys/class/block/sda/size", size);
        EXPECT_FALSE(factsOf(host.asRoot(), Class::drive, "sda").contains("Size")) << size;
    }
    host.file("/sys/class/block/sda/stat", "1 0 18446744073709551615 0 2 0 36028797018963967");
    EXPECT_FALSE(factsOf(host.asRoot(), Class::drive, "sda").contains("ReadBytes"));
    EXPECT_EQ(factsOf(host.asRoot(), Class::drive, "sda").at("WrittenBytes"), "18446744073709551104");
    host.file("/sys/class/block/sda/stat", "1 0 99999999999999999999 0 2 0 1");
    EXPECT_FALSE(factsOf(host.asRoot(), Class::drive, "sda").contains("Reads"));
}

TEST(HostileStorage, LinksThatLeadInRingsEnd) {
    StorageHost host;
    host.file("/sys/devices/virtual/block/dm-0/dm/name", "a");
    host.file("/sys/devices/virtual/block/dm-1/dm/name", "b");
    host.link("/sys/class/block/dm-0", "../../../sys/devices/virtual/block/dm-0");
    host.link("/sys/class/block/dm-1", "../../../sys/devices/virtual/block/dm-1");
    host.link("/sys/devices/virtual/block/dm-0/slaves/dm-1", "../../dm-1");
    host.link("/sys/devices/virtual/block/dm-1/slaves/dm-0", "../../dm-0");
    host.link("/sys/class/block/sdz", "sdz");
    host.link("/sys/class/block/sdy/device", "device");
    host.file("/sys/class/block/odd/partition", "1");
    host.link("/sys/class/block/odd/odd", "../odd");
    EXPECT_EQ(factsOf(host.asRoot(), Class::mapping, "dm-0").at("Members"), "dm-1");
    EXPECT_THAT(hardware::listDrives(host.asRoot()), IsEmpty());
    EXPECT_THAT(hardware::listPartitions(host.asRoot()), IsEmpty());
}

TEST(HostileStorage, APartitionOfAPartitionIsNone) {
    StorageHost host;
    host.block("sda", kBus, "8:0");
    host.partition("sda", "sda1", "8:1");
    host.partition("sda1", "sda1p1", "8:2");
    EXPECT_THAT(hardware::listPartitions(host.asRoot()), ElementsAre("sda1"));
}

TEST(HostileStorage, TextsAreMadePrintable) {
    StorageHost host;
    host.block("sda", kBus, "8:0");
    host.file("/sys/devices/" + std::string(kBus) + "/model", "  a\x1b]0;b\x07 \x7f ");
    host.file("/run/udev/data/b8:0",
              "E:ID_FS_USAGE=filesystem\nE:ID_FS_LABEL_ENC=\\x20\\x1b[2J\\x0a\\x20x\\x00\\x2\\xzz\\\nE:\nE:="
              "\nE\nQ:x=y");
    EXPECT_EQ(factsOf(host.asRoot(), Class::drive, "sda").at("Model"), "a?]0;b? ?");
    EXPECT_EQ(factsOf(host.asRoot(), Class::fileSystem, "sda").at("Label"), "?[2J? x?\\x2\\xzz\\");
}

TEST(HostileStorage, PagesOfAnyLengthTellNoMoreThanTheyHold) {
    StorageHost host;
    host.block("sda", kBus, "8:0");
    const std::string device = "/sys/devices/" + std::string(kBus);
    for (const std::string& page : {std::string(), std::string("\0\x80", 2), std::string("\0\x80\0\xff", 4),
                                    std::string("\0\x80\0\0serial", 10), std::string(1 << 20, '\0')}) {
        host.file(device + "/vpd_pg80", page);
        host.file(device + "/vpd_pg89", page.substr(0, 571));
        EXPECT_FALSE(factsOf(host.asRoot(), Class::drive, "sda").contains("Model"));
    }
    host.file(device + "/vpd_pg80", std::string("\0\x80\0\x04 abcdef", 11));
    EXPECT_EQ(factsOf(host.asRoot(), Class::drive, "sda").at("SerialNumber"), "abc");
}

TEST(HostileStorage, WaysToADriveThatTheKernelHidesAreNotTold) {
    StorageHost host;
    host.block("nvme0c0n1", "virtual/nvme0", "259:1");
    host.file("/sys/class/block/nvme0c0n1/hidden", "1");
    host.block("mmcblk0boot0", "platform/mmc0", "179:8");
    host.block("mmcblk0rpmb", "platform/mmc1", "179:16");
    EXPECT_THAT(hardware::listDrives(host.asRoot()), IsEmpty());
}

TEST(HostileStorage, TenThousandMountsAreReadAsFastAsTheyAreMany) {
    StorageHost host;
    std::string rows = "22 1 8:1 / / rw - ext4 /dev/sda1 rw\n";
    for (int number = 23; number < 10'023; ++number) {
        rows += std::to_string(number) + " 22 0:" + std::to_string(number) + " / /var/lib/containers/" +
                std::string(300, 'x') + std::to_string(number) +
                " rw,relatime - overlay overlay rw,lowerdir=" + std::string(200, 'y') + "\n";
    }
    for (int drive = 0; drive < 20; ++drive) {
        const std::string name = "vd" + std::string(1, static_cast<char>('a' + drive));
        host.block(name, "virtio" + std::to_string(drive), "253:" + std::to_string(drive));
        rows += std::to_string(20'000 + drive) + " 22 253:" + std::to_string(drive) + " / /" + name +
                " rw - ext4 /dev/" + name + " rw\n";
    }
    host.file("/proc/1/mountinfo", rows);
    const std::clock_t start = std::clock();
    EXPECT_EQ(hardware::listFileSystems(host.asRoot()).size(), 20U) << "those behind the first MiB are there";
    EXPECT_EQ(factsOf(host.asRoot(), Class::fileSystem, "vdt").at("MountPoints"), "/vdt");
    // Quadratic would be minutes; this takes some ten milliseconds.
    EXPECT_LT(std::clock() - start, 5 * CLOCKS_PER_SEC);
}

TEST(HostileStorage, ADriverThatWritesItsNamesWithSlashesHasItsOwnFiles) {
    StorageHost host;
    host.block("cciss!c0d0", "pci0/host0/target0:0:0/0:0:0:0", "104:0");
    host.devices->drive = [](const auto&) { return std::nullopt; };
    factsOf(host.asRoot(), Class::drive, "cciss!c0d0");
    EXPECT_THAT(host.devices->asked(), Each(HasSubstr("/dev/cciss/c0d0 104:0")));
    EXPECT_THAT(host.devices->asked(), Not(IsEmpty()));
}

}  // namespace
