#pragma once

#include <sys/types.h>

#include <functional>

namespace cvagent::change {

/// Gives the calling process the right to make namespaces: a user namespace where it is not root. There the
/// caller is root of what is his own. Single-threaded.
/// @return whether it made one
/// Throws Cannot.
bool gainRightToIsolate();

/// Starts a process that is the first one of a process table and of a session of its own, and with whose end
/// all others there end; it ends with this one. Throws Cannot.
/// @param body runs there; what it returns is the process's status
pid_t startFirstProcess(const std::function<int()>& body);

/// The fence: from here on the calling process has no right over anything that was there before. It keeps its
/// user's numbers, and is root over namespaces of its own alone, the host name's among them. What it and its
/// children may do at most shrinks to what such names and a network need.
/// @param mapUsers has another process, which is outside, call mapUsersOf
/// Throws Cannot.
void enterFence(const std::function<void()>& mapUsers);
/// The other side of it: gives the users and groups of a process in a new user namespace the numbers they
/// have here. Throws Cannot.
void mapUsersOf(pid_t process);

}  // namespace cvagent::change
