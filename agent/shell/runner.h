#pragma once

#include <cstdio>
#include <optional>

namespace cvagent::shell {

/// From here on every command is left to a shell, or none that need not be. To be set once, before there are
/// any.
void leaveAllToShell(bool all);

/// Has every command told before it begins, on the thread that gives it. To be set once, before there are
/// any.
void hearCommands(void (*hear)(const char* command));
/// A command begins.
void tellCommand(const char* command);

/// Runs a command as popen(command, "r") does.
/// @return nothing when it is for a shell to run; null with errno when the system has no room for it
std::optional<FILE*> openCommand(const char* command);

/// Has a shell run it, as popen(command, "r") does; what is left behind with its pipe can be cut off.
/// @return null with errno when there is no process for it
FILE* openInShell(const char* command);

/// Ends what these gave, as pclose does.
/// @return nothing for a stream that is not from there
std::optional<int> closeCommand(FILE* stream);

/// Runs a command as system does.
/// @return nothing when it is for a shell to run
std::optional<int> runCommand(const char* command);

}  // namespace cvagent::shell
