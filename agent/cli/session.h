#pragma once

#include <memory>

#include "agent/cli/failure.h"
#include "agent/cli/options.h"
#include "agent/cli/print.h"
#include "agent/cli/want_messages.h"
#include "agent/core/process.h"

namespace cvagent {

/// The process as the command line needs it; the plug-in beside the program becomes the options' when they
/// name none. Throws Problem.
/// @param options outlive the settings; names of files in them become absolute with the process
ProcessSettings processSettings(Options& options);

/// The agent as the command line needs it, with its errors and warnings on standard error.
class Session {
public:
    /// @param process outlives it
    Session(const PreparedProcess& process, const Options& options, WantMessages& wants);
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;
    /// As end().
    ~Session();

    Agent& agent() { return *agent_; }
    /// Prints what the plug-in has reported because of a call, and then what it reported by itself.
    void showErrors(const Request& request);
    /// Stops the agent and shows what it reports on its way.
    void end();
    /// What the command's own status comes to when a plug-in is missing.
    ExitStatus statusAfter(ExitStatus own) const;

private:
    void start(const AgentSettings& settings, WantMessages& wants);

    ErrorLines& errors_;
    std::unique_ptr<Agent> agent_;
    bool pluginMissing_ = false;
};

/// A request of whoever typed the command: he waits for as long as it takes.
Request ownRequest();

}  // namespace cvagent
