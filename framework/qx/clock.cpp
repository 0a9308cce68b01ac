#include "framework/qx/clock.h"

#include <algorithm>
#include <atomic>

#include "framework/qx/thread.h"

namespace QX {
namespace {

std::atomic<double> clockSpeed{1.0};
std::atomic<void (*)(double)> waitWitness{nullptr};
constexpr double kLongestWait = 1e9;  // seconds

}  // namespace

std::chrono::nanoseconds scaled(std::chrono::duration<double> real) {
    if (auto* const witness = waitWitness.load()) {
        witness(real.count());
    }
    const double seconds = std::min(real.count() / clockSpeed.load(), kLongestWait);
    return std::chrono::nanoseconds(static_cast<long long>(seconds * 1e9));
}

void setWaitWitness(void (*witness)(double seconds)) {
    waitWitness = witness;
}

void setClockSpeed(double factor) {
    clockSpeed = factor > 0 ? factor : 1.0;
}

}  // namespace QX
