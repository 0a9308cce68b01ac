#pragma once

#include <chrono>
#include <condition_variable>
#include <deque>
#include <mutex>
#include <thread>

#include "agent/core/event.h"

namespace cvagent {

/// Keeps what a plug-in tells while it starts, and hands it on when it has started: of one that fails, nobody
/// has heard anything. An alert of another thread than the starting one waits for that: the plug-in takes it
/// for told when the call returns, and a process that is ended before would have lost it. Any thread.
class WithheldEvents : public Listener {
public:
    /// @param listener outlives it; null for none
    explicit WithheldEvents(Listener* listener) : listener_(listener) {}

    void hear(const Event& event) override;
    /// The calling thread is the one that starts.
    void startHere();
    /// Hands on what was kept, in its order; what comes later goes straight on.
    void release();
    /// The start has failed: nothing waits any more, and nothing is kept.
    void abandon();

private:
    /// A start that itself waits for the thread that brings the alert goes on after this.
    static constexpr std::chrono::milliseconds kLongestWait{500};

    bool isKept(const Event& event);

    Listener* const listener_;
    std::mutex guard_;  // guards everything below
    std::condition_variable decided_;
    std::thread::id starter_;
    bool released_ = false;
    bool abandoned_ = false;
    std::deque<Event> kept_;
};

}  // namespace cvagent
