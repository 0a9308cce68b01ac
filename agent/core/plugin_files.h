#pragma once

#include <string>
#include <vector>

#include "agent/core/problem.h"

namespace cvagent {

/// A file that was named or found and is not used, and why.
struct LeftOut {
    std::string file;
    Problem problem;
};

/// What is to be loaded when nobody names a plug-in.
struct PluginFiles {
    std::vector<std::string> files;  ///< the OS/hardware plug-in first, then the others by name
    std::vector<LeftOut> leftOut;
};

/// The OS/hardware plug-in beside this program, in its build tree or where it was installed, and every file
/// NAME.so.1 of the directory corvista/plug-ins beside it. Nowhere else is anything looked for. What is in
/// that directory runs as the caller: a file of somebody else's, or one that others can write or replace, is
/// left out; root, the caller, and who owns this program are nobody else. Throws Problem when there is none
/// at all.
PluginFiles pluginsBesideProgram();

/// Whether a file is, by its name, the OS/hardware plug-in.
bool isOfThisSystem(const std::string& file);

/// Why others could put something of theirs into a file, or lead the way to it elsewhere; "" when they cannot
/// and it is a regular file.
/// @param file without symbolic links
std::string whyUnsafe(const std::string& file);

}  // namespace cvagent
