#pragma once

#include <sys/types.h>

#include <functional>

namespace fake_host {

/// The processes that a fake host's /proc shows, for leak and race checkers and for code that looks at its
/// children. The numbers are given out anew from the start long before this one is reached.
inline constexpr int highestProcess = 1024;

/// Has the numbers given out anew from the start if the last one was not low. The first process of a fake
/// host does so all the time, but on a busy machine others can start many before it comes to it.
void keepProcessNumbersLow();

/// The number of an ordinary user of a fake host.
inline constexpr unsigned int stranger = 12345;

/// Starts a process in new user, mount, UTS, network, IPC and PID namespaces over a fresh root directory; it
/// runs `body` in a child of its own and leaves by _exit when that has ended, which ends everything else in
/// there. `report` receives a Report::problem when the root cannot be built, else the child's wait status.
/// Returns the process as this side sees it; throws when the kernel refuses. Without permission for a user
/// namespace, root gets the others alone and loses the capabilities that reach the machine.
pid_t startWorld(int report, const std::function<void()>& body);

/// Finds out once what does not change from host to host; called before the first one starts.
void prepareRoot();

/// Builds the root directory of the calling process's new mount namespace and moves into it.
void buildRoot();

}  // namespace fake_host
