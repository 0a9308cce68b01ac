#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>
#include <tuple>
#include <vector>

#include "framework/export.h"

namespace QX {

/// Kills the child processes that one thread of this process has started, and all their descendants. A
/// shell's pipeline is stopped as a whole before anything of it dies, so that no stage escapes and keeps the
/// pipe open. Where the kernel lists no children, they are those that the thread waits for at that moment:
/// the processes at the other end of the pipe that it reads, or the child whose end it waits for.
/// @param thread kernel id of the thread; it must be alive
CORVISTA_API void killChildrenOf(pid_t thread);

/// Kills the processes in the group of this process that have an entry in their environment, and all their
/// descendants: commands whose parent has died, which are nobody's children. What has left the group to live
/// on, as a service does, is spared.
/// @param entry NAME=VALUE
/// @param since by CLOCK_BOOTTIME: those that were there before are spared
/// @return whether there were any
CORVISTA_API bool killMarked(const std::string& entry, std::chrono::nanoseconds since);

/// A child process: its number and, since numbers are given out again, when it started.
struct ChildProcess {
    pid_t id = 0;
    unsigned long long started = 0;  ///< clock ticks since the machine's start

    bool operator==(const ChildProcess&) const = default;
    friend bool operator<(const ChildProcess& left, const ChildProcess& right) {
        return std::tie(left.id, left.started) < std::tie(right.id, right.started);
    }
};

/// The child processes of one thread of this process that have not ended.
/// @param thread its kernel id; there are none of a thread that has gone
CORVISTA_API std::vector<ChildProcess> childrenOf(pid_t thread);

/// As killChildrenOf(thread), without some of them.
CORVISTA_API void killChildrenOf(pid_t thread, const std::vector<ChildProcess>& spared);

/// Kills one of them with all its descendants, as killChildrenOf does. A descendant that has lost its parent
/// before is nobody's child here and lives on.
/// @return false when it had ended before
CORVISTA_API bool killChild(pid_t thread, const ChildProcess& child);

/// The numbers among the names in a directory of /proc: processes, threads, descriptors. None when it is
/// gone.
CORVISTA_API std::vector<int> numbersIn(const std::string& directory);

/// Has a function called with each process right before one of the functions above kills it, on the thread
/// that kills: who waits for it can tell such an end from any other. To be set once, before there are
/// threads.
CORVISTA_API void setKillCallBack(void (*callBack)(pid_t));

}  // namespace QX
