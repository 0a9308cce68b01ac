#pragma once

#include <sys/types.h>

#include <vector>

#include "framework/qx/process_tree.h"

namespace cvagent {

/// Remembers the children that this process was born with, for a shell has become this program (`exec`). They
/// are nobody's commands. To be called before any thread and any command.
void rememberChildrenOfTheCaller();
const std::vector<QX::ChildProcess>& childrenOfTheCaller();

/// The commands that a thread of this process has started and that have not ended.
std::vector<QX::ChildProcess> commandsOf(pid_t thread);

/// The kernel's ids of this process's threads; those of threads that end meanwhile can be among them.
std::vector<pid_t> ownThreads();

}  // namespace cvagent
