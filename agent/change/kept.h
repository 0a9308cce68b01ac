#pragma once

#include <functional>
#include <string>

#include "agent/change/meant_change.h"
#include "agent/core/writer.h"
#include "agent/undo/keeper_calls.h"

namespace cvagent::change {

struct Kept {
    bool isKept = false;     ///< by a system of the host: the plug-in's files do not count
    std::string note{};      ///< where it is kept, or why it is not; "" where nobody is known who could
    bool isInForce = false;  ///< that system has been found to use the value, or cannot be reached for a try
    bool isForNow = false;   ///< nobody keeps it: the running host alone is to have it, until its restart
};

/// Has the system that keeps an interface over a restart keep what is written of it. To be called before the
/// write; what it gives is called behind one that the plug-in took. Where the interface has a file of the
/// plug-in's, nothing is kept that was not written there.
/// @param isTried the change is only tried out, where that system cannot be reached: it is not waited for
/// @return none for what is not about an interface of the kernel's, or kept by no such system
std::function<Kept()> keepingOverRestart(const IC::MutableNode& node, const Property& row,
                                         const IC::PropertyValue& value, bool isTried);

/// Whether the system that keeps the interface has the value already, or nobody is known who could keep what
/// the running host has. False where the interface has a file of the plug-in's that says otherwise.
bool isKeptAlready(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value);

/// What that may write for these changes, and has to be told when it is taken back. Asks what runs.
undo::KeeperCalls keeperCallsFor(const std::vector<MeantChange>& changes);

}  // namespace cvagent::change
