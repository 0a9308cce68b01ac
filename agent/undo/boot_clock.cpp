#include "agent/undo/boot_clock.h"

#include <ctime>

#include "hosttools/files.h"

namespace cvagent::undo {

std::uint64_t bootMilliseconds() {
    constexpr std::uint64_t kThousand = 1000;
    constexpr std::uint64_t kMillion = 1'000'000;
    timespec now{};
    clock_gettime(CLOCK_BOOTTIME, &now);
    return static_cast<std::uint64_t>(now.tv_sec) * kThousand +
           static_cast<std::uint64_t>(now.tv_nsec) / kMillion;
}

std::string bootId() {
    return hosttools::readFirstLine("/proc/sys/kernel/random/boot_id");
}

}  // namespace cvagent::undo
