#include "agent/core/event_log.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "agent/core/problem.h"

namespace cvagent {

namespace {

std::size_t bytesOf(const Event& event) {
    std::size_t bytes = sizeof(Event);
    for (const std::string* text :
         {&event.nodeClass, &event.path, &event.message, &event.propertyName, &event.before, &event.after,
          &event.caller, &event.wanted, &event.verdict}) {
        bytes += text->size();
    }
    return bytes;
}

std::size_t placeOf(Event::Kind kind) {
    return static_cast<std::size_t>(kind);
}

}  // namespace

void EventQueue::add(Event event) {
    bytes_ += bytesOf(event);
    events_.push_back(std::move(event));
}

Event EventQueue::dropOldest() {
    Event oldest = std::move(events_.front());
    events_.pop_front();
    bytes_ -= bytesOf(oldest);
    return oldest;
}

std::deque<Event> EventQueue::takeAll() {
    bytes_ = 0;
    return std::exchange(events_, {});
}

Subscription::Subscription(std::size_t most, std::optional<Event::Kind> only)
    : only_(only), ready_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)), events_(most) {
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
        events_.add(event);
        while (events_.isTooLong()) {
            events_.dropOldest();
            ++dropped_;
        }
    }
    eventfd_write(ready_, 1);
}

Subscription::Taken Subscription::take() {
    eventfd_t count = 0;
    eventfd_read(ready_, &count);
    const std::lock_guard lock(guard_);
    return {events_.takeAll(), std::exchange(dropped_, 0)};
}

void Subscription::wake() const {
    eventfd_write(ready_, 1);
}

/// The subscribers' queues are filled under the log's lock, so that all see the events in one order.
void EventLog::hear(const Event& event) {
    const std::lock_guard lock(guard_);
    Event numbered = event;
    if (numbered.number == 0) {
        numbered.number = last_ + 1;
    }
    last_ = std::max(last_, numbered.number);
    for (const auto& subscriber : subscribers_) {
        if (const auto listening = subscriber.lock()) {
            listening->put(numbered);
        }
    }
    kept_.add(std::move(numbered));
    while (kept_.isTooLong()) {
        const Event oldest = kept_.dropOldest();
        for (Gone* gone : {&gone_.at(placeOf(oldest.kind)), &allGone_}) {
            *gone = {gone->count + 1, std::max(gone->last, oldest.number)};
        }
    }
}

/// How many of these are lost to who wants those after a number; at most, where that number is lost itself.
std::uint64_t EventLog::Gone::since(std::uint64_t after) const {
    return last > after ? std::min(count, last - after) : 0;
}

std::shared_ptr<Subscription> EventLog::subscribe(std::uint64_t after, std::size_t most,
                                                  std::optional<Event::Kind> only) {
    auto subscription = std::make_shared<Subscription>(most, only);
    const std::lock_guard lock(guard_);
    const std::deque<Event>& kept = kept_.events();
    subscription->dropped_ = (only ? gone_.at(placeOf(*only)) : allGone_).since(after);
    for (const Event& event : kept) {
        if (event.number > after) {
            subscription->put(event);
        }
    }
    std::erase_if(subscribers_, [](const auto& subscriber) { return subscriber.expired(); });
    subscribers_.push_back(subscription);
    return subscription;
}

}  // namespace cvagent
