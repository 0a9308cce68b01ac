#pragma once

#include <initializer_list>
#include <optional>
#include <string>

namespace cvagent {

/// The directory that this program's file lies in; empty when nobody tells, without /proc.
std::string programDirectory();

/// Looks for a file or directory at places relative to the directory of this program.
/// @return its whole path, or nothing when it is at none of them
std::optional<std::string> besideProgram(std::initializer_list<const char*> directories, const char* name);

}  // namespace cvagent
