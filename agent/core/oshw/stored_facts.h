#pragma once

#include <vector>

#include "agent/core/reading.h"

/// What the OS/hardware plug-in works out once, when it makes a node. An agent that runs for long keeps it
/// up.
namespace cvagent::oshw {

/// Takes what follows from the readings of one node into its store, and among the readings where they have
/// it; the host is not asked. What the host has not is taken out of the readings. Nodes of other plug-ins
/// stay as they are.
void storeAnew(IC::MutableNode& node, std::vector<Reading>& readings);

/// Whether the plug-in can be asked through this node for links that have appeared.
bool takesLookForLinks(const IC::MutableNode& node);
/// Asks; the nodes are in the plug-in's list then.
void lookForLinks(IC::MutableNode& node);

}  // namespace cvagent::oshw
