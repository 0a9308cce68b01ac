#pragma once

#include <optional>
#include <vector>

#include "agent/cli/changes.h"

namespace cvagent {

/// How long a change waits for its confirmation: as asked for, or a minute when a person at a terminal could
/// cut himself off and who makes it may take it back; nothing when nobody waits.
std::optional<double> confirmSeconds(const Options& options, const std::vector<change::MeantChange>& changes);

}  // namespace cvagent
