#pragma once

#include <optional>
#include <string>
#include <vector>

#include "agent/change/processes.h"

namespace cvagent::change {

/// What keeps the clock in step with other clocks: a program that is at work ("chronyd"), or "something" when
/// only the kernel tells that the clock is steered. "" when nobody is known to.
std::string clockSteeredBy();
/// The same from what is known of the host.
/// @param status of the kernel's clock, as adjtimex tells it (STA_...); nothing when it tells none
std::string clockSteeredBy(const std::vector<Process>& running, std::optional<unsigned> status);

}  // namespace cvagent::change
