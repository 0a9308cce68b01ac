#pragma once

#include "agent/undo/change_directory.h"

namespace cvagent::undo {

/// Takes a change back, or goes on with that; whoever was killed at it, another one brings it to the same
/// end. What waits for nothing more (kept) is taken back only when it is asked for by its stage takingBack.
/// While somebody else is at it, waits for him. Throws ChangeError.
/// @return the journal afterwards
Journal takeChangeBack(const ChangeDirectory& change);

/// After a start of the host: takes back what waited for a confirmation or was under way when the power was
/// cut. Only files, for the kernel has begun anew. What cannot be taken back is told and left.
/// @param isWhole becomes false then
/// @return sentences for the log
std::vector<std::string> takeBackAfterStart(const std::string& place, bool& isWhole);

/// Watches over one change until it has ended: takes it back when its time is over, and when who makes it has
/// died. One guard is enough: another one ends at once.
/// @return sentences for the log
std::vector<std::string> guardChange(const ChangeDirectory& change);

}  // namespace cvagent::undo
