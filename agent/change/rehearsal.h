#pragma once

#include <chrono>
#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "agent/change/change.h"
#include "agent/change/plan.h"
#include "agent/core/host_tools.h"

namespace cvagent::change {

/// What a rehearsal needs to know of the agent that asks for it.
struct RehearsalSettings {
    /// The plug-ins, as in AgentSettings.
    std::vector<std::string> plugins;
    /// Where the agent keeps its data, whichever way it was named; "": the rehearsal finds it as an agent
    /// does.
    std::string dataDirectory;
    /// As the agent runs the plug-in's commands.
    HostTools hostTools = HostTools::automatic;
    Commands commands = Commands::direct;
    /// Until then it has ended, with all that it started.
    std::chrono::milliseconds longest{30'000};
    /// The program; "": the one beside this program.
    std::string program;
    /// Where it is started by somebody else, with a socket of his as its standard streams, and belongs to
    /// root; "" for a process of our own.
    std::string socket;
    /// Asked now and then while it is waited for; null: always.
    std::function<bool()> goesOn;
};

/// Why nothing could be tried: the host gives no namespaces, the program is missing or was cut off.
class CannotRehearse : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Has the changes made one after the other by the plug-in itself, in a process that sees the host but cannot
/// reach it, and tells what they did there. A change that fails does not keep the others back. Nothing of the
/// host is changed. Needs no agent; any thread. A signal that ends the calling process ends the rehearsal,
/// too. Throws CannotRehearse.
Plan rehearse(const RehearsalSettings& settings, const std::vector<Change>& changes);

}  // namespace cvagent::change
