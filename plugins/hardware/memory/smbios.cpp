#include "plugins/hardware/memory/smbios.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <utility>

#include "plugins/hardware/bytes.h"
#include "plugins/hardware/host.h"

namespace hardware {

namespace {

constexpr std::size_t kHeader = 4;  // type, length, handle
constexpr std::uint8_t kEnd = 127;
// A table that lies costs no more than this.
constexpr std::size_t kMostRecords = 4096;
constexpr std::size_t kMostTexts = 255;  // a byte names them

// What firmware writes where its maker has filled nothing in.
constexpr std::array<std::string_view, 18> kNothing = {"Not Specified",
                                                       "Unknown",
                                                       "UNKNOWN",
                                                       "None",
                                                       "NO DIMM",
                                                       "To Be Filled By O.E.M.",
                                                       "To be filled by O.E.M.",
                                                       "Not Provided",
                                                       "Not Applicable",
                                                       "N/A",
                                                       "Default string",
                                                       "Not Available",
                                                       "Empty",
                                                       "System manufacturer",
                                                       "System Product Name",
                                                       "System Serial Number",
                                                       "Undefined",
                                                       "0000000000000000"};

/// Takes the texts behind a structure. @return where the next one begins; npos when they have no end
std::size_t readTexts(const std::string& table, std::size_t at, std::vector<std::string>& texts) {
    if (table.compare(at, 2, std::string(2, '\0')) == 0) {
        return at + 2;
    }
    while (at < table.size() && table[at] != '\0') {
        const std::size_t end = table.find('\0', at);
        if (end == std::string::npos) {
            return end;
        }
        if (texts.size() < kMostTexts) {
            texts.push_back(printable(trimmed(table.substr(at, end - at))));
        }
        at = end + 1;
    }
    return at < table.size() ? at + 1 : std::string::npos;
}

}  // namespace

SmbiosRecord::SmbiosRecord(std::uint8_t type, std::string fixed, std::vector<std::string> texts)
    : type_(type), fixed_(std::move(fixed)), texts_(std::move(texts)) {}

std::optional<std::uint32_t> SmbiosRecord::number(std::size_t offset, std::size_t size) const {
    if (offset > fixed_.size() || size > fixed_.size() - offset) {
        return std::nullopt;
    }
    return static_cast<std::uint32_t>(littleEndian(fixed_, offset, size));
}

std::optional<std::uint8_t> SmbiosRecord::byte(std::size_t offset) const {
    const auto value = number(offset, 1);
    return value ? std::optional(static_cast<std::uint8_t>(*value)) : std::nullopt;
}

std::optional<std::uint16_t> SmbiosRecord::word(std::size_t offset) const {
    const auto value = number(offset, 2);
    return value ? std::optional(static_cast<std::uint16_t>(*value)) : std::nullopt;
}

std::optional<std::uint32_t> SmbiosRecord::doubleWord(std::size_t offset) const {
    return number(offset, 4);
}

std::optional<std::string> SmbiosRecord::text(std::size_t offset) const {
    const std::size_t place = byte(offset).value_or(0);
    if (place == 0 || place > texts_.size()) {
        return std::nullopt;
    }
    return firmwareText(texts_[place - 1]);
}

std::optional<std::string> firmwareText(const std::optional<std::string>& text) {
    const bool nothing =
        !text || text->empty() || std::find(kNothing.begin(), kNothing.end(), *text) != kNothing.end();
    return nothing ? std::nullopt : text;
}

std::vector<SmbiosRecord> readSmbios(const std::string& table) {
    std::vector<SmbiosRecord> records;
    for (std::size_t at = 0; at != std::string::npos && at + kHeader <= table.size();) {
        if (records.size() == kMostRecords) {
            break;
        }
        const std::uint8_t type = byteAt(table, at);
        const std::size_t length = byteAt(table, at + 1);
        if (type == kEnd || length < kHeader || at + length > table.size()) {
            break;
        }
        std::string fixed = table.substr(at, length);
        std::vector<std::string> texts;
        at = readTexts(table, at + length, texts);
        records.emplace_back(type, std::move(fixed), std::move(texts));
    }
    return records;
}

}  // namespace hardware
