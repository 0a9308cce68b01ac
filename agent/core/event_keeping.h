#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "agent/core/event_keeper.h"
#include "agent/core/event_log.h"

namespace cvagent {

/// Has events kept before the log tells them, on a thread of its own, several at once where they come fast.
/// Who brings an alert or a write goes on when it is kept and told; who brings another event goes on at once,
/// unless too many wait. Any thread.
class EventKeeping : public Listener {
public:
    /// @param next outlives it
    EventKeeping(EventLog& next, std::shared_ptr<EventKeeper> keeper)
        : next_(next), keeper_(std::move(keeper)) {}
    EventKeeping(const EventKeeping&) = delete;
    EventKeeping& operator=(const EventKeeping&) = delete;
    /// When all is kept and told. The plug-ins have ended.
    ~EventKeeping() override;

    void hear(const Event& event) override;

private:
    static constexpr std::size_t kMostWaiting = 1024;
    /// A plug-in takes its alerts for told in the moment after the last one of them.
    static constexpr std::chrono::seconds kUntilSettled{2};

    void work();
    void handOn(std::vector<Event> events);
    bool begin();

    EventLog& next_;
    const std::shared_ptr<EventKeeper> keeper_;
    std::mutex guard_;              // guards everything below but the thread's own work
    std::condition_variable come_;  // an event, or the end
    std::condition_variable told_;  // events have been told
    std::vector<Event> waiting_;
    std::uint64_t heardCount_ = 0;
    std::uint64_t toldCount_ = 0;
    bool ending_ = false;
    std::thread thread_;  // made for the first event
};

}  // namespace cvagent
