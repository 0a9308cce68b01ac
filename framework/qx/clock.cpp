#include "framework/qx/clock.h"

#include <algorithm>
#include <atomic>

#include "framework/qx/thread.h"

namespace QX {
namespace {

std::atomic<double> clockSpeed{1.0};
std::atomic<void (*)(double)> waitCallBack{nullptr};
constexpr double kLongestWait = 1e9;  // seconds

}  // namespace

std::chrono::nanoseconds scaled(std::chrono::duration<double> real) {
    if (auto* const callBack = waitCallBack.load()) {
        callBack(real.count());
    }
    const double seconds = std::min(real.count() / clockSpeed.load(), kLongestWait);
    return std::chrono::nanoseconds(static_cast<long long>(seconds * 1e9));
}

void setWaitCallBack(void (*callBack)(double seconds)) {
    waitCallBack = callBack;
}

void setClockSpeed(double factor) {
    clockSpeed = factor > 0 ? factor : 1.0;
}

}  // namespace QX
