#pragma once

#include <string>
#include <vector>

namespace cvagent {

/// Leaves in the environment what the plug-in's commands need and takes out the rest: what loads other code
/// (LD_PRELOAD), changes what tools print (GREP_OPTIONS, POSIXLY_CORRECT) or what a shell does (BASH_ENV) is
/// not for commands that run as root. LC_ALL is C, for a translated tool prints other words. To be called
/// before any thread.
void reduceEnvironment();

/// What stands in the environment of the commands, and of all that they start, once it is reduced:
/// NAME=VALUE, of this process alone.
std::string markOfCommands();

/// The directories of PATH, in order.
std::vector<std::string> directoriesOnPath();

}  // namespace cvagent
