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

/// What keeps the host out of reach.
enum class Fence {
    userNamespace,  ///< all rights that are left are those over namespaces of its own
    droppedRights  ///< root's, where the host allows no user namespace: what could reach the host is given up
};
/// The first half of the fence, with a host name of its own. In a user namespace the calling process has no
/// right over anything that was there before. It keeps its user's numbers.
/// @param mapUsers has another process, which is outside, call mapUsersOf
/// Throws Cannot.
Fence enterFence(bool asUser, const std::function<void()>& mapUsers);
/// The second half: what the calling process and its children may do at most shrinks to what a network and
/// files need, in a user namespace to what the host's name needs besides. Behind dropped rights the process
/// has to be in a network of its own. Throws Cannot.
void limitRights(Fence fence);
/// The other side of it: gives the users and groups of a process in a new user namespace the numbers they
/// have here. Throws Cannot.
void mapUsersOf(pid_t process);

}  // namespace cvagent::change
