#include "hosttools/partition_table.h"

#include <fcntl.h>
#include <unistd.h>
#include <array>
#include <span>

#include "hosttools/descriptor.h"
#include "hosttools/files.h"

namespace hosttools {
namespace {

constexpr std::size_t sectorBytes = 512;
constexpr std::size_t tableOffset = 446;
constexpr std::size_t entryBytes = 16;
constexpr std::size_t identifierOffset = 440;
// A chain of logical partitions that is longer is damaged (or points back at itself).
constexpr int longestChain = 128;

using Sector = std::array<std::uint8_t, sectorBytes>;

std::uint32_t littleEndian(std::span<const std::uint8_t, 4> bytes) {
    return bytes[0] | bytes[1] << 8 | bytes[2] << 16 | std::uint32_t{bytes[3]} << 24;
}

/// One of the four entries of a boot sector, still counted in the disk's own sectors.
struct RawEntry {
    bool active;
    std::uint8_t type;
    std::uint32_t start;
    std::uint32_t length;

    RawEntry(const Sector& sector, std::size_t index) {
        const auto bytes = std::span(sector).subspan(tableOffset + index * entryBytes).first<entryBytes>();
        active = bytes[0] == 0x80;
        type = bytes[4];
        start = littleEndian(bytes.subspan<8, 4>());
        length = littleEndian(bytes.subspan<12, 4>());
    }
    bool used() const { return type != 0 && length != 0; }
    bool extended() const { return type == 0x05 || type == 0x0f || type == 0x85; }
};

class Reader {
public:
    Reader(const std::string& device, std::uint64_t logicalSize)
        : file_(open(device.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC)), logicalSize_(logicalSize) {}

    std::optional<Sector> sector(std::uint64_t number) const {
        Sector bytes;
        const auto offset = static_cast<off_t>(number * logicalSize_);
        const ssize_t got = pread(file_.get(), bytes.data(), bytes.size(), offset);
        if (got != static_cast<ssize_t>(bytes.size())) return std::nullopt;
        return bytes;
    }
    TableEntry entry(const RawEntry& raw, std::uint64_t base) const {
        return {(base + raw.start) * (logicalSize_ / sectorBytes), raw.type, raw.active};
    }

private:
    Descriptor file_;
    std::uint64_t logicalSize_;
};

bool isBootSector(const Sector& sector) {
    return sector[510] == 0x55 && sector[511] == 0xaa;
}

/// Logical partitions hang on a chain: each link is a boot sector whose first entry is the partition and
/// whose second is the next link, counted from the start of the extended partition.
void addLogical(const Reader& reader, std::uint32_t extendedStart, std::vector<TableEntry>& entries) {
    std::uint64_t link = extendedStart;
    for (int depth = 0; depth < longestChain; ++depth) {
        const auto sector = reader.sector(link);
        if (!sector || !isBootSector(*sector)) return;
        const RawEntry partition(*sector, 0);
        if (partition.used()) entries.push_back(reader.entry(partition, link));
        const RawEntry next(*sector, 1);
        if (!next.used() || !next.extended()) return;
        link = std::uint64_t{extendedStart} + next.start;
    }
}

bool hasGuidTable(const Reader& reader) {
    constexpr std::string_view signature = "EFI PART";
    const auto header = reader.sector(1);
    return header && std::equal(signature.begin(), signature.end(), header->begin());
}

void addEntries(const Reader& reader, const Sector& boot, PartitionTable& table) {
    for (std::size_t index = 0; index < 4; ++index) {
        const RawEntry raw(boot, index);
        if (!raw.used()) continue;
        if (raw.type == gptType && hasGuidTable(reader)) table.scheme = PartitionScheme::gpt;
        table.entries.push_back(reader.entry(raw, 0));
        if (raw.extended()) addLogical(reader, raw.start, table.entries);
    }
}

}  // namespace

std::optional<PartitionTable> readPartitionTable(const std::string& device, std::uint64_t logicalSize) {
    const Reader reader(device, logicalSize);
    const auto boot = reader.sector(0);
    if (!boot) return std::nullopt;
    PartitionTable table;
    if (!isBootSector(*boot)) return table;
    table.scheme = PartitionScheme::dos;
    addEntries(reader, *boot, table);
    if (table.scheme == PartitionScheme::gpt) {
        table.entries.clear();
    } else {
        table.identifier = littleEndian(std::span(*boot).subspan<identifierOffset, 4>());
    }
    return table;
}

UdevRecord::UdevRecord(const std::string& path) : content_(readFile(path).value_or("")) {}

std::string_view UdevRecord::value(std::string_view key) const {
    std::string_view rest = content_;
    while (!rest.empty()) {
        std::string_view line = takeLine(rest);
        if (!line.starts_with("E:")) continue;
        line.remove_prefix(2);
        if (line.starts_with(key) && line.substr(key.size()).starts_with('='))
            return line.substr(key.size() + 1);
    }
    return {};
}

PartitionScheme schemeOf(std::string_view udevName) {
    if (udevName == "dos") return PartitionScheme::dos;
    return udevName == "gpt" ? PartitionScheme::gpt : PartitionScheme::none;
}

std::optional<TableEntry> tableEntry(const UdevRecord& record, std::uint64_t start) {
    // A record of an earlier layout names another place: it is not this partition's.
    if (parseNumber(record.value("ID_PART_ENTRY_OFFSET")) != start) return std::nullopt;
    const std::string_view scheme = record.value("ID_PART_ENTRY_SCHEME");
    if (scheme.empty()) return std::nullopt;
    if (schemeOf(scheme) == PartitionScheme::gpt) return TableEntry{start, gptType, false};
    // Tables of other machines have no type byte.
    if (schemeOf(scheme) == PartitionScheme::none) return TableEntry{start, 0, false};
    const auto type = parseNumber(record.value("ID_PART_ENTRY_TYPE"), 16);
    if (!type || *type > 0xff) return std::nullopt;
    const auto flags = parseNumber(record.value("ID_PART_ENTRY_FLAGS"), 16).value_or(0);
    return TableEntry{start, static_cast<std::uint8_t>(*type), (flags & 0x80) != 0};
}

}  // namespace hosttools
