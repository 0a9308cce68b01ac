#pragma once

#include <string>
#include <vector>

#include "agent/undo/file_state.h"

namespace cvagent::undo {

/// Which of the saved files are to be put back: what the change left there stands there still.
/// @param left what the change left, in the order of `before`; empty when it did not come to its end: then
///             whatever stands there is its work
/// @param now what stands there, in the same order
/// @param others gets the index of each that somebody else has changed since
/// @return indices
std::vector<std::size_t> filesToPutBack(const std::vector<FileState>& before,
                                        const std::vector<FileState>& left, const std::vector<FileState>& now,
                                        std::vector<std::size_t>& others);

/// Puts these back: directories from the outside in, then files and links, each under its name at once, last
/// what was not there, from the inside out. Can be done again and again.
/// @param notes gets a line for each that is not put back
void putBackFiles(const std::vector<FileState>& before, const std::vector<std::size_t>& indices,
                  std::vector<std::string>& notes);

}  // namespace cvagent::undo
