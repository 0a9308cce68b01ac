#pragma once

#include <string>

#include "agent/keep/wish.h"

namespace cvagent::keep {

/// The first line of a file that we have written whole.
inline constexpr const char* kOurMark = "# Written by cvagent; taken back with the change that made it.\n";

/// A whole file for systemd-networkd for one link: what the file says that configures it now, with the wish
/// in it. A drop-in would not do, for it only adds addresses.
/// @param link a name without what is special in a pattern, see checkName()
/// Throws CannotKeep: the file is not understood, or what is asked for does not go with DHCP.
std::string ownNetworkFile(const std::string& text, const std::string& link, const Wish& wish);

/// The path of such a file. networkd takes, of all files that match a link, the one whose name sorts first.
/// @param source the path of the file that configures the link now; it may be ours
/// Throws CannotKeep when no name of ours sorts before that one.
std::string ownNetworkPath(const std::string& source, const std::string& link);

}  // namespace cvagent::keep
