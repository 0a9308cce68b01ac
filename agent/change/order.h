#pragma once

#include <vector>

#include "agent/change/checks.h"

namespace cvagent::change {

/// In which order changes are made so that each finds what it needs: an interface is brought up and gets its
/// origin before its address, the address comes before the mask and both before the gateway; names and name
/// servers follow, then zone and clock; what takes an interface down comes late, and what stops the host
/// last.
/// @return indices; changes of the same step keep their order
std::vector<std::size_t> orderOf(const std::vector<Wanted>& changes);

}  // namespace cvagent::change
