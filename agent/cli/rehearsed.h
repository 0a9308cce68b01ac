#pragma once

#include "agent/change/rehearsal.h"
#include "agent/cli/changes.h"

namespace cvagent {

/// Has the changes tried out, in this order, by the plug-ins of the options. Throws CannotRehearse.
change::Plan rehearsed(const Options& options, const std::vector<MeantChange>& changes);

/// The changes of a list that are not so already, in the order in which they are made; indices of the list.
std::vector<std::size_t> toBeMade(const std::vector<MeantChange>& changes, const std::vector<Found>& found);

/// Objections to some of the changes, each with its index in the list.
std::vector<change::Objection> objectionsToThese(const std::vector<MeantChange>& changes,
                                                 const std::vector<std::size_t>& indices);

}  // namespace cvagent
