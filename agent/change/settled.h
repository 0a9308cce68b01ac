#pragma once

#include <string>

#include "agent/change/kernel_network.h"
#include "agent/keep/keeper.h"
#include "agent/keep/way.h"
#include "agent/keep/wish.h"

namespace cvagent::change {

struct Settled {
    std::string note;  ///< what is to be told of a lease that is given up or has not come; "" for nothing
    bool lacksLease = false;  ///< none has come
};

/// Waits, some seconds at most, until the system that has been told to keep a wish has it in force: a daemon
/// answers first and sets the link up behind that, asks the network whether somebody else has an address, and
/// for a lease. A link without a carrier is not waited for.
/// @param before the network before it was told
Settled settled(const keep::Link& link, const keep::Wish& wish, const KernelNetwork& before);

/// Goes the way, with what NetworkManager needs for a lease.
void goWithLease(const keep::Way& way, const keep::Link& link);

/// Whether a route goes with a lease when the interface becomes static for good: a DHCP client has laid it;
/// the default route only where another one has taken its place.
bool goesWithLease(const KernelRoute& route, const KernelNetwork& now);

}  // namespace cvagent::change
