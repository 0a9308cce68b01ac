#pragma once

#include <memory>
#include <optional>

#include "agent/cli/options.h"
#include "agent/cli/session.h"
#include "agent/cli/want_messages.h"
#include "agent/core/process.h"
#include "agent/core/signals.h"

namespace cvagent {

/// The plug-ins beside the program become the options' when they name none; what is left out is told. Throws
/// Problem when there are none.
void findPlugins(Options& options);

/// The process as an agent in it needs it, with the plug-ins found. Throws Problem.
/// @param options outlive the settings; names of files in them become absolute with the process
ProcessSettings processSettings(Options& options);

/// The agent in this process.
class LocalSession : public Session {
public:
    /// @param process outlives it
    LocalSession(const PreparedProcess& process, const Options& options, WantMessages& wants);
    /// As end().
    ~LocalSession() override;

    Tree tree(const Request& request) override;
    NodeRef find(const std::string& word) override;
    std::vector<Reading> read(const NodeRef& node, const std::vector<std::string>& properties,
                              const Request& request) override;
    WriteResult write(const NodeRef& node, const Property& row, const std::vector<std::string>& words,
                      const Request& request) override;
    std::shared_ptr<Subscription> subscribe(std::optional<Event::Kind> only) override;
    std::shared_ptr<ShownMarks> marks() override { return shownMarks(); }
    std::size_t countNodes() override;
    void sendAlertsTo(std::function<void(const Event&)> receiver) override;
    void announce(const Event& event) override;
    void showErrors(const Request& request) override;
    void tellMissingTools(const std::vector<Reading>& properties) override;
    /// Stops the agent.
    void end() override;
    /// A plug-in counts that was named, or whose nodes the answer should hold. A question for a node of
    /// another one has its whole answer.
    ExitStatus statusAfter(ExitStatus own) const override;

private:
    void start(const AgentSettings& settings, WantMessages& wants);
    void stop();

    struct Alerts;

    ErrorLines& errors_;
    const std::shared_ptr<Alerts> alerts_;  // a plug-in's thread that hangs at the end keeps it
    std::optional<OrderlyEnd> watching_;    // what waits to be printed at a signal is printed
    std::unique_ptr<Agent> agent_;
    const bool answersForAll_;
    bool pluginMissing_;
};

}  // namespace cvagent
