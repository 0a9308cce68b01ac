#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <deque>
#include <mutex>
#include <utility>

#include "agent/commands/commands.h"
#include "agent/json.h"
#include "agent/print.h"
#include "agent/session.h"
#include "agent/signals.h"

namespace cvagent::commands {

namespace {

using Clock = std::chrono::steady_clock;

/// Events on their way from the plug-in's threads to the one that prints.
class EventQueue : public Listener {
public:
    EventQueue() : ready_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}
    EventQueue(const EventQueue&) = delete;
    EventQueue& operator=(const EventQueue&) = delete;
    ~EventQueue() override { close(ready_); }

    void hear(const Event& event) override {
        {
            const std::lock_guard lock(guard_);
            events_.push_back(event);
        }
        eventfd_write(ready_, 1);
    }
    /// Everything heard since the last call.
    std::deque<Event> take() {
        eventfd_t count = 0;
        eventfd_read(ready_, &count);
        const std::lock_guard lock(guard_);
        return std::exchange(events_, {});
    }
    int descriptor() const { return ready_; }

private:
    int ready_;
    std::mutex guard_;
    std::deque<Event> events_;  // guarded by guard_
};

std::string line(const Event& event, const Style& style) {
    std::string text = style.faint(timeText(event.time)) + "  ";
    const std::string path = event.path.empty() ? "(node without a path)" : printable(event.path);
    if (event.kind == Event::Kind::alert) {
        std::string message = event.message;
        message.erase(message.find_last_not_of(' ') + 1);
        text += style.bad("alert") + "      " + style.strong(path) + "  " + printable(message) + "  (codes " +
                std::to_string(event.firstCode) + ", " + std::to_string(event.secondCode) + ", " +
                std::to_string(event.eventCode) + ")";
    } else {
        text += padded(eventName(event.kind), 11) + style.strong(path) + "  " + printable(event.message);
    }
    return text + "\n";
}

/// The time left, as poll takes it; -1 without an end.
int millisecondsTo(const std::optional<Clock::time_point>& end) {
    if (!end) {
        return -1;
    }
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(*end - Clock::now()).count();
    return static_cast<int>(std::clamp<long long>(left, 0, 3600LL * 1000));
}

void printAll(EventQueue& queue, bool asJson, const Style& style) {
    for (const Event& event : queue.take()) {
        print(asJson ? json::event(event) : line(event, style));
    }
}

void follow(EventQueue& queue, const Options& options, const Style& style) {
    std::optional<Clock::time_point> end;
    if (options.seconds) {
        end = Clock::now() +
              std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(*options.seconds));
    }
    while (StopSignals::received() == 0 && (!end || Clock::now() < *end)) {
        pollfd ready[] = {{queue.descriptor(), POLLIN, 0}, {StopSignals::descriptor(), POLLIN, 0}};
        if (poll(ready, 2, millisecondsTo(end)) < 0 && errno != EINTR) {
            throw Failure(ExitStatus::failed, "cannot wait for events");
        }
        printAll(queue, options.json, style);
    }
}

}  // namespace

ExitStatus watch(const Options& options) {
    const Style style = Style::detect();
    EventQueue queue;
    std::optional<OrderlyEnd> waiting;  // to the end of the plug-in and of its last events
    {
        Session session(options, &queue);
        waiting.emplace();
        complain("watching " + std::to_string(session.interface().holdAll().size()) + " nodes" +
                 (options.seconds ? "" : "; Ctrl-C ends it"));
        follow(queue, options, style);
    }
    printAll(queue, options.json, style);  // what came while the plug-in was stopped
    return ExitStatus::done;
}

}  // namespace cvagent::commands
