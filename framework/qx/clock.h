#pragma once

#include <chrono>

namespace QX {

/// How long to wait on the steady clock when `real` is asked for, at the speed that setClockSpeed has set.
/// Never more than thirty years, so that adding it to the present time cannot overflow.
std::chrono::nanoseconds scaled(std::chrono::duration<double> real);

}  // namespace QX
