#pragma once

#include <sys/types.h>

namespace QX {

/// Kills the child processes that one thread of this process has started, and all their descendants. A
/// shell's pipeline is stopped as a whole before anything of it dies, so that no stage escapes and keeps the
/// pipe open.
/// @param thread kernel id of the thread; it must be alive
void killChildrenOf(pid_t thread);

}  // namespace QX
