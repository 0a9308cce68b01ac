#include "framework/qx/mutex.h"

#include <algorithm>
#include <chrono>
#include <limits>

namespace QX {

// A flag under a condition variable instead of a timed mutex: the time-out runs on the steady clock, which a
// change of the host's time does not touch.
Mutex::Mutex() = default;
Mutex::~Mutex() = default;

bool Mutex::lock(unsigned long milliseconds) {
    constexpr auto kForEver = std::numeric_limits<unsigned long>::max();
    constexpr unsigned long kLongest = 1'000'000'000;  // eleven days; more would overflow the clock one day
    const auto isFree = [this] { return !held_; };
    std::unique_lock lock(guard_);
    if (milliseconds == kForEver) {
        freed_.wait(lock, isFree);
    } else if (!freed_.wait_for(lock, std::chrono::milliseconds(std::min(milliseconds, kLongest)), isFree)) {
        return false;
    }
    held_ = true;
    return true;
}

void Mutex::unlock() {
    const std::lock_guard lock(guard_);
    held_ = false;
    freed_.notify_one();
}

}  // namespace QX
