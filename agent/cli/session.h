#pragma once

#include <memory>

#include "agent/cli/failure.h"
#include "agent/cli/options.h"
#include "agent/cli/print.h"
#include "agent/core/agent.h"

namespace cvagent {

/// The agent as the command line needs it: built from the options, with its errors and warnings on standard
/// error. Making it prepares the whole process, so it is made in main, before any thread.
class Session {
public:
    explicit Session(const Options& options);
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
    AgentSettings settingsOf(const Options& options);
    std::vector<std::string> ownPlaces(const Options& options, const AgentSettings& settings) const;
    void start(const AgentSettings& settings);

    std::shared_ptr<DataDirectory> data_;
    std::shared_ptr<ErrorLines> errors_ = std::make_shared<ErrorLines>();
    std::unique_ptr<QuietCommands> quiet_;
    std::unique_ptr<Agent> agent_;
    bool pluginMissing_ = false;
};

/// A request of whoever typed the command: he waits for as long as it takes.
Request ownRequest();

}  // namespace cvagent
