#pragma once

#include <string_view>

#include "hosttools/applet.h"

namespace hosttools {

/// `ethtool INTERFACE` on a kernel without ethtool netlink: asked by the older calls, which know less of a
/// link, and printed as the tool does then.
/// @return the exit status
int listLinkByCalls(std::string_view name, Answer& answer);

}  // namespace hosttools
