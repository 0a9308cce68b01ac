#pragma once

#include <vector>

#include "agent/change/covers.h"
#include "agent/change/namespaces.h"
#include "agent/change/network_copy.h"
#include "agent/change/plan.h"
#include "agent/change/request_json.h"

namespace cvagent::change {

/// What was made so that nothing of the host can be reached.
struct Isolation {
    std::vector<Cover> covers;
    NetworkCopy network;  ///< entered already behind dropped rights
    std::string dataDirectory;
    bool asUser = false;
    Fence fence = Fence::userNamespace;
};

/// Starts the plug-ins, enters the network's copy, makes the changes and tells what came of it. Throws Cannot
/// and Problem.
Plan attempt(const RehearsalRequest& request, const Isolation& isolation);

}  // namespace cvagent::change
