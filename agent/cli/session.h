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

/// The process as the command line needs it; the plug-in beside the program becomes the options' when they
/// name none. Throws Problem.
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
    /// What the command's own status comes to when a plug-in is missing.
    ExitStatus statusAfter(ExitStatus own) const;

private:
    void start(const AgentSettings& settings, WantMessages& wants);

    struct Alerts;

    ErrorLines& errors_;
    const std::shared_ptr<Alerts> alerts_;  // a plug-in's thread that hangs at the end keeps it
    std::optional<OrderlyEnd> watching_;    // what waits to be printed at a signal is printed
    std::unique_ptr<Agent> agent_;
    bool pluginMissing_ = false;
};

/// A request of whoever typed the command: he waits for as long as it takes.
Request ownRequest();

}  // namespace cvagent
