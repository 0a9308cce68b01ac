#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "agent/change/apply.h"
#include "agent/cli/failure.h"
#include "agent/cli/kept_events.h"
#include "agent/core/event_log.h"
#include "agent/core/node_ref.h"
#include "agent/core/request.h"
#include "agent/core/writer.h"

namespace cvagent {

/// How a service is to make changes.
struct ApplyOptions {
    bool force = false;
    bool plain = false;  ///< neither tried out nor left out where it is so already
    /// How long to look at what was written; nothing: not at all.
    std::optional<double> verifySeconds;
    std::optional<double> confirmSeconds;  ///< to wait for the confirmation; nothing: not at all
    bool unguarded = false;                ///< made although it cannot be taken back
};

/// What the commands ask of an agent: one of this process (LocalSession) or the service
/// (remote/remote_session.h). Errors and warnings of either go to standard error. Everything may throw
/// Problem or Failure.
class Session : public change::ChangedHost {
public:
    struct Tree {
        std::vector<std::string> plugins;  ///< files of those at work
        std::vector<NodeRef> nodes;
        std::vector<std::vector<Reading>> readings;  ///< what a tree shows of each node
    };

    virtual Tree tree(const Request& request) = 0;
    struct NodeReadings {
        NodeRef node;
        std::vector<Reading> readings;
    };
    /// As find() and read(), which a service does at once.
    virtual NodeReadings findAndRead(const std::string& word, const std::vector<std::string>& properties,
                                     const Request& request);
    // A service makes plans and changes by itself, as its user, and judges, tries out, writes and looks in
    // one. Null: this process does it, since the service does not know how, or does not let this user, which
    // is told.
    virtual std::unique_ptr<change::Preview> preview(const std::vector<change::MeantChange>& /*changes*/) {
        return nullptr;
    }
    virtual std::unique_ptr<std::vector<change::Outcome>> apply(
        const std::vector<change::MeantChange>& /*changes*/, const ApplyOptions& /*options*/) {
        return nullptr;
    }

    /// Events from now on, and those that a local start brings.
    virtual std::shared_ptr<Subscription> subscribe(std::optional<Event::Kind> only) = 0;
    /// What this user was shown of them before; null where nobody knows.
    virtual std::shared_ptr<ShownMarks> marks() = 0;
    /// How many nodes those events are about.
    virtual std::size_t countNodes() = 0;
    /// From now on alerts go there, on whatever thread brings them, and not to standard error, and events of
    /// the service come; null: back.
    virtual void sendAlertsTo(std::function<void(const Event&)> receiver) = 0;

    /// Becomes an event of its agent's; a service finds out by itself.
    void announce(const Event& event) override = 0;
    /// Prints what the plug-in has reported because of a call, and then what it reported by itself.
    void showErrors(const Request& request) override = 0;
    /// Names the tools that are missing for good, and what they cost.
    /// @param properties those that were asked for; none: the whole tree is
    virtual void tellMissingTools(const std::vector<Reading>& properties) = 0;
    /// No more events come, and what is reported on the way there is shown.
    virtual void end() = 0;
    /// What the command's own status comes to when a plug-in is missing.
    virtual ExitStatus statusAfter(ExitStatus own) const = 0;
};

/// While it lives, alerts go elsewhere; see Session::sendAlertsTo.
class AlertsTo {
public:
    AlertsTo(Session& session, std::function<void(const Event&)> receiver) : session_(session) {
        session_.sendAlertsTo(std::move(receiver));
    }
    AlertsTo(const AlertsTo&) = delete;
    AlertsTo& operator=(const AlertsTo&) = delete;
    ~AlertsTo() { session_.sendAlertsTo(nullptr); }

private:
    Session& session_;
};

/// Prints errors that a plug-in has reported.
void showLines(ErrorLines& errors);

/// A request of whoever typed the command: he waits for as long as it takes.
Request ownRequest();

}  // namespace cvagent
