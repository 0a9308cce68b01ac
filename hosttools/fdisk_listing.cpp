#include "hosttools/fdisk_listing.h"

namespace hosttools {
namespace {

constexpr std::uint64_t kernelSector = 512;  // what sysfs counts in
constexpr std::uint64_t heads = 255;
constexpr std::uint64_t sectorsPerTrack = 63;

std::uint64_t sectorCount(const Disk& disk) {
    return disk.sectors / (disk.logicalSize / kernelSector);
}

/// "80.0 GB" from 10 GB on, "4009 MB" below: decimal units, rounded to the next tenth.
void addSize(Text& text, std::uint64_t bytes) {
    const std::uint64_t megabytes = bytes / 1000000;
    if (megabytes < 10000) {
        text.number(megabytes).add(" MB");
        return;
    }
    const std::uint64_t tenths = (megabytes + 50) / 100;
    text.number(tenths / 10).add('.').number(tenths % 10).add(" GB");
}

void addGeometry(Text& text, const Disk& disk) {
    const std::uint64_t sectors = sectorCount(disk);
    text.number(heads).add(" heads, ").number(sectorsPerTrack).add(" sectors/track, ");
    text.number(sectors / (heads * sectorsPerTrack))
        .add(" cylinders, total ")
        .number(sectors)
        .add(" sectors\n");
    text.add("Units = sectors of 1 * ")
        .number(disk.logicalSize)
        .add(" = ")
        .number(disk.logicalSize)
        .add(" bytes\n");
    text.add("Sector size (logical/physical): ").number(disk.logicalSize).add(" bytes / ");
    text.number(disk.physicalSize).add(" bytes\n");
    text.add("I/O size (minimum/optimal): ").number(disk.minimumIo).add(" bytes / ");
    text.number(disk.optimalIo).add(" bytes\n");
    text.add("Disk identifier: 0x").hex(disk.identifier, 8).add("\n\n");
}

/// The width of the device column: as wide as the disk's path, with the "p" that separates a number from a
/// number.
std::size_t columnWidth(const Disk& disk) {
    const bool digitAtEnd = disk.name.back() >= '0' && disk.name.back() <= '9';
    return std::string_view("/dev/").size() + disk.name.size() + (digitAtEnd ? 1 : 0);
}

void addPartition(Text& text, const Disk& disk, const Partition& partition) {
    const std::uint64_t unit = disk.logicalSize / kernelSector;
    const std::size_t mark = text.size();
    text.add("/dev/").add(partition.name).padLeftAligned(mark, columnWidth(disk) + 2);
    text.add("  ").add(partition.entry.active ? '*' : ' ');
    text.add(' ').right(partition.start / unit, 11);
    text.add(' ').right((partition.start + partition.sectors) / unit - 1, 11);
    text.add(' ').right(partition.sectors / 2, 11).add(partition.sectors % 2 ? '+' : ' ');
    text.add("  ").right(Text().hex(partition.entry.type), 2);
    text.add("  ").add(partitionTypeName(partition.entry.type)).add('\n');
}

}  // namespace

void listDisk(Text& text, const Disk& disk) {
    const std::uint64_t bytes = disk.sectors * kernelSector;
    text.add("\nDisk /dev/").add(disk.name).add(": ");
    addSize(text, bytes);
    text.add(", ").number(bytes).add(" bytes\n");
    addGeometry(text, disk);
    if (isBare(disk)) return;
    text.right("Device", columnWidth(disk) + 1);
    text.add(" Boot      Start         End      Blocks   Id  System\n");
    for (const Partition& partition : disk.partitions) addPartition(text, disk, partition);
}

bool isBare(const Disk& disk) {
    return disk.scheme == PartitionScheme::none && disk.partitions.empty();
}

Text missingTableMessage(const Disk& disk) {
    return Text().add("Disk /dev/").add(disk.name).add(" doesn't contain a valid partition table\n");
}

}  // namespace hosttools
