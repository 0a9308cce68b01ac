#pragma once

#include <cstdint>
#include <string>

namespace hardware {

// Numbers in what a device or the firmware answered; what lies behind its end counts as 0.

inline std::uint8_t byteAt(const std::string& data, std::size_t place) {
    return place < data.size() ? static_cast<std::uint8_t>(data[place]) : 0;
}

/// The lowest byte first.
inline std::uint64_t littleEndian(const std::string& data, std::size_t place, std::size_t count) {
    std::uint64_t value = 0;
    for (std::size_t at = count; at > 0; --at) {
        value = value << 8U | byteAt(data, place + at - 1);
    }
    return value;
}

/// The highest byte first.
inline std::uint64_t bigEndian(const std::string& data, std::size_t place, std::size_t count) {
    std::uint64_t value = 0;
    for (std::size_t at = 0; at < count; ++at) {
        value = value << 8U | byteAt(data, place + at);
    }
    return value;
}

}  // namespace hardware
