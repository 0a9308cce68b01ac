#pragma once

#include <chrono>
#include <functional>
#include <optional>

#include "agent/core/event_keeper.h"
#include "agent/core/event_log.h"
#include "agent/history/history.h"

namespace cvagent {

/// Keeps an agent's events in a history, which is opened for the first of them. While it cannot be written,
/// that is told once, events go on with numbers that nobody else has had, and what was not kept is kept
/// later, if it can be.
class Recorder : public EventKeeper {
public:
    /// @param place asked for when the first event comes
    /// @param tell hears of trouble, and of its end
    /// @param pause after a failure nothing is tried for as long: each try can take the time of a busy disk
    Recorder(std::function<HistoryPlace()> place, Tell tell,
             std::chrono::milliseconds pause = std::chrono::seconds(5))
        : place_(std::move(place)), tell_(std::move(tell)), pause_(pause) {}
    Recorder(const Recorder&) = delete;
    Recorder& operator=(const Recorder&) = delete;
    /// Tries once more to keep what was not.
    ~Recorder() override;

    /// Opens the history now. Throws HistoryError.
    /// @return the number of its last event
    std::uint64_t open();

    void keep(std::vector<Event>& events) noexcept override;
    void settle() noexcept override;

private:
    static constexpr std::size_t kMostWaiting = 4096;

    void keepAll(std::vector<Event>& events);
    void keepLater(std::vector<Event>& events);
    void tellTrouble(const std::string& reason);
    void tellEnd();

    const std::function<HistoryPlace()> place_;
    const Tell tell_;
    const std::chrono::milliseconds pause_;
    std::optional<History> history_;
    EventQueue waiting_{kMostWaiting};  // what was numbered and not kept
    std::uint64_t lost_ = 0;            // what will not be kept
    std::uint64_t last_ = 0;
    bool troubled_ = false;
    std::chrono::steady_clock::time_point nextTry_ = std::chrono::steady_clock::time_point::min();
};

}  // namespace cvagent
