#pragma once

#include <vector>

#include "agent/core/node_ref.h"

namespace cvagent {

/// Tells what the system did not give and what to do, each want once.
class WantMessages {
public:
    /// @param tree what has just been built: its gaps are named. Null when there is none
    /// @param processors whether those were to be in it
    /// @return whether anything was wanting since the program began
    bool tell(const std::vector<NodeRef>* tree = nullptr, bool processors = true);

private:
    int told_ = 0;
};

/// From here on the program ends with a message and status 1, not by a crash, where there is not even the
/// memory for an exception.
void failPlainlyWithoutMemory();

}  // namespace cvagent
