#include "hosttools/disks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/hosttools/disk_image.h"
#include "tests/hosttools/host_tree.h"
#include "tests/support/texts_are.h"

namespace hosttools {
namespace {

using testing::IsEmpty;

std::vector<std::string> names(const std::vector<Disk>& disks) {
    std::vector<std::string> found;
    for (const Disk& disk : disks) found.push_back(disk.name);
    return found;
}

TEST(Disks, InAnOrderOfTheirOwn) {
    const HostTree tree("many");
    EXPECT_THAT(names(listDisks(tree.root())),
                TextsAre("cciss/c0d0", "hda", "mmcblk0", "sda", "sdb", "sdz", "sdaa", "vdb"));
}

TEST(Disks, EmptyDrivesAndHiddenPathsAreLeftOut) {
    EXPECT_THAT(names(listDisks(HostTree("removable").root())), TextsAre("sdb"));
    EXPECT_THAT(names(listDisks(HostTree("gpt").root())), TextsAre("nvme0n1", "sda"));
}

TEST(Disks, AHostWithoutSysfsHasNone) {
    EXPECT_THAT(listDisks("/nonexistent"), IsEmpty());
}

TEST(Disks, WhatUdevKnowsIsNotReadFromTheDisk) {
    HostTree tree("dos_logical");
    DiskImage other(2);
    other.identify(0xffffffff);
    other.entry(0, 0, 0x07, 63, 208783);
    tree.addBytes("dev/sda", other.bytes());
    const std::vector<Disk> disks = listDisks(tree.root());
    ASSERT_EQ(disks.size(), 1u);
    EXPECT_EQ(disks[0].identifier, 0x000d1f39u);
    EXPECT_EQ(disks[0].partitions[0].entry.type, 0x83);
    EXPECT_TRUE(disks[0].partitions[0].entry.active);
}

constexpr const char* kPartition =
    "sys/block/sda/dev 8:0\nsys/block/sda/size 204800\n"
    "sys/block/sda/sda1/dev 8:1\nsys/block/sda/sda1/partition 1\n"
    "sys/block/sda/sda1/start 63\nsys/block/sda/sda1/size 1000\n";

DiskImage imageOfPartition() {
    DiskImage image(2);
    image.identify(0xabcdef01);
    image.entry(0, 0, 0x8e, 63, 1000, true);
    return image;
}

TEST(Disks, WithoutUdevTheTableIsRead) {
    HostTree tree;
    tree.add(kPartition);
    tree.addBytes("dev/sda", imageOfPartition().bytes());
    const Disk disk = listDisks(tree.root()).at(0);
    EXPECT_EQ(disk.scheme, PartitionScheme::dos);
    EXPECT_EQ(disk.identifier, 0xabcdef01u);
    EXPECT_EQ(disk.partitions.at(0).entry.type, 0x8e);
    EXPECT_TRUE(disk.partitions.at(0).entry.active);
}

TEST(Disks, AUdevRecordOfAnEarlierLayoutIsNotBelieved) {
    HostTree tree;
    tree.add(kPartition);
    tree.add(
        "run/udev/data/b8:0 E:ID_PART_TABLE_TYPE=dos\nrun/udev/data/b8:1 E:ID_PART_ENTRY_SCHEME=dos\n"
        "run/udev/data/b8:1 E:ID_PART_ENTRY_TYPE=0x83\nrun/udev/data/b8:1 E:ID_PART_ENTRY_OFFSET=2048\n");
    tree.addBytes("dev/sda", imageOfPartition().bytes());
    EXPECT_EQ(listDisks(tree.root()).at(0).partitions.at(0).entry.type, 0x8e);
}

TEST(Disks, ASleepingDiskIsNotOpened) {
    HostTree tree;
    tree.add(kPartition);
    tree.add("sys/block/sda/device/power/runtime_status suspended\n");
    tree.addBytes("dev/sda", imageOfPartition().bytes());
    const Disk disk = listDisks(tree.root()).at(0);
    EXPECT_EQ(disk.identifier, 0u);
    EXPECT_EQ(disk.partitions.at(0).sectors, 1000u);
    EXPECT_EQ(disk.partitions.at(0).entry.type, 0);
}

TEST(Disks, AMapperDeviceIsNotOpened) {
    HostTree tree;
    tree.add("sys/block/dm-0/dev 253:0\nsys/block/dm-0/size 204800\n");
    tree.addBytes("dev/dm-0", imageOfPartition().bytes());
    EXPECT_EQ(listDisks(tree.root()).at(0).scheme, PartitionScheme::none);
}

TEST(Disks, WithoutUdevAGuidTableIsRecognised) {
    HostTree tree;
    tree.add(kPartition);
    DiskImage image(2);
    image.entry(0, 0, 0xee, 1, 204799);
    image.text(1, "EFI PART");
    tree.addBytes("dev/sda", image.bytes());
    const Disk disk = listDisks(tree.root()).at(0);
    EXPECT_EQ(disk.scheme, PartitionScheme::gpt);
    EXPECT_EQ(disk.partitions.at(0).entry.type, gptType);
}

TEST(Disks, AnUnreadableDiskIsStillListed) {
    HostTree tree;
    tree.add(kPartition);
    const Disk disk = listDisks(tree.root()).at(0);
    EXPECT_EQ(disk.sectors, 204800u);
    EXPECT_EQ(disk.logicalSize, 512u);
    EXPECT_EQ(disk.partitions.at(0).name, "sda1");
}

}  // namespace
}  // namespace hosttools
