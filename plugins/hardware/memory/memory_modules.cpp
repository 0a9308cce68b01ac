#include <algorithm>
#include <array>

#include "plugins/hardware/memory/memory.h"
#include "plugins/hardware/memory/smbios.h"

namespace hardware {

namespace {

constexpr auto kType = Class::memoryModule;
constexpr auto kTables = "/sys/firmware/dmi/tables/DMI";
constexpr std::uint8_t kMemoryDevice = 17;

enum : Id {
    kSlot = firstId(kType) + 1,
    kBank,
    kSize,
    kSort,
    kSpeed,
    kMaker,
    kPartNumber,
    kSerial,
};

constexpr Row kRows[] = {
    {kSlot, "Slot", Kind::text, "", "SMBIOS type 17, device locator", "where the module sits"},
    {kBank, "Bank", Kind::text, "", "SMBIOS type 17, bank locator", "the bank it belongs to"},
    {kSize, "Size", Kind::number, "bytes", "SMBIOS type 17, size", "how much it holds"},
    {kSort, "MemoryType", Kind::text, "", "SMBIOS type 17, memory type", "kind of memory"},
    {kSpeed, "Speed", Kind::number, "megatransfers per second", "SMBIOS type 17, configured memory speed",
     "how fast it is run"},
    {kMaker, "Maker", Kind::text, "", "SMBIOS type 17, manufacturer", "who made it"},
    {kPartNumber, "PartNumber", Kind::text, "", "SMBIOS type 17, part number", "the maker's number"},
    {kSerial, "SerialNumber", Kind::text, "", "SMBIOS type 17, serial number", "its serial number", kTrusted},
};

struct Sort {
    std::uint8_t code;
    const char* name;
};

constexpr std::array<Sort, 19> kSorts = {{{0x03, "DRAM"},
                                          {0x07, "RAM"},
                                          {0x0f, "SDRAM"},
                                          {0x12, "DDR"},
                                          {0x13, "DDR2"},
                                          {0x14, "DDR2 FB-DIMM"},
                                          {0x18, "DDR3"},
                                          {0x19, "FBD2"},
                                          {0x1a, "DDR4"},
                                          {0x1b, "LPDDR"},
                                          {0x1c, "LPDDR2"},
                                          {0x1d, "LPDDR3"},
                                          {0x1e, "LPDDR4"},
                                          {0x1f, "NVDIMM"},
                                          {0x20, "HBM"},
                                          {0x21, "HBM2"},
                                          {0x22, "DDR5"},
                                          {0x23, "LPDDR5"},
                                          {0x24, "HBM3"}}};

/// In bytes; nothing for an empty slot and for a size that the firmware does not know.
std::optional<unsigned long long> sizeOf(const SmbiosRecord& record) {
    constexpr std::uint16_t kUnknown = 0xffff;
    constexpr std::uint16_t kElsewhere = 0x7fff;
    constexpr std::uint16_t kInKibibytes = 0x8000;
    const std::uint16_t size = record.word(0x0c).value_or(0);
    if (size == 0 || size == kUnknown) {
        return std::nullopt;
    }
    unsigned long long bytes = static_cast<unsigned long long>(size) << 20U;
    if (size == kElsewhere) {
        bytes = (record.doubleWord(0x1c).value_or(0) & 0x7fffffffULL) << 20U;
    } else if ((size & kInKibibytes) != 0) {
        bytes = (size & 0x7fffULL) << 10U;
    }
    return bytes == 0 ? std::nullopt : std::optional(bytes);
}

/// The speed it is run with, else the one it could be run with.
std::optional<unsigned long long> speedOf(const SmbiosRecord& record) {
    for (const auto& [offset, larger] : {std::pair<std::size_t, std::size_t>{0x20, 0x58}, {0x15, 0x54}}) {
        const std::uint16_t speed = record.word(offset).value_or(0);
        if (speed == 0xffff) {
            const std::uint32_t large = record.doubleWord(larger).value_or(0) & 0x7fffffffU;
            return large == 0 ? std::nullopt : std::optional<unsigned long long>(large);
        }
        if (speed != 0) {
            return speed;
        }
    }
    return std::nullopt;
}

std::optional<std::string> sortOf(const SmbiosRecord& record) {
    const std::uint8_t code = record.byte(0x12).value_or(0);
    const auto* const known = std::ranges::find(kSorts, code, &Sort::code);
    return known == kSorts.end() ? std::nullopt : std::optional<std::string>(known->name);
}

/// The modules in the order of the table; empty slots are none.
std::vector<SmbiosRecord> modules(const Host& host) {
    std::vector<SmbiosRecord> found = readSmbios(host.text(kTables).value_or(""));
    std::erase_if(
        found, [](const SmbiosRecord& record) { return record.type() != kMemoryDevice || !sizeOf(record); });
    return found;
}

}  // namespace

Rows memoryModuleRows() {
    return kRows;
}

std::vector<std::string> listMemoryModules(const Host& host) {
    const std::size_t count = modules(host).size();
    std::vector<std::string> names;
    for (std::size_t place = 0; place < count; ++place) {
        names.push_back(std::to_string(place));
    }
    return names;
}

void describeMemoryModule(const Host& host, Found& found) {
    found.parent = {Class::memory, ""};
    const std::vector<SmbiosRecord> all = modules(host);
    const auto place = asNumber(found.name);
    if (!place || *place >= all.size()) {
        return;
    }
    const SmbiosRecord& record = all[*place];
    found.facts.text(kSlot, record.text(0x10));
    found.facts.text(kBank, record.text(0x11));
    found.facts.number(kSize, sizeOf(record));
    found.facts.text(kSort, sortOf(record));
    found.facts.number(kSpeed, speedOf(record));
    found.facts.text(kMaker, record.text(0x17));
    found.facts.text(kPartNumber, record.text(0x1a));
    if (host.privileged()) {
        found.facts.text(kSerial, record.text(0x18));
    }
}

}  // namespace hardware
