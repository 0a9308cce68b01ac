#include "agent/service/turns.h"

#include <chrono>
#include <utility>

namespace cvagent::service {

namespace {

constexpr std::size_t kMostTurns = 512;
constexpr std::size_t kTurnsOfOne = 256;  // each connection that a user may have can ask once
constexpr std::chrono::milliseconds kNextTurn{2};

}  // namespace

bool Turns::submit(std::uint32_t user, Work work) {
    if (!waiting_.add(user, std::move(work), kTurnsOfOne, kMostTurns)) {
        return false;
    }
    if (!timer_) {
        proceed();
    }
    return true;
}

/// One at a time: what is asked meanwhile is read only when nothing waits to be sent.
void Turns::proceed() {
    timer_.reset();
    if (connection_.unsent() == 0 && unread_.isKnown()) {
        waiting_.takeNext()();
    }
    if (waiting_.size() > 0) {
        timer_ = loop_.after(kNextTurn, [this] { proceed(); });
    }
}

}  // namespace cvagent::service
