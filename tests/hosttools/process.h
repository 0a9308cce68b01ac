#pragma once

#include <functional>
#include <string>
#include <vector>

/// What a program left behind.
struct Outcome {
    int status = -1;  ///< exit status; -1 when a signal ended it
    std::string output;
    std::string errors;
};

using Words = std::vector<std::string>;

/// Runs a program (found through PATH when its name has no slash) and waits for it.
/// @param before runs in the child in front of the program
Outcome run(const Words& words, const std::function<void()>& before = {});
/// Runs a shell command line.
Outcome shell(const std::string& command);
/// A command of one of the adapters, or its name alone, with the path of the adapter's link.
std::string adapter(const std::string& command);
/// The same on a host that has no other tool of that name.
std::string adapterAlone(const std::string& command);
/// @return whether PATH leads to such a program
bool hasProgram(const std::string& name);
