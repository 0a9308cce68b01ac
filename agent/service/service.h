#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "agent/core/agent.h"
#include "agent/service/calls.h"
#include "agent/service/changes.h"
#include "agent/service/config.h"
#include "agent/service/host_watch.h"
#include "agent/service/objects.h"

namespace cvagent::service {

/// The agent on the bus: what it knows, what it is asked, what it tells. The loop's thread.
class Service {
public:
    /// All outlive it.
    /// @param past      what happened before; null where nothing is kept
    /// @param lastEvent its last number
    /// @param rehearsal how changes are tried out
    Service(Loop& loop, bus::Connection& connection, Agent& agent, const Config& config,
            change::RehearsalSettings rehearsal, EventSource past = nullptr, std::uint64_t lastEvent = 0);
    Service(const Service&) = delete;
    Service& operator=(const Service&) = delete;
    /// What is under way is waited for.
    ~Service();

    /// Looks at the host and puts it onto the bus. Throws Problem (busy) when another one has the name.
    /// @param linksBefore those that there were ahead of the agent's start
    void begin(const LinkIndices& linksBefore);
    void configure(const Config& config);
    /// @param end called when readers have left so much unread that the bus is about to listen no more
    void whenBusIsFull(std::function<void()> end) { unread_.whenFull(std::move(end)); }
    /// No further call is answered but that it is over; what is under way comes to its end.
    void windDown();
    /// Whether a write waits or is at work.
    bool isWriting() const { return writers_.isBusy(); }
    /// Gives the memory back that looks and answers have needed since the last time.
    void giveBack();
    std::size_t nodes() const { return model_.all().size(); }

private:
    void take(Look look);
    void takeEvents();
    void follow(const Event& event);
    void armLook();

    Loop& loop_;
    bus::Connection& connection_;
    Agent& agent_;
    Config config_;
    Changes changes_;
    Model model_{changes_};
    Standing standing_;
    Callers callers_;
    Consent consent_;
    Looker looker_;
    Unread unread_;
    Turns turns_;
    Workers readers_;
    std::atomic<bool> ends_ = false;  // read by those below
    Workers writers_;
    Workers planners_;
    Workers lookups_;
    Workers confirmers_;
    Parts parts_;
    Objects objects_;
    std::uint64_t looks_ = 0;
    std::uint64_t doneBefore_ = 0;
    std::shared_ptr<Subscription> events_;
    Loop::Source eventsCome_;
    Loop::Source nextLook_;
    std::optional<HostWatch> hostWatch_;
};

/// Who has the service's name on the bus: "process 123"; "" for nobody. Throws bus::Error.
std::string whoServes(const bus::Connection& connection);

}  // namespace cvagent::service
