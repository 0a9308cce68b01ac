#pragma once

#include <sys/types.h>

#include <vector>

namespace cvagent {

/// The kernel's ids of this process's threads; those of threads that end meanwhile can be among them.
std::vector<pid_t> ownThreads();

}  // namespace cvagent
