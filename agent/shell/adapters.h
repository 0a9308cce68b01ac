#pragma once

#include <memory>
#include <span>
#include <string>

#include "agent/shell/source.h"

namespace cvagent::shell {

/// What one of our own host tools prints when it is called with these words.
/// @param silent whether its complaints are wanted by nobody
/// @return null where the program itself has to run: for whatever is not a listing, for a listing with a
/// complaint that somebody may see, and where a disk would have to be opened
std::unique_ptr<Source> askAdapter(const std::string& name, std::span<const std::string> words, bool silent);

/// Whether the host's own tools find all wired interfaces by the names that these classically have.
bool haveClassicNames();

}  // namespace cvagent::shell
