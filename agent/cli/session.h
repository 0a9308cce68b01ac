#pragma once

#include <memory>

#include "agent/cli/failure.h"
#include "agent/cli/options.h"
#include "agent/cli/print.h"
#include "agent/cli/want_messages.h"
#include "agent/core/process.h"

namespace cvagent {

/// The plug-ins beside the program become the options' when they name none; what is left out is told. Throws
/// Problem when there are none.
void findPlugins(Options& options);

/// The process as the command line needs it, with the plug-ins found. Throws Problem.
/// @param options outlive the settings; names of files in them become absolute with the process
ProcessSettings processSettings(Options& options);

/// The agent as the command line needs it, with its errors and warnings on standard error.
class Session {
public:
    /// Both outlive it.
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
    /// What the command's own status comes to when a plug-in is missing: one that was named, or one whose
    /// nodes the answer should hold. A question for a node of another one has its whole answer.
    ExitStatus statusAfter(ExitStatus own) const;

private:
    void start(const AgentSettings& settings, WantMessages& wants);

    ErrorLines& errors_;
    std::unique_ptr<Agent> agent_;
    bool answersForAll_;  // the answer is about every plug-in
    bool pluginMissing_;
};

/// A request of whoever typed the command: he waits for as long as it takes.
Request ownRequest();

}  // namespace cvagent
