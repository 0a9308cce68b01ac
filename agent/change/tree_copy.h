#pragma once

#include <cstddef>
#include <string>

namespace cvagent::change {

/// What a copy may take at most; it shrinks with what is copied.
struct CopyBudget {
    std::size_t entries = 20'000;
    std::size_t bytes = 128U << 20U;
};

/// Copies directories, regular files and links with their modes and times; of all else, and of what may not
/// be read, nothing. Never waits for a pipe or a device.
/// @param from, to descriptors of directories
/// @return false when the budget does not suffice
bool copyTree(int from, int to, CopyBudget& budget);
/// Copies one regular file into a descriptor. @return whether all of it came over
bool copyContent(int from, int to, CopyBudget& budget);

/// A regular file for reading, whatever else bears its name is left alone. @return -1 with errno
int openRegular(int directory, const std::string& name);

}  // namespace cvagent::change
