#pragma once

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

#include "agent/service/turn_queue.h"

namespace cvagent::service {

/// Threads that do what would hold up the loop, for many users in turn: however much one of them asks for,
/// each other one's next job comes after one of his. Any thread.
class Workers {
public:
    using Job = std::function<void()>;
    struct Limits {
        std::size_t threads;
        std::size_t waitingOfOne;  ///< jobs of one user
        std::size_t waiting;       ///< jobs of all
    };

    explicit Workers(const Limits& limits) : limits_(limits) {}
    Workers(const Workers&) = delete;
    Workers& operator=(const Workers&) = delete;
    /// As end().
    ~Workers();

    /// @return false when too many wait already, and nothing is done
    bool submit(std::uint32_t user, Job job);
    /// No further job begins.
    void stop();
    /// Jobs that have not begun never do; those at work are waited for.
    void end();
    /// Whether one is at work or waits.
    bool isBusy() const;

private:
    void run();
    void startThread();

    const Limits limits_;
    mutable std::mutex guard_;  // guards everything below
    std::condition_variable changed_;
    TurnQueue<Job> waiting_;
    std::size_t atWork_ = 0;
    bool stopped_ = false;
    std::vector<std::thread> threads_;
};

}  // namespace cvagent::service
