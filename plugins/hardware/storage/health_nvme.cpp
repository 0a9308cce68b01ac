#include <array>

#include "plugins/hardware/storage/bytes.h"
#include "plugins/hardware/storage/health.h"

namespace hardware {

namespace {

constexpr unsigned int kHealthPage = 2;
constexpr std::size_t kPageSize = 512;

// By the bits of the page's first byte.
constexpr std::array<const char*, 6> kCritical = {
    "spare blocks run out", "temperature out of its limits",        "reliability is degraded",
    "can only be read",     "backup of volatile memory has failed", "persistent memory can only be read"};

/// A counter has 128 bits; nothing for what 64 do not hold.
std::optional<unsigned long long> counterAt(const std::string& page, std::size_t place) {
    const bool fits = littleEndian(page, place + 8, 8) == 0;
    return fits ? std::optional<unsigned long long>(littleEndian(page, place, 8)) : std::nullopt;
}

}  // namespace

Health nvmeHealth(const std::string& page) {
    constexpr std::uint64_t kZeroCelsius = 273;  // in the whole kelvins that it counts
    Health health;
    if (page.size() < kPageSize) {
        return health;
    }
    for (std::size_t bit = 0; bit < kCritical.size(); ++bit) {
        if ((byteAt(page, 0) >> bit & 1U) != 0) {
            health.warnings.emplace_back(kCritical[bit]);
        }
    }
    if (const std::uint64_t kelvins = littleEndian(page, 1, 2); kelvins != 0) {
        health.temperature = static_cast<long long>(kelvins) - static_cast<long long>(kZeroCelsius);
    }
    health.spare = byteAt(page, 3);
    health.worn = byteAt(page, 5);
    health.hours = counterAt(page, 128);
    health.mediaErrors = counterAt(page, 160);
    return health;
}

Health askNvme(const DeviceAccess& access, const DeviceFile& controller) {
    return nvmeHealth(access.nvmeLog(controller, kHealthPage, kPageSize).value_or(""));
}

}  // namespace hardware
