#pragma once

#include <functional>
#include <string>
#include <vector>

#include "agent/core/node_classes.h"

namespace cvagent {

// What the system did not give to the program and to the plug-in's commands: descriptors, processes, memory.
// The plug-in goes on without, so what is missing from its tree is to be told here.

/// @param error the errno of a call that failed; one that tells of no want, or 0, is passed over
void noteWant(int error);
/// The same from an error line of the plug-in, where it tells of one.
void noteWant(const std::string& errorLine);

/// From here on the program ends with a message and this status, not by a crash, where there is not even the
/// memory for an exception.
void failPlainlyWithoutMemory(int status);

/// Tells what was not given and what to do, each want once.
/// @param tree what has just been built: its gaps are named. Null when there is none
/// @param processors whether those were to be in it
/// @return whether anything was wanting since the program began
bool tellWant(const std::vector<Handle>* tree, const std::function<void(const std::string&)>& tell,
              bool processors = true);

}  // namespace cvagent
