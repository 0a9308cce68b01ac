#include "plugins/hardware/memory/memory.h"

#include <climits>

namespace hardware {

namespace {

constexpr auto kType = Class::memory;

enum : Id {
    kTotal = firstId(kType) + 1,
    kAvailable,
    kSwapTotal,
    kSwapFree,
    kCorrected,
    kUncorrected,
};

constexpr Row kRows[] = {
    {kTotal, "TotalMemory", Kind::number, "bytes", "MemTotal in /proc/meminfo",
     "memory that the kernel can use"},
    {kAvailable, "AvailableMemory", Kind::number, "bytes", "MemAvailable in /proc/meminfo",
     "memory that programs can still have without swapping", kLive},
    {kSwapTotal, "TotalSwap", Kind::number, "bytes", "SwapTotal in /proc/meminfo", "room for swapped memory",
     kLive},
    {kSwapFree, "FreeSwap", Kind::number, "bytes", "SwapFree in /proc/meminfo",
     "room for swapped memory that is not used", kLive},
    {kCorrected, "CorrectedErrors", Kind::number, "", "/sys/devices/system/edac/mc/mc*/ce_count",
     "memory errors that were corrected since the start", kLive},
    {kUncorrected, "UncorrectedErrors", Kind::number, "", "/sys/devices/system/edac/mc/mc*/ue_count",
     "memory errors that could not be corrected since the start", kLive},
};

/// A row "Key:   123 kB", in bytes.
std::optional<unsigned long long> counted(const std::vector<std::string>& lines, const std::string& key) {
    for (const std::string& line : lines) {
        if (line.starts_with(key + ":") && line.ends_with(" kB")) {
            const auto count = asNumber(trimmed(line.substr(key.size() + 1, line.size() - key.size() - 4)));
            return count && *count <= ULLONG_MAX / 1024 ? std::optional(*count * 1024) : std::nullopt;
        }
    }
    return std::nullopt;
}

/// The sum over all memory controllers; nothing where none of them counts.
std::optional<unsigned long long> errors(const Host& host, const std::string& file) {
    const std::string all = "/sys/devices/system/edac/mc/";
    std::optional<unsigned long long> sum;
    for (const std::string& controller : host.entries(all)) {
        const auto count = host.number(all + controller + "/" + file);
        sum = count ? std::optional(sum.value_or(0) + *count) : sum;
    }
    return sum;
}

}  // namespace

Rows memoryRows() {
    return kRows;
}

std::vector<std::string> listMemory(const Host& /*host*/) {
    return {""};
}

void describeMemory(const Host& host, Found& found) {
    const std::vector<std::string> lines = host.lines("/proc/meminfo");
    found.facts.number(kTotal, counted(lines, "MemTotal"));
    found.facts.number(kAvailable, counted(lines, "MemAvailable"));
    found.facts.number(kSwapTotal, counted(lines, "SwapTotal"));
    found.facts.number(kSwapFree, counted(lines, "SwapFree"));
    found.facts.number(kCorrected, errors(host, "ce_count"));
    found.facts.number(kUncorrected, errors(host, "ue_count"));
}

}  // namespace hardware
