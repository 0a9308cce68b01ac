// A pass of the drive monitor: snapshot, fingerprints, comparison, and what is built anew.
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <functional>
#include <thread>

#include "agent/shell/runner.h"
#include "mi/disk_snapshot.h"
#include "mi/globals.h"
#include "mi/node_types.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/storage/storage_host.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using Access = IC::OsHwMITestAccess;

const std::string kSnapshot = "fdisk -ls 2>/dev/null > /tmp/fdisk_tmp";
const std::string kDriveMd5 = "cat /tmp/fdisk_tmp | grep ^Disk |md5sum |awk '{print $1}'";
const std::string kDriveSha1 = "cat /tmp/fdisk_tmp | grep ^Disk |sha1sum |awk '{print $1}'";
const std::string kPartitionMd5 = "cat /tmp/fdisk_tmp | grep ^/dev |md5sum |awk '{print $1}'";
const std::string kPartitionSha1 = "cat /tmp/fdisk_tmp | grep ^/dev |sha1sum |awk '{print $1}'";

const std::string kDisk = "Disk /dev/sda: 80.0 GB, 80026361856 bytes\n";
const std::string kFirst = "/dev/sda1   *           1          13      104391   83  Linux\n";
const std::string kSecond = "/dev/sda2              14        1288    10241437+  83  Linux\n";
const std::string kLayout = kDisk + kFirst;
const std::string kDiskMd5 = "e63cb20a64a37eea14605a6b34421272";
const std::string kDiskSha1 = "f8ed562930176188860b15a5e93af7042f17d042";
const std::string kFirstMd5 = "2ed0b4a29505d32d645577847dbbe12b";
const std::string kFirstSha1 = "fd1f5f57717ef5ece8cd45e1e7c3b9f1b847df6c";

/// What a tool does to the shell that runs its pipeline.
const std::string kKillTheShell = "read -r _ _ _ shell _ < /proc/$PPID/stat; kill -KILL $shell";

const std::vector<std::string> kComparison = {kSnapshot, kDriveMd5, kDriveSha1, kPartitionMd5,
                                              kPartitionSha1};

class LayoutComparison : public StorageHost {
protected:
    /// A pass over this layout; the commands, the diary are those of this pass alone.
    static void pass(FakeHost& host, const std::string& layout) {
        host.tool("fdisk -ls", layout);
        clearCommands();
        diary().clear();
        IC::myoshwmi.HDDThreadProcess();
    }
    static void startWith(FakeHost& host, const std::string& layout) {
        host.file(IC::diskSnapshotPath, layout);
        IC::myoshwmi.createHardDriveNodes(false);
        IC::myoshwmi.createPartitionNodes(false);
        pass(host, layout);
    }
};

HOST_TEST_F(LayoutComparison, TheFirstPassAlwaysRebuildsBothKinds) {
    LogCapture log;
    startWith(host, kLayout);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "withdrawn /dev/sda1",
                                  "published /dev/sda1"));
    EXPECT_THAT(log.messages(), Contains("Hard Drive Check Sum found Different"));
    EXPECT_THAT(log.messages(), Contains("Partition Check Sum found Different"));
}

HOST_TEST_F(LayoutComparison, ADifferenceIsToldOfWhenItsNodesAreBuilt) {
    LogCapture log;
    pass(host, kLayout);
    std::vector<std::string> steps = log.messages();
    std::erase_if(steps, [](const std::string& message) {
        return message.find("create") != 0 && message.find("found Different") == std::string::npos;
    });
    EXPECT_THAT(steps, TextsAre("createHardDriveNodes: entry", "createHardDriveNodes: exit",
                                "Hard Drive Check Sum found Different", "createPartitionNodes: entry",
                                "createPartitionNodes: exit", "Partition Check Sum found Different"));
    EXPECT_EQ(log.messages(3000), log.messages());
}

HOST_TEST_F(LayoutComparison, AnUnchangedLayoutTouchesNothing) {
    startWith(host, kLayout);
    const auto drivesBefore = drives();
    LogCapture log;
    pass(host, kLayout);
    EXPECT_THAT(diary(), IsEmpty());
    EXPECT_EQ(commands(), kComparison);
    EXPECT_THAT(log.messages(),
                TextsAre("Hard Drive ThreadProcess :: Entry", "Hard Drive Check Sum : Entry",
                         "cond ::Hard Drive Check Sum : MD5 :: " + kDiskMd5,
                         "cond ::Hard Drive Check Sum : SHA1 :: " + kDiskSha1, "Hard Drive Check Sum : Exit",
                         "Partition Check Sum : Entry", "cond ::Partition Check Sum : MD5 :: " + kFirstMd5,
                         "cond ::Partition Check Sum : SHA1 :: " + kFirstSha1, "Partition Check Sum : Exit",
                         "Hard Drive ThreadProcess :: Exit"));
    EXPECT_EQ(log.messages(3000), log.messages());
    EXPECT_EQ(log.lines().back().function, "HDDThreadProcess");
    EXPECT_EQ(drives(), drivesBefore);
}

HOST_TEST_F(LayoutComparison, ASnapshotThatIsNotWholeTouchesNothing) {
    cvagent::shell::leaveAllToShell(true);  // one is killed here
    startWith(host, kLayout);
    LogCapture log;
    pass(host, "Disk /dev/sdb: 80");
    EXPECT_THAT(diary(), IsEmpty());
    pass(host, kDisk + "Disk /dev/sdb: 80.0 GB, 1000000 byt");
    EXPECT_THAT(diary(), IsEmpty());
    EXPECT_THAT(commands(), ElementsAre(kSnapshot));
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = "echo 'Disk /dev/sdb: 8'; " + kKillTheShell});
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_THAT(diary(), IsEmpty());
    EXPECT_THAT(log.messages(6000), IsEmpty());
    host.fullDisk("/tmp");
    pass(host, kLayout + kSecond);
    EXPECT_THAT(diary(), IsEmpty());
    host.restore("/tmp");
    pass(host, kLayout + kSecond);
    EXPECT_EQ(partitions().size(), 2U);
}

HOST_TEST_F(LayoutComparison, ASnapshotThatIsWholeCountsHoweverItsToolEnded) {
    startWith(host, kLayout);
    for (const int status : {1, 130, 137, 192}) {
        const std::string layout = kLayout + "Disk /dev/sdb: 80.0 GB, " + std::to_string(status) + " bytes\n";
        host.tool("fdisk -ls", layout, status);
        diary().clear();
        IC::myoshwmi.HDDThreadProcess();
        EXPECT_THAT(diary(), Contains("published /dev/sdb")) << status;
    }
}

HOST_TEST_F(LayoutComparison, AFullDiskDoesNotMatterToASnapshotThatIsWhole) {
    startWith(host, kLayout);
    ASSERT_EQ(mount("small", "/tmp", "tmpfs", MS_NOSUID | MS_NODEV, "size=64k"), 0);
    const std::string listing = "printf '" + kLayout + kSecond + "'";
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = listing + "; cat /dev/zero > /tmp/full"});
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_EQ(partitions().size(), 2U);
    EXPECT_NE(host.read("/tmp/full"), "");
}

// Whoever can write into /tmp was there first.
HOST_TEST_F(LayoutComparison, WhatStandsInThePlaceOfTheSnapshotMakesWay) {
    const std::string other = "Disk /dev/sdx: 80.0 GB, 1000000 bytes\n";
    const std::function<void()> places[] = {
        [&] { host.symlink(IC::diskSnapshotPath, "/etc/secret"); },
        [] { EXPECT_EQ(mkfifo(IC::diskSnapshotPath, 0666), 0); },
        [] { EXPECT_EQ(link("/etc/secret", IC::diskSnapshotPath), 0); },
        [&] { host.directory(IC::diskSnapshotPath); },
        [&] {
            host.file(IC::diskSnapshotPath, other, 0444);
            [[maybe_unused]] const bool isHis = host.giveToStranger(IC::diskSnapshotPath);
        },
    };
    host.file("/etc/secret", "root's");
    startWith(host, kLayout);
    for (std::size_t place = 0; place < std::size(places); ++place) {
        SCOPED_TRACE(place);
        host.remove(IC::diskSnapshotPath);
        places[place]();
        pass(host, kLayout + (place % 2 == 0 ? kSecond : ""));
        EXPECT_EQ(host.read("/etc/secret"), "root's");
        EXPECT_EQ(drives().size(), 1U);
        EXPECT_EQ(partitions().size(), place % 2 == 0 ? 2U : 1U);
    }
}

HOST_TEST_F(LayoutComparison, ADirectoryInThePlaceOfTheSnapshotWithdrawsNothing) {
    startWith(host, kLayout);
    host.remove(IC::diskSnapshotPath);
    host.file(std::string(IC::diskSnapshotPath) + "/in-the-way", "");
    LogCapture log;
    pass(host, kLayout);
    EXPECT_THAT(commands(), IsEmpty());
    EXPECT_THAT(diary(), IsEmpty());
    EXPECT_THAT(log.messages(),
                TextsAre("Hard Drive ThreadProcess :: Entry", "Hard Drive ThreadProcess :: Exit"));
}

HOST_TEST_F(LayoutComparison, ASnapshotThatIsNotOursIsNotRead) {
    host.file("/etc/secret", kLayout);
    host.symlink(IC::diskSnapshotPath, "/etc/secret");
    LogCapture log;
    IC::myoshwmi.HardDrive_Checksum(true);
    EXPECT_THAT(log.messages(),
                TextsAre("Hard Drive Check Sum : Entry", "cond ::Hard Drive Check Sum : MD5 :: ",
                         "cond ::Hard Drive Check Sum : SHA1 :: ", "Hard Drive Check Sum : Exit"));
    IC::myoshwmi.createHardDriveNodes(false);
    IC::myoshwmi.createPartitionNodes(false);
    EXPECT_THAT(commands(), IsEmpty());
    EXPECT_THAT(drives(), IsEmpty());
    EXPECT_THAT(partitions(), IsEmpty());
    EXPECT_THAT(log.messages(6000), IsEmpty()) << "as if the commands had printed nothing";
}

HOST_TEST_F(LayoutComparison, TheSnapshotIsMadeAnewUnderTheFileLock) {
    host.tool("fdisk -ls", kLayout);
    host.file(IC::diskSnapshotPath, "the last one");
    ASSERT_TRUE(IC::OSHWMI::myfileLock.lock(0));
    std::thread monitor([] { IC::myoshwmi.HDDThreadProcess(); });
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_EQ(host.read(IC::diskSnapshotPath), "the last one");
    IC::OSHWMI::myfileLock.unlock();
    monitor.join();
    EXPECT_EQ(host.read(IC::diskSnapshotPath), kLayout);
}

HOST_TEST_F(LayoutComparison, EveryCommandIsStartedUnderTheFileLock) {
    std::vector<bool> locked;
    shell_stub::beforeEach([&](const std::string&) { locked.push_back(fileLockIsHeld()); });
    pass(host, kLayout);
    // The comparison, the listing of the drives with two questions, that of the partitions with one.
    EXPECT_EQ(locked, std::vector<bool>(kComparison.size() + 5, true));
    EXPECT_FALSE(fileLockIsHeld());
}

HOST_TEST_F(LayoutComparison, AnAddedPartitionRebuildsThePartitionsAlone) {
    startWith(host, kLayout);
    const auto drivesBefore = drives();
    LogCapture log;
    pass(host, kLayout + kSecond);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda1", "published /dev/sda1", "published /dev/sda2"));
    EXPECT_EQ(drives(), drivesBefore);
    EXPECT_THAT(commands(), Not(Contains("cat /tmp/fdisk_tmp | grep ^Disk")));
    EXPECT_THAT(log.messages(), Not(Contains("Hard Drive Check Sum found Different")));
    EXPECT_THAT(log.messages(), Contains("Partition Check Sum found Different"));
    pass(host, kLayout + kSecond);
    EXPECT_THAT(diary(), IsEmpty());
}

HOST_TEST_F(LayoutComparison, ARemovedDiskTakesItsDriveAndItsPartitions) {
    const std::string other = "Disk /dev/sdb: 80.0 GB, 1000000 bytes\n";
    const std::string its = "/dev/sdb1 1 2 300 83 Linux\n";
    startWith(host, kLayout + other + its);
    pass(host, kLayout);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "withdrawn /dev/sdb", "published /dev/sda",
                                  "withdrawn /dev/sda1", "withdrawn /dev/sdb1", "published /dev/sda1"));
    EXPECT_EQ(drives().size(), 1U);
    EXPECT_EQ(partitions().size(), 1U);
}

HOST_TEST_F(LayoutComparison, ADiskWithoutPartitionsRebuildsTheDrivesAlone) {
    startWith(host, kLayout);
    pass(host, kLayout + "Disk /dev/sdb: 80.0 GB, 1000000 bytes\n");
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda", "published /dev/sdb"));
    EXPECT_EQ(partitions().size(), 1U);
}

HOST_TEST_F(LayoutComparison, LinesThatDescribeNoDeviceDoNotCount) {
    startWith(host, kLayout);
    pass(host, "255 heads, 63 sectors/track\n" + kLayout + "\nUnits = cylinders of 16065 * 512\n");
    EXPECT_THAT(diary(), IsEmpty());
}

HOST_TEST_F(LayoutComparison, AMissingFdiskLooksLikeAHostWithoutDisks) {
    startWith(host, kLayout);
    host.toolMissing("fdisk");
    diary().clear();
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_EQ(host.read(IC::diskSnapshotPath), "");
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "withdrawn /dev/sda1"));
}

HOST_TEST_F(LayoutComparison, ASnapshotThatCannotBeTakenSkipsThePass) {
    startWith(host, kLayout);
    shell_stub::failWhen([](const std::string& command) { return command == kSnapshot; });
    LogCapture log;
    pass(host, "");
    EXPECT_THAT(commands(), ElementsAre(kSnapshot));
    EXPECT_THAT(diary(), IsEmpty());
    EXPECT_THAT(log.messages(),
                TextsAre("Hard Drive ThreadProcess :: Entry", "Hard Drive ThreadProcess :: Exit"));
    shell_stub::failWhen({});
    pass(host, "");
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "withdrawn /dev/sda1")) << "retried by the next";
}

HOST_TEST_F(LayoutComparison, ASnapshotThatCannotBeWrittenSkipsThePass) {
    startWith(host, kLayout);
    host.remove(IC::diskSnapshotPath);
    host.readOnly("/tmp");
    LogCapture log;
    pass(host, kLayout);
    EXPECT_THAT(diary(), IsEmpty());
    EXPECT_THAT(commands(), IsEmpty()) << "it has no file to write";
    EXPECT_THAT(log.messages(),
                TextsAre("Hard Drive ThreadProcess :: Entry", "Hard Drive ThreadProcess :: Exit"));
    host.restore("/tmp");
    pass(host, kLayout + kSecond);
    EXPECT_EQ(partitions().size(), 2U) << "retried by the next";
}

HOST_TEST_F(LayoutComparison, WithoutMd5sumChangesAreFoundBySha1Alone) {
    host.remove("/usr/bin/md5sum");
    LogCapture log;
    startWith(host, kLayout);
    EXPECT_THAT(log.messages(), Contains("cond ::Hard Drive Check Sum : MD5 :: "));
    EXPECT_THAT(log.messages(), Contains("cond ::Hard Drive Check Sum : SHA1 :: " + kDiskSha1));
    EXPECT_EQ(diary().size(), 4U);
    pass(host, kLayout);
    EXPECT_THAT(diary(), IsEmpty());
    pass(host, kLayout + kSecond);
    EXPECT_EQ(partitions().size(), 2U);
}

HOST_TEST_F(LayoutComparison, AFingerprintThatFailsCountsAsAChangeOnce) {
    startWith(host, kLayout);
    pass(host, kLayout);
    shell_stub::failWhen([](const std::string& command) { return command == kDriveMd5; });
    LogCapture log;
    pass(host, kLayout);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda"));
    EXPECT_EQ(Access::driveFingerprints().md5.reference, "");
    EXPECT_EQ(Access::driveFingerprints().sha1.reference, kDiskSha1);
    EXPECT_THAT(log.messages(), Not(Contains(testing::HasSubstr("Hard Drive Check Sum : MD5"))));
    EXPECT_THAT(log.messages(6000), IsEmpty());
    pass(host, kLayout);
    EXPECT_THAT(diary(), IsEmpty()) << "the empty value is the reference now";
    shell_stub::failWhen({});
    pass(host, kLayout);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda", "published /dev/sda")) << "and back again once";
}

HOST_TEST_F(LayoutComparison, AFingerprintThatIsCutOffFailsLikeAnyOther) {
    startWith(host, kLayout);
    for (const std::string& end : {kKillTheShell, std::string("kill -KILL $PPID")}) {
        host.tool("awk %any", ToolAnswer{.out = "", .action = end});
        pass(host, kLayout);
        EXPECT_EQ(diary().size(), 4U) << "both kinds are built anew";
        EXPECT_EQ(Access::driveFingerprints().md5.reference, "");
        pass(host, kLayout);
        EXPECT_THAT(diary(), IsEmpty()) << "nothing known is the reference now";
        host.remove("/tools/awk");
        pass(host, kLayout);
        EXPECT_EQ(diary().size(), 4U);
    }
}

HOST_TEST_F(LayoutComparison, ARebuildThatIsCutOffIsMadeAgain) {
    startWith(host, kLayout);
    const std::string layout = kLayout + "Disk /dev/sdb: 80.0 GB, 1000000 bytes\n" + kSecond;
    host.tool("cut %any", ToolAnswer{.out = "", .action = kKillTheShell});
    LogCapture log;
    pass(host, layout);
    EXPECT_THAT(drives(), IsEmpty());
    EXPECT_THAT(log.messages(), Not(Contains(testing::EndsWith("found Different"))));
    host.realTool("cut");
    pass(host, layout);
    EXPECT_EQ(drives().size(), 2U);
    EXPECT_EQ(partitions().at(1).size, 10241437U);
    pass(host, layout);
    EXPECT_THAT(diary(), IsEmpty());
}

HOST_TEST_F(LayoutComparison, ComparedFingerprintsMoveToTheReference) {
    startWith(host, kLayout);
    EXPECT_EQ(Access::driveFingerprints().md5.reference, kDiskMd5);
    EXPECT_EQ(Access::driveFingerprints().md5.current, "");
    EXPECT_EQ(Access::driveFingerprints().sha1.reference, kDiskSha1);
    EXPECT_EQ(Access::driveFingerprints().sha1.current, "");
    EXPECT_EQ(Access::partitionFingerprints().md5.reference, kFirstMd5);
    EXPECT_EQ(Access::partitionFingerprints().sha1.reference, kFirstSha1);
    EXPECT_EQ(Access::partitionFingerprints().sha1.current, "");
}

HOST_TEST_F(LayoutComparison, TheFlagSaysWhereNewFingerprintsStay) {
    host.file(IC::diskSnapshotPath, kLayout);
    IC::myoshwmi.HardDrive_Checksum(true);
    IC::myoshwmi.Partition_Checksum(true);
    EXPECT_EQ(Access::driveFingerprints().md5.current, kDiskMd5);
    EXPECT_EQ(Access::driveFingerprints().md5.reference, "");
    EXPECT_EQ(Access::partitionFingerprints().sha1.current, kFirstSha1);
    IC::myoshwmi.HardDrive_Checksum(false);
    IC::myoshwmi.Partition_Checksum(false);
    EXPECT_EQ(Access::driveFingerprints().md5.current, "");
    EXPECT_EQ(Access::driveFingerprints().md5.reference, kDiskMd5);
    EXPECT_EQ(Access::partitionFingerprints().sha1.current, "");
    EXPECT_EQ(Access::partitionFingerprints().sha1.reference, kFirstSha1);
}

// fdisk can take long over a disk that has to spin up. Whoever reads the snapshot after it must find it
// whole.
HOST_TEST_F(LayoutComparison, ASlowFdiskIsWaitedForBeforeAnybodyReads) {
    host.tool("fdisk -ls", ToolAnswer{.out = kSecond, .action = "printf '" + kLayout + "'; sleep 0.4"});
    std::vector<std::string> torn;
    shell_stub::beforeEach([&](const std::string& command) {
        if (command != kSnapshot && host.read(IC::diskSnapshotPath) != kLayout + kSecond) {
            torn.push_back(command);
        }
    });
    IC::myoshwmi.HDDThreadProcess();
    EXPECT_GT(commands().size(), kComparison.size());
    EXPECT_THAT(torn, IsEmpty());
    EXPECT_EQ(drives().size(), 1U);
    EXPECT_EQ(partitions().size(), 2U);
}

HOST_TEST_F(LayoutComparison, AtStartTheBuildersFindTheSnapshotOfASlowFdiskWhole) {
    host.tool("fdisk -ls", ToolAnswer{.out = kSecond, .action = "printf '" + kLayout + "'; sleep 0.4"});
    EXPECT_TRUE(IC::takeDiskSnapshot());
    IC::myoshwmi.createHardDriveNodes(false);
    IC::myoshwmi.createPartitionNodes(false);
    EXPECT_EQ(drives().size(), 1U);
    EXPECT_EQ(partitions().size(), 2U);
}

HOST_TEST_F(LayoutComparison, TheLockIsFreeWhileFdiskWrites) {
    host.tool("fdisk -ls", ToolAnswer{.out = kLayout, .action = kUntilItMayGoOn});
    std::thread monitor([] { IC::myoshwmi.HDDThreadProcess(); });
    EXPECT_TRUE(fileLockIsFreeWhile(host, "fdisk"));
    monitor.join();
}

}  // namespace
