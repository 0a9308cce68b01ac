#pragma once

#include <string>
#include <vector>

#include "agent/change/kernel_network.h"

namespace cvagent::change {

/// What a change of an interface may take along: an address all addresses and routes of its family, a gateway
/// the default routes.
struct Touched {
    bool isIpv6 = false;
    bool isGateway = false;
};

/// Puts back what is gone of a link though the change has nothing to do with it: the system that keeps the
/// interface has set it up anew. Not leases, and not what the kernel or a router makes: that comes again.
/// @param notes gets a line for each that cannot be put back
void putBackUntouched(const KernelNetwork& before, unsigned link, Touched touched,
                      std::vector<std::string>& notes);

}  // namespace cvagent::change
