#pragma once

#include <optional>

#include "agent/cli/options.h"

namespace cvagent {

/// Reads the command line. Throws Failure when it makes no sense.
/// @return what to run; nothing when help was asked for, which is printed
std::optional<Options> parseCommandLine(int count, const char* const* words);

}  // namespace cvagent
