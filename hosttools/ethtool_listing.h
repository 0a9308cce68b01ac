#pragma once

#include "hosttools/ethtool_netlink.h"
#include "hosttools/text.h"

namespace hosttools {

/// What the kernel has answered, as `ethtool INTERFACE` prints it. Empty when no answer tells anything.
Text listLink(const LinkReplies& replies);

}  // namespace hosttools
