#pragma once

#include <sys/stat.h>

#include <string>

namespace cvagent {

/// Whether what a user owns is the system's: root's and, inside a user namespace, what the kernel shows of
/// owners that the namespace has no number for. A container of a user sees the host's directories so.
bool isTheSystem(uid_t owner);

/// Whether others than its owner can write in a directory. Where every user has a group of his own, what he
/// makes is often writable by it; that is nobody else. An access list counts for others.
/// @param found what lstat told of the place
bool othersCanWrite(const std::string& place, const struct stat& found);

}  // namespace cvagent
