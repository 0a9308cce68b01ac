#include <poll.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <optional>

#include "agent/cli/commands/commands.h"
#include "agent/cli/event_program.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/core/signals.h"

namespace cvagent::commands {

namespace {

using Clock = std::chrono::steady_clock;

/// "LinkState: 1 -> 12"; what is not known is left out.
std::string changeText(const Event& event) {
    const std::string before = event.before.empty() ? "" : printable(event.before) + " -> ";
    return event.propertyName + ": " + before + (event.after.empty() ? "not known" : printable(event.after));
}

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
        const bool isWrite = event.kind == Event::Kind::written;
        text += padded(eventName(event.kind), 11) + style.strong(path) + "  " +
                (isWrite ? changeText(event) : printable(event.message));
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

void printAll(Subscription& events, bool asJson, const Style& style) {
    const Subscription::Taken taken = events.take();
    if (taken.dropped > 0) {
        complain(std::to_string(taken.dropped) + " events came faster than they could be printed");
    }
    for (const Event& event : taken.events) {
        print(asJson ? json::event(event) : line(event, style));
    }
}

void follow(Subscription& events, const Options& options, const Style& style) {
    std::optional<Clock::time_point> end;
    if (options.seconds) {
        end = Clock::now() +
              std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(*options.seconds));
    }
    while (StopSignals::received() == 0 && (!end || Clock::now() < *end)) {
        pollfd ready[] = {{events.descriptor(), POLLIN, 0}, {StopSignals::descriptor(), POLLIN, 0}};
        if (poll(ready, 2, millisecondsTo(end)) < 0 && errno != EINTR) {
            throw Failure(ExitStatus::failed, "cannot wait for events");
        }
        printAll(events, options.json, style);
    }
}

}  // namespace

ExitStatus watch(Session& session, const Options& options) {
    print("");                 // an output that is closed is told now, not at the first event
    const OrderlyEnd waiting;  // to the end of the plug-in and of its last events
    const auto events = session.agent().subscribe(0);
    std::optional<EventProgram> program;
    if (!options.program.empty()) {
        program.emplace(options.program, EventProgram::Seconds(options.programSeconds),
                        session.agent().subscribe(0, Event::Kind::alert));
    }
    complain("watching " + std::to_string(session.agent().nodes().size()) + " nodes" +
             (options.seconds ? "" : "; Ctrl-C ends it"));
    follow(*events, options, Style::detect());
    session.end();
    printAll(*events, options.json, Style::detect());  // what came while the plug-ins were stopped
    return ExitStatus::done;
}

}  // namespace cvagent::commands
