#pragma once

#include <optional>
#include <vector>

#include "agent/bus/reader.h"
#include "agent/change/apply.h"
#include "agent/service/calls.h"

namespace cvagent::service {

/// A day; see undo::kLongestWindow.
inline constexpr double kLongestConfirmation = 86'400;

/// Throws bus::Error for what is no number of seconds from 0 to that.
void judgeSeconds(double seconds, const std::string& name, double longest);

/// The argument a(ssv): node, property and value as in a file of changes, and within the same bounds. Throws
/// bus::Error.
std::vector<change::NamedChange> takeChanges(bus::Reader& reader);

struct ApplyWishes {
    bool force = false;
    bool plain = false;
    std::optional<double> verifySeconds;
    std::optional<double> confirmSeconds;  ///< nothing: nobody waits for a confirmation
    bool unguarded = false;                ///< made although it cannot be taken back
};
/// The argument a{sv}. Throws bus::Error for one that nobody knows.
ApplyWishes takeWishes(bus::Reader& reader);

struct ChangeQuestion {
    /// Who may make these changes.
    std::function<Audience(const std::vector<change::MeantChange>& changes)> audience;
    std::string deed;  ///< "apply", "plan"
    bool isWrite = true;
};
using MayChange = std::function<void(const Caller& caller, const std::vector<change::MeantChange>& changes)>;
/// Finds out who calls and what the changes mean, then whether he may, and goes on, on the loop's thread.
void ifAllowed(const CallPointer& call, const std::vector<change::NamedChange>& named,
               const ChangeQuestion& question, const MayChange& next);

/// The service's own agent, for the time of one call. One thread.
class AgentHost : public change::ChangedHost {
public:
    explicit AgentHost(Agent& agent) : agent_(agent) {}

    NodeRef find(const std::string& word) override { return agent_.find(word); }
    std::vector<Reading> read(const NodeRef& node, const std::vector<std::string>& properties,
                              const Request& request) override;
    WriteResult write(const NodeRef& node, const Property& row, const std::vector<std::string>& words,
                      const Request& request) override;
    void announce(const Event& event) override { agent_.announce(event); }
    void showErrors(const Request& request) override;

    /// What the plug-in has reported.
    const std::vector<std::string>& errors() const { return errors_; }

private:
    Agent& agent_;
    std::vector<std::string> errors_;
};

}  // namespace cvagent::service
