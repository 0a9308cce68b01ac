#include "agent/cli/event_printer.h"

#include <poll.h>

#include <algorithm>
#include <cerrno>
#include <chrono>

#include "agent/cli/failure.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/core/signals.h"

namespace cvagent {

namespace {

using Clock = std::chrono::steady_clock;

/// "LinkState: 1 -> 12"; what is not known is left out.
std::string changeText(const Event& event) {
    const std::string before = event.before.empty() ? "" : printable(event.before) + " -> ";
    return printable(event.propertyName) + ": " + before +
           (event.after.empty() ? "not known" : printable(event.after));
}

}  // namespace

std::string eventLine(const Event& event, const Style& style) {
    std::string text = style.faint(timeText(event.time)) + "  ";
    const std::string path = event.path.empty() ? "(node without a path)" : printable(event.path);
    if (event.kind == Event::Kind::alert) {
        std::string message = event.message;
        message.erase(message.find_last_not_of(' ') + 1);
        text += style.bad("alert") + "      " + style.strong(path) + "  " + printable(message) + "  (codes " +
                std::to_string(event.firstCode) + ", " + std::to_string(event.secondCode) + ", " +
                std::to_string(event.eventCode) + ")";
    } else {
        const bool isOfProperty = event.kind == Event::Kind::written || event.kind == Event::Kind::changed;
        text += padded(eventName(event.kind), 11) + style.strong(path) + "  " +
                (isOfProperty ? changeText(event) : printable(event.message));
    }
    return text + "\n";
}

namespace {

/// The time left, as poll takes it; -1 without an end.
int millisecondsTo(const std::optional<Clock::time_point>& end) {
    if (!end) {
        return -1;
    }
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(*end - Clock::now()).count();
    return static_cast<int>(std::clamp<long long>(left, 0, 3600LL * 1000));
}

}  // namespace

void complainOfAlert(const Event& alert) {
    std::string text = alert.message;
    text.erase(text.find_last_not_of(' ') + 1);
    complain("alert: " + (alert.path.empty() ? "(node without a path)" : printable(alert.path)) + ": " +
             printable(text));
}

void EventPrinter::printAll() {
    const std::lock_guard lock(guard_);
    const Subscription::Taken taken = events_->take();
    if (taken.dropped > 0) {
        complain(std::to_string(taken.dropped) + " events came faster than they could be printed");
    }
    for (const Event& event : taken.events) {
        if (!wasUnseen(event)) {
            show(event);
        }
    }
    if (!taken.events.empty()) {
        noteShown(taken.events.back().number);
    }
}

void EventPrinter::printUnseen() {
    const std::lock_guard lock(guard_);
    if (!marks_) {
        return;
    }
    ShownMarks::Unseen unseen = marks_->unseen();
    if (unseen.left > 0) {
        complain(std::to_string(unseen.left) + " events before these are not shown; see: cvagent history");
    }
    for (const Event& event : unseen.events) {
        show(event);
    }
    if (!unseen.events.empty()) {
        noteShown(unseen.events.back().number);
    }
    unseen_ = std::move(unseen.events);
}

/// With the guard. An event that waits to be taken may have been kept already, and was then shown with those
/// before.
bool EventPrinter::wasUnseen(const Event& event) const {
    const auto found = std::ranges::lower_bound(unseen_, event.number, {}, &Event::number);
    return found != unseen_.end() && found->number == event.number && found->path == event.path &&
           found->message == event.message;
}

/// With the guard. What was not printed is shown the next time.
void EventPrinter::noteShown(std::uint64_t number) {
    if (marks_ && !failure_) {
        marks_->shown(number);
    }
}

/// With the guard.
void EventPrinter::show(const Event& event) {
    try {
        if (!failure_) {
            print(asJson_ ? json::event(event) : eventLine(event, Style::detect()));
            return;
        }
    } catch (const Failure& failure) {
        failure_ = failure;
        events_->wake();  // whoever follows is to end
    }
    if (event.kind == Event::Kind::alert) {
        complainOfAlert(event);
    }
}

bool EventPrinter::hasFailed() const {
    const std::lock_guard lock(guard_);
    return failure_.has_value();
}

void EventPrinter::throwFailure() const {
    const std::lock_guard lock(guard_);
    if (failure_) {
        throw Failure(*failure_);
    }
}

void EventPrinter::follow(const std::optional<double>& seconds) {
    std::optional<Clock::time_point> end;
    if (seconds) {
        end = Clock::now() +
              std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(*seconds));
    }
    while (StopSignals::received() == 0 && !hasFailed() && (!end || Clock::now() < *end)) {
        pollfd ready[] = {{events_->descriptor(), POLLIN, 0}, {StopSignals::descriptor(), POLLIN, 0}};
        if (poll(ready, 2, millisecondsTo(end)) < 0 && errno != EINTR) {
            throw Failure(ExitStatus::failed, "cannot wait for events");
        }
        printAll();
    }
}

}  // namespace cvagent
