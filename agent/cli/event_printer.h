#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <utility>
#include <vector>

#include "agent/cli/failure.h"
#include "agent/cli/kept_events.h"
#include "agent/cli/print.h"
#include "agent/core/event_log.h"

namespace cvagent {

/// An event as a line for people.
std::string eventLine(const Event& event, const Style& style);
/// One line on standard error.
void complainOfAlert(const Event& alert);

/// Prints the events of a subscription as lines for people or as JSON. Once standard output takes no more,
/// alerts are told on standard error: the plug-in tells each but once. Any thread.
class EventPrinter {
public:
    /// @param marks what the user was shown before; null where nobody knows
    EventPrinter(std::shared_ptr<Subscription> events, bool asJson,
                 std::shared_ptr<ShownMarks> marks = nullptr)
        : events_(std::move(events)), asJson_(asJson), marks_(std::move(marks)) {}

    /// What the user was not shown before. To be called first.
    void printUnseen();

    /// What waits to be printed. Never throws for an output that fails.
    void printAll();
    /// Prints events as they come, until the output fails.
    /// @param seconds for how long; nothing: until a signal to stop comes. Throws Failure.
    void follow(const std::optional<double>& seconds);
    /// Throws the Failure of the output, if there was one.
    void throwFailure() const;

private:
    void show(const Event& event);
    bool wasUnseen(const Event& event) const;
    void noteShown(std::uint64_t number);
    bool hasFailed() const;

    const std::shared_ptr<Subscription> events_;
    const bool asJson_;
    const std::shared_ptr<ShownMarks> marks_;
    mutable std::mutex guard_;  // guards everything below, and the order of what is printed
    std::optional<Failure> failure_;
    std::vector<Event> unseen_;  // what was shown first
};

}  // namespace cvagent
