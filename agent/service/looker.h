#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <set>
#include <thread>

#include "agent/core/agent.h"
#include "agent/service/model.h"

namespace cvagent::service {

/// What the service does not know any more because the host has changed; whoever hears of that tells it here.
/// Any thread.
class Freshness {
public:
    virtual ~Freshness() = default;
    /// A node's facts may be others by now; it may also be new. It is looked at soon, once for all tellings
    /// until then.
    virtual void lookAgain(std::uint32_t node) = 0;
    /// Anything may be different.
    virtual void lookAtAll() = 0;
};

/// Looks at nodes on a thread of its own.
class Looker : public Freshness {
public:
    using Clock = std::chrono::steady_clock;

    /// @param agent   outlives it
    /// @param deliver takes each look, on the looker's thread
    Looker(Agent& agent, std::function<void(Look)> deliver) : agent_(agent), deliver_(std::move(deliver)) {}
    Looker(const Looker&) = delete;
    Looker& operator=(const Looker&) = delete;
    /// Waits for a look that is under way.
    ~Looker() override;

    /// The first one, on the calling thread: what the plug-ins stored at their start is that new.
    Look firstLook();
    void start();
    /// No further look begins.
    void stop();

    void lookAgain(std::uint32_t node) override;
    void lookAtAll() override;
    /// How long tellings are gathered before a look.
    void setSettlingTime(std::chrono::milliseconds time) { settling_ = time; }
    /// How many looks have begun.
    std::uint64_t begun() const { return begun_; }

private:
    struct Wanted {
        bool all = false;
        std::set<std::uint32_t> nodes;
        bool any() const { return all || !nodes.empty(); }
    };

    void run();
    Wanted waitForWanted();
    Look look(const Wanted& wanted);
    std::vector<Reading> readAgain(const NodeRef& node, const Request& request) const;

    Agent& agent_;
    const std::function<void(Look)> deliver_;
    std::atomic<std::chrono::milliseconds> settling_{std::chrono::milliseconds(50)};
    std::atomic<std::uint64_t> begun_{0};
    std::mutex guard_;
    std::condition_variable changed_;
    Wanted wanted_;         // guarded by guard_
    bool stopped_ = false;  // guarded by guard_
    std::thread thread_;
};

}  // namespace cvagent::service
