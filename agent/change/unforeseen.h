#pragma once

#include <string>
#include <vector>

#include "agent/change/attempt.h"

namespace cvagent::change {

/// What a plan cannot tell, in sentences for people.
std::vector<std::string> unforeseen(const Plan& plan, const Isolation& isolation);

}  // namespace cvagent::change
