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

// By the codes of the standard (DSP0134), in its words; a null pointer for what says nothing.
constexpr std::array<const char*, 0x25> kSorts = {
    nullptr, nullptr, nullptr,  "DRAM",   "EDRAM",        "VRAM",   "SRAM",   "RAM",
    "ROM",   "Flash", "EEPROM", "FEPROM", "EPROM",        "CDRAM",  "3DRAM",  "SDRAM",
    "SGRAM", "RDRAM", "DDR",    "DDR2",   "DDR2 FB-DIMM", nullptr,  nullptr,  nullptr,
    "DDR3",  "FBD2",  "DDR4",   "LPDDR",  "LPDDR2",       "LPDDR3", "LPDDR4", "Logical non-volatile device",
    "HBM",   "HBM2",  "DDR5",   "LPDDR5", "HBM3"};

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
    const std::size_t code = record.byte(0x12).value_or(0);
    const char* const name = code < kSorts.size() ? kSorts[code] : nullptr;
    return name == nullptr ? std::nullopt : std::optional<std::string>(name);
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
