#pragma once

#include <optional>

#include "agent/cli/options.h"

namespace cvagent {

/// Reads the command line. Prints help and complaints itself.
/// @param status receives the exit status when there is nothing to run
/// @return what to run, or nothing
std::optional<Options> parseCommandLine(int count, const char* const* words, int& status);

}  // namespace cvagent
