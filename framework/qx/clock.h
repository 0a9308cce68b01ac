#pragma once

#include <chrono>

#include "framework/export.h"

namespace QX {

/// How long to wait on the steady clock when `real` is asked for, at the speed that setClockSpeed has set.
/// Never more than thirty years, so that adding it to the present time cannot overflow. For use by those who
/// are about to wait: it tells the wait witness.
std::chrono::nanoseconds scaled(std::chrono::duration<double> real);

/// Has a function called with the seconds of every sleep, event wait and limited join before it begins, on
/// the thread that waits; a wait begins when it has returned. Null ends that. For tests alone.
CORVISTA_API void setWaitWitness(void (*witness)(double seconds));

}  // namespace QX
