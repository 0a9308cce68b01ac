#pragma once

#include <string>
#include <vector>

#include "agent/change/plan.h"
#include "agent/undo/making.h"

namespace cvagent::change {

/// What has to be saved before a change: what its plan names, and what the plug-in writes to on any host, for
/// where there is no plan.
/// @param planned of the plan; empty where there is none
/// @param isOfNetwork false: nothing but the host's own settings is written
std::vector<std::string> touchedPaths(const std::vector<FileChange>& planned, bool isOfNetwork = true);

/// The place for the changes of this host, made where it is missing. Root's. Throws undo::ChangeError.
std::string changesPlace();

/// Starts the guard of a change: a transient service of systemd's where that runs, else a process with a
/// session of its own. Returns when it is at work. Throws undo::ChangeError.
void startGuard(const undo::ChangeDirectory& change);

}  // namespace cvagent::change
