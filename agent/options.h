#pragma once

#include <optional>
#include <string>
#include <vector>

namespace cvagent {

enum class Command { tree, get, set, watch, properties, doctor };

/// Which tools the plug-in's commands find: the host's own, the adapters, or of each the one that speaks the
/// classic format.
enum class HostTools { automatic, native, classic };

/// How the plug-in's commands are run: without a shell where that is safe, or all of them by /bin/sh.
enum class Commands { direct, shell };

constexpr int kErrorLevel = 6000;  ///< log lines from here up are errors

/// What the command line asks for.
struct Options {
    Command command = Command::tree;
    std::optional<std::string> plugin;  ///< none: looked for beside the program
    std::optional<std::string> logFile;
    std::optional<std::string> traceFile;
    std::optional<int> logLevel;
    double commandSeconds = 10;  ///< how long a command of the plug-in may take; 0 for ever
    HostTools hostTools = HostTools::automatic;
    Commands commands = Commands::direct;
    bool json = false;
    bool yes = false;               ///< power actions need no question
    std::optional<double> seconds;  ///< how long to watch; none: until a signal comes
    std::string node;
    std::vector<std::string> properties;
    std::string property;
    std::vector<std::string> values;
    std::string nodeClass;
};

}  // namespace cvagent
