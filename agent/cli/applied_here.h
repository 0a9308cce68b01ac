#pragma once

#include <vector>

#include "agent/cli/changes.h"

namespace cvagent {

/// The changes made by this process, one after the other, through the service or not; what they touch is kept
/// for taking them back. Asks a person before the host stops.
/// @param already whether a change that is so already is made all the same
std::vector<change::Outcome> appliedHere(Session& session, const std::vector<change::MeantChange>& changes,
                                         const Options& options, change::Already already,
                                         std::optional<double> verifySeconds);

}  // namespace cvagent
