#pragma once

#include <array>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "agent/core/event.h"

namespace cvagent {

/// Events in their order, as many as are allowed. Texts come from the host and may be long, so the bytes are
/// bounded, too; the newest event is kept however long it is. One thread at a time.
class EventQueue {
public:
    static constexpr std::size_t kMostBytes = std::size_t{16} << 20;

    explicit EventQueue(std::size_t most) : most_(most) {}

    void add(Event event);
    bool isTooLong() const { return events_.size() > most_ || (bytes_ > kMostBytes && events_.size() > 1); }
    Event dropOldest();
    const std::deque<Event>& events() const { return events_; }
    std::deque<Event> takeAll();

private:
    std::size_t most_;
    std::size_t bytes_ = 0;
    std::deque<Event> events_;
};

/// What one subscriber has not taken yet. It may outlive the agent. Any thread.
class Subscription {
public:
    struct Taken {
        std::deque<Event> events;
        /// Events that he would have got and that are lost, since the last call; older than those that are
        /// here. Exact, but for a subscription that began at a number which the log keeps no more and that
        /// is one to one kind, or where the numbers have gaps: then some of them may have been before that
        /// number.
        std::uint64_t dropped = 0;
    };

    /// @param most events that are kept for the subscriber; the oldest goes first
    /// @param only the one kind that he wants; nothing for all
    /// Throws Problem (failed) when the system gives no descriptor.
    explicit Subscription(std::size_t most, std::optional<Event::Kind> only = std::nullopt);
    Subscription(const Subscription&) = delete;
    Subscription& operator=(const Subscription&) = delete;
    ~Subscription();

    /// Everything since the last call.
    Taken take();
    /// Readable when there is something to take. Only take() reads it.
    int descriptor() const { return ready_; }
    /// Makes the descriptor readable although there may be nothing to take.
    void wake() const;
    /// Another one for the subscriber, if it is of his kind.
    void put(const Event& event);

private:
    friend class EventLog;

    const std::optional<Event::Kind> only_;
    int ready_;
    std::mutex guard_;
    EventQueue events_;          // guarded by guard_
    std::uint64_t dropped_ = 0;  // guarded by guard_
};

/// Numbers events, keeps the last of them and hands them to subscribers. Nobody who does not take his events
/// holds up the others or the plug-in. One that has its number already keeps it: it may be an earlier one, of
/// an event that is told once more. Any thread.
class EventLog : public Listener {
public:
    static constexpr std::size_t kMost = 4096;  ///< for a subscriber: a thousand nodes come, go and change
    /// Past ones: they stay for days in an agent that has little memory, and the history has more.
    static constexpr std::size_t kMostPast = 1024;

    /// @param most how many past events are kept
    /// @param last number of the last event that was told before; it and those before are kept no more
    explicit EventLog(std::size_t most = kMostPast, std::uint64_t last = 0)
        : last_(last), kept_(most), allGone_{last, last} {}

    void hear(const Event& event) override;
    /// A queue of the events after a number, those that have happened included; 0 asks for all that are kept.
    std::shared_ptr<Subscription> subscribe(std::uint64_t after, std::size_t most = kMost,
                                            std::optional<Event::Kind> only = std::nullopt);

private:
    /// Events that are kept no more.
    struct Gone {
        std::uint64_t count = 0;
        std::uint64_t last = 0;  ///< number of the last one

        std::uint64_t since(std::uint64_t after) const;
    };

    std::mutex guard_;  // guards everything below
    std::uint64_t last_;
    EventQueue kept_;
    std::array<Gone, kEventKinds> gone_;  // by kind, of those that were told here
    Gone allGone_;
    std::vector<std::weak_ptr<Subscription>> subscribers_;
};

}  // namespace cvagent
