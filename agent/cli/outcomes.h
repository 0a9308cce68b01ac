#pragma once

#include <string>
#include <vector>

#include "agent/change/outcome.h"
#include "agent/cli/failure.h"

namespace cvagent {

std::string outcomesText(const std::vector<change::MeantChange>& changes,
                         const std::vector<change::Outcome>& outcomes);
std::string outcomesJson(const std::vector<change::MeantChange>& changes,
                         const std::vector<change::Outcome>& outcomes);

/// Failed unless every change is so, or cannot be looked at.
ExitStatus statusOf(const std::vector<change::Outcome>& outcomes);

}  // namespace cvagent
