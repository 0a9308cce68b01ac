#pragma once

#include <functional>
#include <memory>
#include <optional>

#include "agent/cli/failure.h"
#include "agent/cli/options.h"
#include "agent/cli/print.h"
#include "agent/cli/want_messages.h"
#include "agent/core/process.h"
#include "agent/core/signals.h"

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
    /// @param process outlives it
    Session(const PreparedProcess& process, const Options& options, WantMessages& wants);
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;
    /// As end().
    ~Session();

    Agent& agent() { return *agent_; }
    /// Prints what the plug-in has reported because of a call, and then what it reported by itself.
    void showErrors(const Request& request);
    /// Names the tools that are missing for good, and what they cost.
    /// @param properties those that were asked for; none: the whole tree is
    void tellMissingTools(const std::vector<Reading>& properties = {}) const;
    /// Stops the agent and shows what it reports on its way.
    void end();
    /// While it lives, alerts go there, on whatever thread brings them, and not to standard error.
    class AlertsTo {
    public:
        AlertsTo(Session& session, std::function<void(const Event&)> receiver);
        AlertsTo(const AlertsTo&) = delete;
        AlertsTo& operator=(const AlertsTo&) = delete;
        ~AlertsTo();

    private:
        Session& session_;
    };
    /// What the command's own status comes to when a plug-in is missing: one that was named, or one whose
    /// nodes the answer should hold. A question for a node of another one has its whole answer.
    ExitStatus statusAfter(ExitStatus own) const;

private:
    void start(const AgentSettings& settings, WantMessages& wants);

    struct Alerts;

    ErrorLines& errors_;
    const std::shared_ptr<Alerts> alerts_;  // a plug-in's thread that hangs at the end keeps it
    std::optional<OrderlyEnd> watching_;    // what waits to be printed at a signal is printed
    std::unique_ptr<Agent> agent_;
    bool answersForAll_;  // the answer is about every plug-in
    bool pluginMissing_;
};

/// A request of whoever typed the command: he waits for as long as it takes.
Request ownRequest();

}  // namespace cvagent
