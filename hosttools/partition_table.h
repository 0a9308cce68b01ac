#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace hosttools {

enum class PartitionScheme { none, dos, gpt };

/// What a partition table says of one partition.
struct TableEntry {
    std::uint64_t start = 0;  ///< first sector, in 512 bytes
    std::uint8_t type = 0;    ///< the type byte of a DOS table; 0xee for every partition of a GUID table
    bool active = false;      ///< the boot flag of a DOS table
};

constexpr std::uint8_t gptType = 0xee;

/// A partition table, read from a disk.
struct PartitionTable {
    PartitionScheme scheme = PartitionScheme::none;
    std::uint32_t identifier = 0;     ///< of a DOS table, 0 when it has none
    std::vector<TableEntry> entries;  ///< of a DOS table: primary, extended and logical ones, in table order
};

/// Reads a disk's partition table: one sector, one more for each logical partition, one more for a GUID
/// table. Opens the disk for reading only and without waiting for a medium.
/// @param logicalSize the disk's sector size in bytes; the table counts in it
/// @return nothing when the disk cannot be opened or read
std::optional<PartitionTable> readPartitionTable(const std::string& device, std::uint64_t logicalSize);

/// What udev stored about one block device: libblkid's findings as "E:KEY=value" lines.
class UdevRecord {
public:
    /// @param path "/run/udev/data/b8:0"; a missing file gives an empty record
    explicit UdevRecord(const std::string& path);
    bool known() const { return !content_.empty(); }
    /// @return the value of a key, empty when it has none
    std::string_view value(std::string_view key) const;

private:
    std::string content_;
};

PartitionScheme schemeOf(std::string_view udevName);
/// @return what udev knows of a partition; nothing when it has no record of a table entry at this start
std::optional<TableEntry> tableEntry(const UdevRecord& record, std::uint64_t start);

/// The name of a partition type as the classic tool prints it, "Unknown" for one without a name.
std::string_view partitionTypeName(std::uint8_t type);

}  // namespace hosttools
