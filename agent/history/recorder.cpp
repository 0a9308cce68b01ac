#include "agent/history/recorder.h"

#include <algorithm>
#include <deque>

namespace cvagent {

Recorder::~Recorder() {
    nextTry_ = std::chrono::steady_clock::time_point::min();
    std::vector<Event> none;
    if (!waiting_.events().empty()) {
        Recorder::keep(none);
    }
}

std::uint64_t Recorder::open() {
    if (!history_) {
        history_.emplace(place_(), tell_);
    }
    last_ = std::max(last_, history_->last());
    return last_;
}

void Recorder::keep(std::vector<Event>& events) noexcept {
    std::string reason;
    try {
        if (std::chrono::steady_clock::now() >= nextTry_) {
            keepAll(events);
            return;
        }
    } catch (const std::exception& error) {
        reason = error.what();
        nextTry_ = std::chrono::steady_clock::now() + pause_;
    }
    try {
        keepLater(events);
        tellTrouble(reason);
    } catch (const std::exception&) {
        // There is no memory, for the events or for telling of it.
    }
}

void Recorder::keepAll(std::vector<Event>& events) {
    open();
    const std::deque<Event>& before = waiting_.events();
    std::vector<Event> all(before.begin(), before.end());
    all.insert(all.end(), events.begin(), events.end());
    history_->append(all, last_);
    for (std::size_t i = 0; i < events.size(); ++i) {
        events[i].number = all[all.size() - events.size() + i].number;
    }
    for (const Event& event : all) {
        last_ = std::max(last_, event.number);
    }
    waiting_.takeAll();
    tellEnd();
}

void Recorder::keepLater(std::vector<Event>& events) {
    for (Event& event : events) {
        event.number = ++last_;
        waiting_.add(event);
    }
    while (waiting_.isTooLong()) {
        waiting_.dropOldest();
        ++lost_;
    }
}

void Recorder::tellTrouble(const std::string& reason) {
    if (!troubled_) {
        troubled_ = true;
        tell_("what happens is not kept in the history: " + reason);
    }
}

void Recorder::tellEnd() {
    if (troubled_) {
        troubled_ = false;
        tell_("the history is kept again" +
              (lost_ == 0 ? std::string() : "; " + std::to_string(lost_) + " events are not in it"));
        lost_ = 0;
    }
}

void Recorder::settle() noexcept {
    try {
        if (history_) {
            history_->settle();
        }
    } catch (const std::exception&) {
        // An alert that is told once more then has another entry; trouble is told by what comes next.
    }
}

}  // namespace cvagent
