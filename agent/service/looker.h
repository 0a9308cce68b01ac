#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <thread>
#include <vector>

#include "agent/core/agent.h"
#include "agent/service/host_files.h"
#include "agent/service/host_links.h"
#include "agent/service/late_readings.h"
#include "agent/service/model.h"
#include "agent/service/tree_keeper.h"

namespace cvagent::service {

/// Looks at nodes on a thread of its own: once for all that is told until nothing has come for the settling
/// time, or for five times as long, but a second at most, or until the agent has written; and for no more
/// than half of the time.
class Looker {
public:
    using Clock = std::chrono::steady_clock;

    /// @param agent   outlives it
    /// @param deliver takes each look, on the looker's thread
    Looker(Agent& agent, std::function<void(Look)> deliver)
        : agent_(agent), deliver_(std::move(deliver)), keeper_(agent) {}
    Looker(const Looker&) = delete;
    Looker& operator=(const Looker&) = delete;
    /// Waits for a look that is under way.
    ~Looker();

    /// The first one, on the calling thread: what the plug-ins stored at their start is that new.
    /// @param linksBefore those that there were ahead of that start
    Look firstLook(const LinkIndices& linksBefore);
    void start();
    /// No further look begins.
    void stop();

    // What is not known any more because the host has changed; whoever hears of that tells it. Any thread.
    /// A node's facts may be others by now; it may also be new. It is looked at soon, once for all tellings
    /// until then.
    void lookAgain(std::uint32_t node);
    /// The agent itself has written to a node: what that may have changed is looked at as soon as may be.
    void wrote(std::uint32_t node);
    /// Anything may be different.
    void lookAtAll();
    /// The kernel has announced something. Links come with it, as they are now.
    void hear(const HostChange& change);
    /// An alert has come of a node, which tells it apart from one that nobody heard of.
    void alertCame(std::uint32_t node);

    /// How long tellings are gathered before a look.
    void setSettlingTime(std::chrono::milliseconds time) { settling_ = time; }
    /// How many looks have begun.
    std::uint64_t begun() const { return begun_; }

private:
    struct Wanted {
        bool all = false;
        bool follow = false;  // what nodes there are
        bool atOnce = false;
        bool hostFiles = false;  // what is in them
        std::set<std::uint32_t> nodes;
        std::set<std::uint32_t> alerted;
        HostChange host;
        HostChange later;  // was heard before
        bool any() const { return all || follow || !nodes.empty() || !alerted.empty() || host.any(); }
    };
    template <class Change>
    void want(const Change& change);

    void run();
    Wanted waitForWanted();
    Clock::time_point lookTime() const;
    Look look(const Wanted& wanted);
    std::optional<Clock::time_point> due() const;
    void noteForLater(Wanted& wanted);
    void keepTree(const Wanted& wanted, const Request& request);
    static bool isWhollyWanted(const NodeRef& node, const Wanted& wanted);
    std::optional<Agent::Asked> askedOf(const NodeRef& node, const Wanted& wanted) const;
    static std::optional<Agent::Asked> askedOfNew(const NodeRef& node);
    std::vector<NodeView> readAgain(const std::vector<Agent::Asked>& asked, const Request& request);
    std::vector<NodeView> readFirst(const std::vector<NodeRef>& nodes, const Request& request);
    bool setStatus(const NodeRef& node) const;

    Agent& agent_;
    const std::function<void(Look)> deliver_;
    std::atomic<std::chrono::milliseconds> settling_{std::chrono::milliseconds(200)};
    std::atomic<std::uint64_t> begun_{0};
    std::mutex guard_;
    std::condition_variable changed_;
    Wanted wanted_;                // guarded by guard_
    Clock::time_point firstTold_;  // of what is wanted, guarded by guard_ ...
    Clock::time_point lastTold_;   // ... and the last; guarded by guard_
    bool stopped_ = false;         // guarded by guard_
    // The thread's own, once it has started.
    TreeKeeper keeper_;
    HostFiles files_;
    std::shared_ptr<const HostLinks> links_;  // null until they are told
    std::set<std::uint32_t> met_;             // nodes that were looked at
    HostChange later_;                        // what others hear of, too, and look at by themselves
    std::optional<Clock::time_point> laterAt_;
    LateReadings late_;
    Clock::time_point restUntil_;
    std::thread thread_;
};

}  // namespace cvagent::service
