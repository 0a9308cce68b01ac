#include "hosttools/disks.h"

#include <algorithm>
#include <string_view>
#include <tuple>

#include "hosttools/files.h"

namespace hosttools {
namespace {

// Kinds of disk that the listing shows. Software RAID and mapper devices are disks too: whoever does not want
// them looks at the name.
constexpr std::string_view diskKinds[] = {"cciss", "dm-", "hd", "md", "mmcblk", "nvme", "sd", "vd", "xvd"};

std::string_view kindOf(std::string_view name) {
    for (const std::string_view kind : diskKinds) {
        if (name.starts_with(kind)) return kind;
    }
    return {};
}

/// sda before sdb before sdaa, md2 before md10.
bool comesBefore(const Disk& left, const Disk& right) {
    const auto key = [](const Disk& disk) {
        return std::tuple(kindOf(disk.name), disk.name.size(), disk.name);
    };
    return key(left) < key(right);
}

/// sysfs writes the "/" of a device name as "!".
std::string deviceName(std::string name) {
    std::ranges::replace(name, '!', '/');
    return name;
}

std::string under(const std::string& directory, const std::string& name) {
    return directory + "/" + name;
}

std::vector<Partition> listPartitions(const std::string& diskDirectory) {
    std::vector<Partition> partitions;
    for (const std::string& name : listDirectory(diskDirectory)) {
        const std::string directory = under(diskDirectory, name);
        Partition partition;
        partition.number = readNumber(directory + "/partition");
        if (partition.number == 0) continue;
        partition.name = deviceName(name);
        partition.deviceNumber = readFirstLine(directory + "/dev");
        partition.start = readNumber(directory + "/start");
        partition.sectors = readNumber(directory + "/size");
        partitions.push_back(std::move(partition));
    }
    std::ranges::sort(partitions, {}, &Partition::number);
    return partitions;
}

Disk readDisk(const std::string& directory, const std::string& name) {
    Disk disk;
    disk.name = deviceName(name);
    disk.deviceNumber = readFirstLine(directory + "/dev");
    disk.sectors = readNumber(directory + "/size");
    disk.logicalSize = std::max<std::uint64_t>(512, readNumber(directory + "/queue/logical_block_size"));
    disk.physicalSize = readNumber(directory + "/queue/physical_block_size", disk.logicalSize);
    disk.minimumIo = readNumber(directory + "/queue/minimum_io_size", disk.physicalSize);
    disk.optimalIo = std::max(disk.minimumIo, readNumber(directory + "/queue/optimal_io_size"));
    disk.partitions = listPartitions(directory);
    return disk;
}

UdevRecord udevRecord(const std::string& root, const std::string& deviceNumber) {
    return UdevRecord(root + "/run/udev/data/b" + deviceNumber);
}

/// @return whether udev knows the disk and every partition of it
bool describeFromUdev(const std::string& root, Disk& disk) {
    const UdevRecord record = udevRecord(root, disk.deviceNumber);
    if (!record.known()) return false;
    disk.scheme = schemeOf(record.value("ID_PART_TABLE_TYPE"));
    if (disk.scheme == PartitionScheme::dos) {
        const auto identifier = parseNumber(record.value("ID_PART_TABLE_UUID"), 16);
        disk.identifier = static_cast<std::uint32_t>(identifier.value_or(0));
    }
    for (Partition& partition : disk.partitions) {
        const auto entry = tableEntry(udevRecord(root, partition.deviceNumber), partition.start);
        if (!entry) return false;
        partition.entry = *entry;
    }
    return true;
}

/// A disk whose motor is switched off would be started again by opening it.
bool isAsleep(const std::string& directory) {
    return readFirstLine(directory + "/device/power/runtime_status") == "suspended";
}

/// A mapper device that is being changed holds every reader up; and neither it nor a RAID without partitions
/// has a table.
bool mayHaveTable(const Disk& disk) {
    return !disk.partitions.empty() || !(disk.name.starts_with("dm-") || disk.name.starts_with("md"));
}

void describeFromTable(const std::string& root, Disk& disk) {
    const auto table = readPartitionTable(root + "/dev/" + disk.name, disk.logicalSize);
    if (!table) return;
    disk.scheme = table->scheme;
    disk.identifier = table->identifier;
    for (Partition& partition : disk.partitions) {
        if (table->scheme == PartitionScheme::gpt) partition.entry = {partition.start, gptType, false};
        const auto found = std::ranges::find(table->entries, partition.start, &TableEntry::start);
        if (found != table->entries.end()) partition.entry = *found;
    }
}

}  // namespace

std::optional<std::vector<Disk>> listDisks(const std::string& root, Opening opening) {
    std::vector<Disk> disks;
    for (const std::string& name : listDirectory(root + "/sys/block")) {
        if (kindOf(name).empty()) continue;
        const std::string directory = under(root + "/sys/block", name);
        Disk disk = readDisk(directory, name);
        // One path of a disk with several is hidden behind the disk itself.
        if (disk.sectors == 0 || readNumber(directory + "/hidden") != 0) continue;
        if (!describeFromUdev(root, disk) && mayHaveTable(disk) && !isAsleep(directory)) {
            if (opening == Opening::none) return std::nullopt;
            describeFromTable(root, disk);
        }
        disks.push_back(std::move(disk));
    }
    std::ranges::sort(disks, comesBefore);
    return disks;
}

std::vector<Disk> listDisks(const std::string& root) {
    return *listDisks(root, Opening::whereNeeded);
}

}  // namespace hosttools
