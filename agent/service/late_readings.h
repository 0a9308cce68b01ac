#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <set>

#include "agent/service/model.h"

namespace cvagent::service {

/// What the host did not tell a look in time: on a slow host that was only the look's end, and nothing more
/// may be heard of it. So it is asked for again, after pauses that double, since what hangs may hang for
/// long. One thread.
class LateReadings {
public:
    using Clock = std::chrono::steady_clock;
    using Properties = std::set<unsigned int>;

    /// A look begins.
    void beginLook(Clock::time_point now);
    /// What it is to ask of a node again; empty for nothing.
    Properties of(std::uint32_t node) const;
    /// What it has brought.
    void endLook(const Look& look, Clock::time_point now);
    /// When to look again though nothing is heard.
    std::optional<Clock::time_point> due() const { return due_; }

private:
    static constexpr std::chrono::seconds kFirstPause{2};

    std::map<std::uint32_t, Properties> late_;  // by node
    std::optional<Clock::time_point> due_;
    std::chrono::seconds pause_ = kFirstPause;
    bool isDue_ = false;  // at the look that is under way
};

}  // namespace cvagent::service
