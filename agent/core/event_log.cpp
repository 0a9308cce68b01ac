#include "agent/core/event_log.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "agent/core/problem.h"

namespace cvagent {

Subscription::Subscription(std::size_t most, std::optional<Event::Kind> only)
    : most_(most), only_(only), ready_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (ready_ < 0) {
        throw Problem(Problem::failed, std::string("cannot wait for events: ") + std::strerror(errno));
    }
}

Subscription::~Subscription() {
    close(ready_);
}

void Subscription::put(const Event& event) {
    if (only_ && event.kind != *only_) {
        return;
    }
    {
        const std::lock_guard lock(guard_);
        if (events_.size() >= most_) {
            events_.pop_front();
            ++dropped_;
        }
        events_.push_back(event);
    }
    eventfd_write(ready_, 1);
}

Subscription::Taken Subscription::take() {
    eventfd_t count = 0;
    eventfd_read(ready_, &count);
    const std::lock_guard lock(guard_);
    return {std::exchange(events_, {}), std::exchange(dropped_, 0)};
}

/// The subscribers' queues are filled under the log's lock, so that all see the events in one order.
void EventLog::hear(const Event& event) {
    const std::lock_guard lock(guard_);
    Event numbered = event;
    numbered.number = ++last_;
    for (const auto& subscriber : subscribers_) {
        if (const auto listening = subscriber.lock()) {
            listening->put(numbered);
        }
    }
    kept_.push_back(std::move(numbered));
    if (kept_.size() > most_) {
        kept_.pop_front();
    }
}

EventLog::Since EventLog::sinceLocked(std::uint64_t number) const {
    const std::uint64_t gone = last_ - kept_.size();  // the last one that is kept no more
    Since since;
    since.missing = number < gone ? gone - number : 0;
    std::copy_if(kept_.begin(), kept_.end(), std::back_inserter(since.events),
                 [number](const Event& event) { return event.number > number; });
    return since;
}

EventLog::Since EventLog::since(std::uint64_t number) const {
    const std::lock_guard lock(guard_);
    return sinceLocked(number);
}

std::shared_ptr<Subscription> EventLog::subscribe(std::uint64_t after, std::size_t most,
                                                  std::optional<Event::Kind> only) {
    auto subscription = std::make_shared<Subscription>(most, only);
    const std::lock_guard lock(guard_);
    const Since past = sinceLocked(after);
    subscription->dropped_ = past.missing;
    for (const Event& event : past.events) {
        subscription->put(event);
    }
    std::erase_if(subscribers_, [](const auto& subscriber) { return subscriber.expired(); });
    subscribers_.push_back(subscription);
    return subscription;
}

}  // namespace cvagent
