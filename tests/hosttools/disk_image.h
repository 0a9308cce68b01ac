#pragma once

#include <cstdint>
#include <string>

/// The first sectors of a disk, written byte by byte.
class DiskImage {
public:
    explicit DiskImage(std::size_t sectors, std::size_t sectorSize = 512)
        : bytes_(sectors * sectorSize, '\0'), sectorSize_(sectorSize) {}

    void sign(std::size_t sector) {
        put(sector, 510, 0x55);
        put(sector, 511, 0xaa);
    }
    void identify(std::uint32_t identifier) { put32(0, 440, identifier); }
    /// Entry index (0 to 3) of the boot sector at sector.
    void entry(std::size_t sector, std::size_t index, std::uint8_t type, std::uint32_t start,
               std::uint32_t length, bool active = false) {
        const std::size_t offset = 446 + index * 16;
        put(sector, offset, active ? 0x80 : 0);
        put(sector, offset + 4, type);
        put32(sector, offset + 8, start);
        put32(sector, offset + 12, length);
        sign(sector);
    }
    void text(std::size_t sector, const std::string& text) {
        bytes_.replace(sector * sectorSize_, text.size(), text);
    }
    const std::string& bytes() const { return bytes_; }

private:
    void put(std::size_t sector, std::size_t offset, std::uint8_t value) {
        bytes_[sector * sectorSize_ + offset] = static_cast<char>(value);
    }
    void put32(std::size_t sector, std::size_t offset, std::uint32_t value) {
        for (int shift = 0; shift < 32; shift += 8)
            put(sector, offset++, static_cast<std::uint8_t>(value >> shift));
    }
    std::string bytes_;
    std::size_t sectorSize_;
};
