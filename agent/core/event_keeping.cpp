#include "agent/core/event_keeping.h"

#include <system_error>
#include <utility>

namespace cvagent {

namespace {

bool mustBeSafe(const Event& event) {
    return event.kind == Event::Kind::alert || event.kind == Event::Kind::written;
}

}  // namespace

EventKeeping::~EventKeeping() {
    {
        const std::lock_guard lock(guard_);
        ending_ = true;
        come_.notify_one();
    }
    if (thread_.joinable()) {
        thread_.join();
    } else {
        keeper_->settle();
    }
}

/// @return whether there is a thread for it. With the guard.
bool EventKeeping::begin() {
    try {
        if (!thread_.joinable()) {
            thread_ = std::thread([this] { work(); });
        }
        return true;
    } catch (const std::system_error&) {
        return false;
    }
}

void EventKeeping::hear(const Event& event) {
    std::unique_lock lock(guard_);
    told_.wait(lock, [this] { return waiting_.size() < kMostWaiting; });
    if (!begin()) {
        handOn({event});
        return;
    }
    waiting_.push_back(event);
    const std::uint64_t place = ++heardCount_;
    come_.notify_one();
    if (mustBeSafe(event)) {
        told_.wait(lock, [this, place] { return toldCount_ >= place; });
    }
}

void EventKeeping::handOn(std::vector<Event> events) {
    keeper_->keep(events);
    for (const Event& event : events) {
        next_.hear(event);
    }
}

void EventKeeping::work() {
    bool settled = true;
    std::unique_lock lock(guard_);
    const auto something = [this] { return !waiting_.empty() || ending_; };
    for (;;) {
        if (settled) {
            come_.wait(lock, something);
        } else {
            come_.wait_for(lock, kUntilSettled, something);
        }
        if (!waiting_.empty()) {
            std::vector<Event> events = std::exchange(waiting_, {});
            const std::uint64_t last = heardCount_;
            lock.unlock();
            handOn(std::move(events));
            lock.lock();
            settled = false;
            toldCount_ = last;
            told_.notify_all();
            continue;
        }
        if (!settled) {
            lock.unlock();
            keeper_->settle();
            lock.lock();
            settled = true;
        }
        if (ending_ && waiting_.empty()) {
            return;
        }
    }
}

}  // namespace cvagent
