#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace hardware {

/// One structure of the SMBIOS tables: a fixed part of numbers, and texts that it names by their place.
/// Firmware is careless: every access is checked against the length that the structure says it has.
class SmbiosRecord {
public:
    SmbiosRecord(std::uint8_t type, std::string fixed, std::vector<std::string> texts);

    std::uint8_t type() const { return type_; }
    /// Little-endian numbers at an offset of the fixed part; nothing beyond its end.
    std::optional<std::uint8_t> byte(std::size_t offset) const;
    std::optional<std::uint16_t> word(std::size_t offset) const;
    std::optional<std::uint32_t> doubleWord(std::size_t offset) const;
    /// The text whose place the byte at the offset tells; nothing for none and for words that stand for none.
    std::optional<std::string> text(std::size_t offset) const;

private:
    std::optional<std::uint32_t> number(std::size_t offset, std::size_t size) const;

    std::uint8_t type_;
    std::string fixed_;
    std::vector<std::string> texts_;
};

/// A text of the firmware; nothing for words that stand for none.
std::optional<std::string> firmwareText(const std::optional<std::string>& text);

/// The structures of a table as /sys/firmware/dmi/tables/DMI has it; ends at the first that is damaged,
/// and after 4096.
std::vector<SmbiosRecord> readSmbios(const std::string& table);

}  // namespace hardware
