#pragma once

#include <optional>

#include "agent/cli/options.h"

namespace cvagent {

/// "tree" and "get NODE PROPERTY..." without an option but --json, which is what is asked most often. The
/// parser of all options understands the same by them and takes longer than the service takes to answer.
/// @return nothing for all else, and for what may be wrong
std::optional<Options> plainQuestion(int count, const char* const* words);

}  // namespace cvagent
