// Partitions: given this snapshot, these nodes, after these commands, with these lines in the log.
#include "mi/disk_snapshot.h"
#include "mi/node_types.h"
#include "oshwmi/os_hw_mi.h"
#include "storage/storage_nodes.h"
#include "tests/storage/storage_host.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Access = IC::OsHwMITestAccess;

const std::string kBoot = "/dev/sda1   *           1          13      104391+  83  Linux";
const std::string kListing = "cat /tmp/fdisk_tmp | grep ^/dev";

std::string sizeCommand(const std::string& line) {
    return "echo \"" + line + "\" |  tr -s '*' ' '  | cut -d ' ' -f4";
}

void build(FakeHost& host, const std::string& snapshot, bool update = false) {
    host.file(IC::diskSnapshotPath, snapshot);
    IC::myoshwmi.createPartitionNodes(update);
}

/// What a block count becomes where a `long` has 32 bits.
unsigned long long told(unsigned long long blocks) {
    return sizeof(long) == 4 && blocks > 2147483647ULL ? 2147483647ULL : blocks;
}

class Partitions : public StorageHost {};

HOST_TEST_F(Partitions, APartitionHasItsPathTwiceAndItsBlocks) {
    build(host, kBoot + "\n");
    EXPECT_THAT(partitions(), ElementsAre(Seen{101, 1, "/dev/sda1", 104391}));
    const auto node = nodesOfType(IC::NodeType::partition).at(0);
    EXPECT_EQ(node->getLinkedId(), kControllerId);
    EXPECT_THAT(node->getMIIds(), ElementsAre(7));
    EXPECT_EQ(node->getStatus(), 1U);
    EXPECT_EQ(node->getDescription(), "Partition");
    std::map<unsigned int, IC::PropertyValue> stored;
    node->getProperties(stored);
    EXPECT_THAT(stored, ElementsAre(testing::Pair(89, IC::PropertyValue("/dev/sda1", true)),
                                    testing::Pair(108, IC::PropertyValue("/dev/sda1", true)),
                                    testing::Pair(112, IC::PropertyValue(IC::Number(104391ULL), true))));
}

HOST_TEST_F(Partitions, TheHostIsAskedOneCommandAtATimeUnderTheFileLock) {
    std::vector<bool> locked;
    shell_stub::beforeEach([&](const std::string&) { locked.push_back(fileLockIsHeld()); });
    const std::string plain = "/dev/sda2              14        1288    10241437+  83  Linux";
    build(host, kBoot + "\n" + plain + "\n");
    EXPECT_THAT(commands(), ElementsAre(kListing, sizeCommand(kBoot), sizeCommand(plain)));
    EXPECT_THAT(locked, ElementsAre(true, true, true));
}

HOST_TEST_F(Partitions, TheFirstBuildLogsEveryStep) {
    LogCapture log;
    build(host, kBoot + "\n");
    EXPECT_THAT(withoutPropertyLines(log.messages()),
                TextsAre("createPartitionNodes: entry", "DiskPartition::DiskPartition: entry",
                         "DiskPartition::DiskPartition: exit", "Partition blocksize : 104391",
                         "Partition blocksize in Uint64 : 104391", "createPartitionNodes: exit"));
    EXPECT_EQ(std::ranges::count(log.messages(), "DiskPartition::setProperty: entry"), 3);
    EXPECT_EQ(std::ranges::count(log.messages(), "DiskPartition::setProperty: exit"), 3);
    EXPECT_EQ(log.messages(3000), log.messages());
    EXPECT_EQ(log.lines().front().function, "createPartitionNodes");
}

HOST_TEST_F(Partitions, AnUpdateWithdrawsTheOldNodesAndPublishesTheNewOnesOneByOne) {
    build(host, kBoot + "\n");
    LogCapture log;
    build(host, "/dev/sdb1 1 2 300 83 Linux\n/dev/sdb2 3 4 500 83 Linux\n", true);
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda1", "published /dev/sdb1", "published /dev/sdb2"));
    EXPECT_THAT(partitions(), ElementsAre(Seen{102, 1, "/dev/sdb1", 300}, Seen{103, 2, "/dev/sdb2", 500}));
    const auto said = log.messages();
    EXPECT_THAT(said, testing::Contains("Delete a Partition entry: Partition").Times(1));
    EXPECT_THAT(said, testing::Contains("DiskPartition::~DiskPartition: entry").Times(1));
    EXPECT_THAT(said, testing::Contains("DiskPartition::~DiskPartition: exit").Times(1));
    EXPECT_THAT(said, testing::Contains("publishNode: entry").Times(2));
    EXPECT_THAT(said, testing::Contains("Partition Node Published").Times(2));
    EXPECT_EQ(log.messages(3000), log.messages());
}

HOST_TEST_F(Partitions, TheBootFlagDoesNotMoveTheSize) {
    build(host,
          "/dev/sda1   *           1          13      104391   83  Linux\n"
          "/dev/sda2               1          13      104391   83  Linux\n"
          "/dev/sda3 ** 1 13 104391 83 Linux\n");
    EXPECT_THAT(partitions(),
                ElementsAre(Seen{101, 1, "/dev/sda1", 104391}, Seen{102, 2, "/dev/sda2", 104391},
                            Seen{103, 3, "/dev/sda3", 104391}));
}

HOST_TEST_F(Partitions, ExtendedAndLogicalPartitionsAreListedLikeAnyOther) {
    build(host, listing("mbr_logical"));
    EXPECT_THAT(partitions(),
                ElementsAre(Seen{101, 1, "/dev/sda1", 104391}, Seen{102, 2, "/dev/sda2", 10241437},
                            Seen{103, 3, "/dev/sda3", 67802332}, Seen{104, 4, "/dev/sda5", 1052226},
                            Seen{105, 5, "/dev/sda6", 66750043}));
}

HOST_TEST_F(Partitions, EveryDeviceCounts) {
    build(host, listing("other_buses"));
    EXPECT_THAT(partitions(),
                ElementsAre(Seen{101, 1, "/dev/nvme0n1p1", 524288}, Seen{102, 2, "/dev/nvme0n1p2", 499582279},
                            Seen{103, 3, "/dev/vda1", 20970479}, Seen{104, 4, "/dev/mmcblk0p1", 15554048}));
    build(host, listing("raid_and_mapper") + listing("ide"), true);
    EXPECT_THAT(partitions(),
                ElementsAre(Seen{105, 1, "/dev/sda1", 488385536}, Seen{106, 2, "/dev/sdb1", 488385536},
                            Seen{107, 3, "/dev/hda1", 2096451}, Seen{108, 4, "/dev/hda2", 36981630}));
}

HOST_TEST_F(Partitions, TwoTebibytesAndMoreStayAtTheHostsLargestLong) {
    build(host, listing("gpt_large"));
    EXPECT_THAT(partitions(), ElementsAre(Seen{101, 1, "/dev/sda1", 204800},
                                          Seen{102, 2, "/dev/sda2", told(2930060743ULL)}));
    build(host, "/dev/sda1 1 2 2147483647+ ee GPT\n/dev/sda2 1 2 2147483648 ee GPT\n", true);
    EXPECT_EQ(partitions().at(0).size, 2147483647ULL);
    EXPECT_EQ(partitions().at(1).size, told(2147483648ULL));
}

HOST_TEST_F(Partitions, ABlockCountIsReadAsASignedDecimalNumber) {
    build(host,
          "/dev/sda1 1 2 -1 83 Linux\n/dev/sda2 1 2 0x10 83 Linux\n/dev/sda3 1 2 ++ 83 Linux\n"
          "/dev/sda4\n/dev/sda5 1 2 010 83 Linux\n/dev/sda6 1 2 7k 83 Linux\n/dev/sda7 1 2 9+++ 83\n");
    std::vector<unsigned long long> sizes;
    for (const Seen& partition : partitions()) {
        sizes.push_back(partition.size);
    }
    // A line without blanks comes out of cut whole: its path is no number.
    EXPECT_THAT(sizes, ElementsAre(18446744073709551615ULL, 0, 0, 0, 10, 7, 9));
}

HOST_TEST_F(Partitions, AnEmptySnapshotGivesNoneAndAnUpdateStillWithdraws) {
    build(host, listing("no_table"));
    EXPECT_THAT(partitions(), IsEmpty());
    build(host, kBoot + "\n");
    build(host, "", true);
    EXPECT_THAT(partitions(), IsEmpty());
    EXPECT_THAT(Access::partitions(), IsEmpty());
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda1"));
}

HOST_TEST_F(Partitions, AListingThatCannotStartLeavesNoNodes) {
    build(host, kBoot + "\n");
    shell_stub::failWhen([](const std::string& command) { return command == kListing; });
    LogCapture log;
    build(host, kBoot + "\n", true);
    EXPECT_THAT(log.messages(6000), TextsAre("fdisk command " + kListing + " failed!!"));
    EXPECT_EQ(log.messages().back(), "createPartitionNodes: exit");
    EXPECT_THAT(diary(), TextsAre("withdrawn /dev/sda1"));
}

HOST_TEST_F(Partitions, ALineWhoseCommandCannotStartIsSkipped) {
    shell_stub::failWhen([](const std::string& command) { return command == sizeCommand(kBoot); });
    LogCapture log;
    build(host, kBoot + "\n/dev/sda2 1 2 300 83 Linux\n", true);
    EXPECT_THAT(partitions(), ElementsAre(Seen{102, 1, "/dev/sda2", 300}));
    EXPECT_THAT(diary(), TextsAre("published /dev/sda2"));
    EXPECT_THAT(log.messages(6000), TextsAre("Command : " + sizeCommand(kBoot) + " failed!!"));
}

HOST_TEST_F(Partitions, ALineTooLongForItsCommandIsSkipped) {
    const std::string start = "/dev/sda1 1 2 300 83 ";
    const std::string tooLong = start + std::string(512 - sizeCommand(start).size(), 'x');
    LogCapture log;
    build(host, tooLong + "\n/dev/sda2 1 2 300 83 Linux\n");
    EXPECT_THAT(partitions(), ElementsAre(Seen{102, 1, "/dev/sda2", 300}));
    EXPECT_EQ(log.messages(6000).size(), 2U);
    EXPECT_THAT(commands(), testing::Not(testing::Contains(sizeCommand(tooLong))));
}

HOST_TEST_F(Partitions, TheRestOfALineTooLongForTheBufferIsNoPartition) {
    const std::string start = "/dev/sda1 1 2 300 83 ";
    const std::string full = start + std::string(511 - start.size(), 'x');
    build(host,
          full + std::string(100'000, 'y') + " 1 2 300\n" + full + "\n/dev/sda2 1 2 300 83 Linux\n" + full);
    EXPECT_THAT(partitions(), ElementsAre(Seen{103, 1, "/dev/sda2", 300}));
    EXPECT_THAT(commands(), ElementsAre(kListing, sizeCommand("/dev/sda2 1 2 300 83 Linux")));
}

HOST_TEST_F(Partitions, HealthIsAlwaysGoodAndWritesAreOnlyStored) {
    build(host, kBoot + "\n");
    const auto node = nodesOfType(IC::NodeType::partition).at(0);
    clearCommands();
    IC::PropertyValue value;
    LogCapture log;
    EXPECT_EQ(node->getProperty(123, value).getStatus(), 0);
    EXPECT_THAT(log.messages(),
                TextsAre("DiskPartition::getProperty: entry", "DiskPartition::getProperty: exit"));
    EXPECT_EQ(value, IC::PropertyValue(IC::Number(1U), true));
    EXPECT_EQ(node->setProperty(123, IC::PropertyValue(IC::Number(12U), true)).getStatus(), 0);
    EXPECT_EQ(node->getProperty(123, value).getStatus(), 0);
    EXPECT_EQ(value, IC::PropertyValue(IC::Number(1U), true));
    EXPECT_EQ(node->setProperty(112, IC::PropertyValue("changed", true)).getStatus(), 0);
    EXPECT_EQ(node->getProperty(112, value).getStatus(), 0);
    EXPECT_EQ(std::string(value), "changed");
    EXPECT_EQ(node->getProperty(37, value).getStatus(), 1);
    EXPECT_THAT(commands(), IsEmpty());
}

}  // namespace
