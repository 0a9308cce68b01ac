#pragma once

#include <string>
#include <vector>

#include "agent/core/node_ref.h"

namespace cvagent {

/// What the system did not give to the program and to the plug-in's commands: descriptors, processes, memory.
/// The plug-in goes on without, so whoever shows its tree is to tell what may be missing.
struct Want {
    int error = 0;               ///< an errno; 0 when nothing was wanting
    unsigned long commands = 0;  ///< that could not be started
    std::string cause;           ///< what was wanting, with its limit
};

/// What was wanting since the program began. The first call looks at what is left, too, for some of it nobody
/// tells.
Want findWant();

/// The classes that every host has nodes of and that there are none of.
/// @param processors whether those were asked for
std::vector<std::string> missingClasses(const std::vector<NodeRef>& nodes, bool processors);

/// @param error the errno of a call that failed; one that tells of no want, or 0, is passed over
void noteWant(int error);
/// The same from an error line of the plug-in, where it tells of one.
void noteWant(const std::string& errorLine);

}  // namespace cvagent
