#pragma once

#include <string>
#include <vector>

namespace both_ways {

/// What a command line printed and how it ended.
struct Ran {
    std::string out;
    std::string err;
    int status = 0;        ///< as pclose tells it
    bool inShell = false;  ///< it was left to a shell

    bool operator==(const Ran& other) const {
        return out == other.out && err == other.err && status == other.status;
    }
};
void PrintTo(const Ran& ran, std::ostream* stream);

/// Where the command's complaints go: to /dev/null, as under the agent, or to somebody who compares them.
enum class Complaints { unseen, seen };

/// Runs a command line with popen and a real shell.
Ran inShell(const std::string& command, Complaints complaints);
/// Runs it as the agent does, if it is not for a shell to run.
Ran direct(const std::string& command, Complaints complaints);

/// Every command line of the plug-in that asks for something, with an interface's name and whatever else they
/// are given.
std::vector<std::string> productCommands(const std::string& interface);

}  // namespace both_ways
