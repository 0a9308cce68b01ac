#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/change/rehearsal.h"
#include "agent/core/agent.h"
#include "agent/service/callers.h"
#include "agent/service/consent.h"
#include "agent/service/loop.h"
#include "agent/service/model.h"
#include "agent/service/turns.h"
#include "agent/service/unread.h"
#include "agent/service/workers.h"

namespace cvagent::service {

/// Events behind a number and up to another one, at most so many.
using EventSource =
    std::function<std::vector<Event>(std::uint64_t after, std::uint64_t upTo, std::size_t most)>;

/// What the members of the service's objects need; all of it outlives them.
struct Parts {
    bus::Connection& connection;
    Agent& agent;
    Model& model;
    Callers& callers;
    Consent& consent;
    Turns& turns;
    Unread& unread;
    Workers& readers;
    Workers& writers;
    Workers& planners;
    Workers& lookups;     ///< of what changes mean
    Workers& confirmers;  ///< who have no time to wait behind the others
    std::shared_ptr<Mailbox> mailbox;
    /// How changes are tried out.
    change::RehearsalSettings rehearsal;
    /// Reads what happened behind a number, as many as are wanted; null where nothing is kept. Any thread.
    EventSource past;
};

/// As long as a person waits for a host to change; a write that waits its turn that long is told so.
inline constexpr std::chrono::seconds kWriteTime{150};

/// A call that is answered later. What goes wrong on the way is the answer. Its message counts who holds it
/// without a lock, and so does the connection behind: threads share a call by a CallPointer, never by a copy.
class PendingCall {
public:
    PendingCall(Parts& parts, bus::Message message) : parts_(parts), message_(std::move(message)) {}

    const bus::Message& message() const { return message_; }
    Parts& parts() const { return parts_; }

    /// Sends the answer that a function fills. The loop's thread.
    void answer(const std::function<void(bus::Writer& writer)>& fill) const;
    void fail(const std::string& name, const std::string& text) const;
    /// @param errors what the plug-in reported on the way
    void fail(const Problem& problem, const std::vector<std::string>& errors = {}) const;
    /// Whether the caller reads what he gets; one who does not is refused, or gets nothing at all.
    bool isRead() const { return goesAs(parts_.unread.answerFor(message_.sender())); }
    /// Runs something for the call on the loop's thread; what it throws is the answer.
    void guarded(const std::function<void()>& work) const;
    /// Goes on when it is known who calls.
    void withCaller(std::function<void(const Caller& caller)> next) const;
    /// The same for a large answer: when it is its turn.
    void inTurn(const std::function<void(const Caller& caller)>& next) const;

private:
    bool goesAs(Unread::Answer answer) const;

    Parts& parts_;
    bus::Message message_;
};

/// See heldForLoop.
using CallPointer = std::shared_ptr<const PendingCall>;

/// The last part of the name that a problem has as an error on the bus: "Busy".
const char* errorNameOf(const Problem& problem);
/// Has a job done for the caller in his turn; what it throws is the answer.
void submit(const CallPointer& call, Workers& workers, const Caller& caller, Workers::Job job);
/// Runs what a job has come to on the loop's thread.
void comeBack(const CallPointer& call, std::function<void()> work);

// The methods of com.vantrel.Corvista1.Agent and com.vantrel.Corvista1.Node. They take the arguments from the
// call; the message has the types that the interface says.
void answerTree(const CallPointer& call);
void answerFind(const CallPointer& call);
void startFindAndRead(const CallPointer& call);
void answerEventsSince(const CallPointer& call);
/// @param node the id; nothing: it is the first argument
void startRead(const CallPointer& call, std::optional<std::uint32_t> node);
void startWrite(const CallPointer& call, std::optional<std::uint32_t> node);
void startPlan(const CallPointer& call);
void startApply(const CallPointer& call);
void startConfirm(const CallPointer& call);
void startLengthen(const CallPointer& call);
void startRollback(const CallPointer& call);

}  // namespace cvagent::service
