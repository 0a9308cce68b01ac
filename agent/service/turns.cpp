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
    const auto own = waiting_.find(user);
    if (count_ >= kMostTurns || (own != waiting_.end() && own->second.size() >= kTurnsOfOne)) {
        return false;
    }
    waiting_[user].push_back(std::move(work));
    ++count_;
    if (!timer_) {
        proceed();
    }
    return true;
}

/// One at a time: what is asked meanwhile is read only when nothing waits to be sent.
void Turns::proceed() {
    timer_.reset();
    if (connection_.unsent() == 0) {
        next()();
    }
    if (count_ > 0) {
        timer_ = loop_.after(kNextTurn, [this] { proceed(); });
    }
}

Turns::Work Turns::next() {
    auto user = waiting_.upper_bound(last_);
    if (user == waiting_.end()) {
        user = waiting_.begin();
    }
    last_ = user->first;
    Work work = std::move(user->second.front());
    user->second.pop_front();
    if (user->second.empty()) {
        waiting_.erase(user);
    }
    --count_;
    return work;
}

}  // namespace cvagent::service
