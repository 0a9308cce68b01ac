#pragma once

#include <deque>
#include <mutex>

#include "agent/core/event.h"

namespace cvagent {

/// Keeps what a plug-in tells while it starts, and hands it on when it has started: of one that fails, nobody
/// has heard anything. Any thread.
class WithheldEvents : public Listener {
public:
    /// @param listener outlives it; null for none
    explicit WithheldEvents(Listener* listener) : listener_(listener) {}

    void hear(const Event& event) override;
    /// Hands on what was kept, in its order; what comes later goes straight on.
    void release();

private:
    Listener* const listener_;
    std::mutex guard_;  // guards everything below
    bool released_ = false;
    std::deque<Event> kept_;
};

}  // namespace cvagent
