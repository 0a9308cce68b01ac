#pragma once

#include <sys/stat.h>

#include <string>

namespace cvagent {

/// Whether what a user owns is the system's: root's and, inside a user namespace, what the kernel shows of
/// owners that the namespace has no number for. A container of a user sees the host's directories so.
bool isTheSystem(uid_t owner);

/// Whether somebody else than the caller and the system owns a place.
bool isSomebodyElses(const struct stat& found);

/// Whether a group counts among those who can write: a program in PATH is trusted to the groups that the host
/// has given its directory to, the agent's own data to nobody.
enum class Writers { everybody, groupsToo };
/// Whether others than its owner can replace what lies in a directory, or lead the way through it elsewhere.
/// @param isGoal it is the end of the way: its sticky bit, which keeps what others own, does not help
bool othersCanReplace(const std::string& place, const struct stat& found, bool isGoal, Writers writers);

/// Whether others than its owner can write in a directory. Where every user has a group of his own, what he
/// makes is often writable by it; that is nobody else. An access list counts for others.
/// @param found what lstat told of the place
bool othersCanWrite(const std::string& place, const struct stat& found);

}  // namespace cvagent
