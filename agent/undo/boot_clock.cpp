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

/// In a container a file may lie over the kernel's; a service with a /proc of its own does not have that.
std::string bootId() {
    const std::string ofFirst = hosttools::readFirstLine("/proc/1/root/proc/sys/kernel/random/boot_id");
    return ofFirst.empty() ? hosttools::readFirstLine("/proc/sys/kernel/random/boot_id") : ofFirst;
}

}  // namespace cvagent::undo
