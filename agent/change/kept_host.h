#pragma once

#include "agent/change/kept.h"

namespace cvagent::change {

// The same as in kept.h of what is the host's and not an interface's: its names, name servers and search
// domains, the time zone. Kept is what the plug-in has brought into the running host, and nothing else.

/// @param isTried the change is only tried out, where those who keep it cannot be reached: whether they use
///                the value is not looked at
std::function<Kept()> keepingOfHost(const IC::MutableNode& node, const Property& row,
                                    const IC::PropertyValue& value, bool isTried);

/// Adds them to those of the interfaces.
void addCallsOfHost(const std::vector<MeantChange>& changes, undo::KeeperCalls& calls);

/// Whether the host uses these name servers or search domains by a system whose own address alone stands in
/// /etc/resolv.conf, or which adds others to them there. False for any other property.
bool isInForceBySystem(const Property& row, const IC::PropertyValue& value);

}  // namespace cvagent::change
