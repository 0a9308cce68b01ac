#pragma once

#include <optional>
#include <string>
#include <vector>

#include "agent/core/host_tools.h"

namespace cvagent {

enum class Command {
    tree,
    get,
    set,
    watch,
    plan,
    apply,
    exportChanges,
    diff,
    properties,
    doctor,
    history,
    confirm,
    rollback
};

/// How long apply looks whether a change comes about and stays.
inline constexpr double kVerifySeconds = 3;

/// What the command line asks for.
struct Options {
    Command command = Command::tree;
    std::vector<std::string> plugins;     ///< none: looked for beside the program
    std::vector<std::string> catalogues;  ///< beside them; not typed
    bool pluginMissing = false;           ///< one that is beside the program was left out; not typed
    bool pluginsNamed = false;            ///< on the command line; not typed
    bool processors = true;               ///< whether they can be meant; not typed
    std::optional<std::string> bus;       ///< where the service is asked: "none", "system" or an address
    bool byItself = false;                ///< an option concerns an agent of this process; not typed
    bool byService = false;               ///< the service has answered; not typed
    std::optional<std::string> logFile;
    std::optional<std::string> traceFile;
    std::optional<int> logLevel;
    double commandSeconds = 10;  ///< how long a command of the plug-in may take; 0 for ever
    HostTools hostTools = HostTools::automatic;
    Commands commands = Commands::direct;
    bool json = false;
    bool verify = false;            ///< the tree is to be compared with the kernel
    bool yes = false;               ///< power actions need no question
    std::optional<double> seconds;  ///< how long to watch; none: until a signal comes
    std::string program;            ///< whole path of what is run on each alert; "" for nothing
    double programSeconds = 30;     ///< how long it may take
    std::string node;
    std::vector<std::string> properties;
    std::string property;
    std::vector<std::string> values;
    std::string nodeClass;
    // of changes
    std::vector<std::string> nodes;  ///< that are exported; none: all
    std::vector<std::string> words;  ///< of a plan: a file, or node, property and values
    std::string changeFile;          ///< "" for a change that was typed, "-" for standard input
    std::string changeText;          ///< what is in it; not typed
    bool force = false;              ///< although something speaks against it
    bool dryRun = false;             ///< apply tells the plan only
    std::optional<double> verifySeconds;
    /// How long a change waits for its confirmation, or how much more time it gets; nothing: as it comes.
    std::optional<double> confirmSeconds;
    std::string change;         ///< its number; "" for the last one
    bool listsChanges = false;  ///< in place of the history
    // of the history
    std::string since;  ///< as moment.h reads it; "" for the beginning
    std::string until;  ///< the same; "" for the end
    std::vector<std::string> kinds;
    std::optional<unsigned long long> limit;  ///< only the last ones
    std::optional<double> keepDays;           ///< from now on, in place of printing
    std::optional<double> keepMegabytes;
};

}  // namespace cvagent
