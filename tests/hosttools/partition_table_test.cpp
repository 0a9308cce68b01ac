#include "hosttools/partition_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/hosttools/disk_image.h"
#include "tests/hosttools/host_tree.h"

namespace hosttools {

bool operator==(const TableEntry& left, const TableEntry& right) {
    return left.start == right.start && left.type == right.type && left.active == right.active;
}
void PrintTo(const TableEntry& entry, std::ostream* out) {
    *out << entry.start << " type " << int{entry.type} << (entry.active ? " active" : "");
}

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

std::optional<PartitionTable> readImage(const std::string& bytes, std::uint64_t sectorSize = 512) {
    HostTree tree;
    tree.addBytes("disk", bytes);
    return readPartitionTable(tree.root() + "/disk", sectorSize);
}

PartitionTable readImage(const DiskImage& image, std::uint64_t sectorSize = 512) {
    const auto table = readImage(image.bytes(), sectorSize);
    EXPECT_TRUE(table);
    return table.value_or(PartitionTable{});
}

TEST(PartitionTable, PrimaryPartitions) {
    DiskImage image(4);
    image.identify(0xc3072e18);
    image.entry(0, 0, 0x83, 63, 208782, true);
    image.entry(0, 1, 0x82, 208845, 4294967295u);
    image.entry(0, 3, 0x07, 4000000000u, 1000);
    const PartitionTable table = readImage(image);
    EXPECT_EQ(table.scheme, PartitionScheme::dos);
    EXPECT_EQ(table.identifier, 0xc3072e18u);
    EXPECT_THAT(table.entries, ElementsAre(TableEntry{63, 0x83, true}, TableEntry{208845, 0x82, false},
                                           TableEntry{4000000000u, 0x07, false}));
}

TEST(PartitionTable, LogicalPartitionsOnTheirChain) {
    DiskImage image(400);
    image.entry(0, 0, 0x83, 1, 99);
    image.entry(0, 1, 0x05, 100, 300);
    image.entry(100, 0, 0x82, 10, 40);
    image.entry(100, 1, 0x05, 50, 100);
    image.entry(150, 0, 0x83, 5, 90, true);
    image.entry(150, 1, 0x05, 200, 50);
    image.entry(300, 0, 0x8e, 1, 40);
    EXPECT_THAT(
        readImage(image).entries,
        ElementsAre(TableEntry{1, 0x83, false}, TableEntry{100, 0x05, false}, TableEntry{110, 0x82, false},
                    TableEntry{155, 0x83, true}, TableEntry{301, 0x8e, false}));
}

TEST(PartitionTable, AChainThatPointsAtItselfEnds) {
    DiskImage image(200);
    image.entry(0, 0, 0x0f, 100, 100);
    image.entry(100, 0, 0x83, 1, 10);
    image.entry(100, 1, 0x05, 0, 100);
    EXPECT_THAT(readImage(image).entries, SizeIs(testing::Le(129u)));
}

TEST(PartitionTable, AChainThatLeavesTheDiskEnds) {
    DiskImage image(200);
    image.entry(0, 0, 0x05, 100, 100);
    image.entry(100, 0, 0x83, 1, 10);
    image.entry(100, 1, 0x05, 4294967295u, 100);
    EXPECT_THAT(readImage(image).entries,
                ElementsAre(TableEntry{100, 0x05, false}, TableEntry{101, 0x83, false}));
}

TEST(PartitionTable, AnUnsignedLinkEndsTheChain) {
    DiskImage image(200);
    image.entry(0, 0, 0x05, 100, 100);
    EXPECT_THAT(readImage(image).entries, ElementsAre(TableEntry{100, 0x05, false}));
}

TEST(PartitionTable, AGuidTableBehindItsProtectiveEntry) {
    DiskImage image(4);
    image.identify(0x11223344);
    image.entry(0, 0, 0xee, 1, 4294967295u);
    image.text(1, "EFI PART");
    const PartitionTable table = readImage(image);
    EXPECT_EQ(table.scheme, PartitionScheme::gpt);
    EXPECT_EQ(table.identifier, 0u);
    EXPECT_THAT(table.entries, IsEmpty());
}

TEST(PartitionTable, AProtectiveEntryWithoutAGuidTableIsAPartition) {
    DiskImage image(4);
    image.entry(0, 0, 0xee, 1, 100);
    const PartitionTable table = readImage(image);
    EXPECT_EQ(table.scheme, PartitionScheme::dos);
    EXPECT_THAT(table.entries, ElementsAre(TableEntry{1, 0xee, false}));
}

TEST(PartitionTable, SectorsOf4096BytesAreCountedIn512) {
    DiskImage image(200, 4096);
    image.entry(0, 0, 0x83, 256, 1000, true);
    image.entry(0, 1, 0x05, 100, 100);
    image.entry(100, 0, 0x82, 2, 10);
    EXPECT_THAT(readImage(image, 4096).entries,
                ElementsAre(TableEntry{2048, 0x83, true}, TableEntry{800, 0x05, false},
                            TableEntry{816, 0x82, false}));
}

TEST(PartitionTable, DisksWithoutATable) {
    EXPECT_EQ(readImage(DiskImage(2)).scheme, PartitionScheme::none);
    EXPECT_EQ(readImage(std::string(511, 'x')), std::nullopt);  // not even a sector
    EXPECT_EQ(readPartitionTable("/nonexistent/disk", 512), std::nullopt);
}

UdevRecord record(const std::string& lines) {
    HostTree tree;
    tree.addBytes("record", lines);
    return UdevRecord(tree.root() + "/record");
}

TEST(UdevRecord, ValuesByWholeKey) {
    const UdevRecord known = record("N:sda\nE:ID_PART_TABLE_TYPE=dos\nE:ID_PART=x\nG:systemd\nE:LAST=1");
    EXPECT_TRUE(known.known());
    EXPECT_EQ(known.value("ID_PART_TABLE_TYPE"), "dos");
    EXPECT_EQ(known.value("ID_PART"), "x");
    EXPECT_EQ(known.value("LAST"), "1");
    EXPECT_EQ(known.value("PART_TABLE_TYPE"), "");
    EXPECT_EQ(known.value("N"), "");
    EXPECT_FALSE(UdevRecord("/nonexistent/record").known());
}

TEST(UdevRecord, EntriesOfBothKindsOfTable) {
    const std::string place = "E:ID_PART_ENTRY_OFFSET=2048\n";
    EXPECT_EQ(tableEntry(record("E:ID_PART_ENTRY_SCHEME=dos\nE:ID_PART_ENTRY_TYPE=0xc\n"
                                "E:ID_PART_ENTRY_FLAGS=0x80\n" +
                                place),
                         2048),
              (TableEntry{2048, 0x0c, true}));
    EXPECT_EQ(tableEntry(record("E:ID_PART_ENTRY_SCHEME=dos\nE:ID_PART_ENTRY_TYPE=0x83\n" + place), 2048),
              (TableEntry{2048, 0x83, false}));
    // The third attribute bit of a GUID table is no boot flag of the classic kind.
    EXPECT_EQ(tableEntry(record("E:ID_PART_ENTRY_SCHEME=gpt\nE:ID_PART_ENTRY_FLAGS=0x80\n"
                                "E:ID_PART_ENTRY_TYPE=0fc63daf-8483-4772-8e79-3d69d8477de4\n" +
                                place),
                         2048),
              (TableEntry{2048, 0xee, false}));
}

TEST(UdevRecord, RecordsThatAreNotOfThisPartition) {
    const std::string type = "E:ID_PART_ENTRY_SCHEME=dos\nE:ID_PART_ENTRY_TYPE=0x83\n";
    EXPECT_EQ(tableEntry(record(type + "E:ID_PART_ENTRY_OFFSET=63\n"), 2048), std::nullopt);
    EXPECT_EQ(tableEntry(record(type), 2048), std::nullopt);
    EXPECT_EQ(tableEntry(record("E:ID_PART_ENTRY_OFFSET=2048\n"), 2048), std::nullopt);
    EXPECT_EQ(tableEntry(record("E:ID_PART_ENTRY_OFFSET=2048\nE:ID_PART_ENTRY_SCHEME=mac\n"
                                "E:ID_PART_ENTRY_TYPE=Apple_HFS\n"),
                         2048),
              (TableEntry{2048, 0, false}));
    EXPECT_EQ(tableEntry(UdevRecord("/nonexistent/record"), 0), std::nullopt);
}

TEST(PartitionTypes, NamesAndTheirNearMisses) {
    EXPECT_EQ(partitionTypeName(0x83), "Linux");
    EXPECT_EQ(partitionTypeName(0x05), "Extended");
    EXPECT_EQ(partitionTypeName(0xee), "GPT");
    EXPECT_EQ(partitionTypeName(0x00), "Empty");
    EXPECT_EQ(partitionTypeName(0x84), "Unknown");
    EXPECT_EQ(partitionTypeName(0xff), "Unknown");
}

}  // namespace
}  // namespace hosttools
