#pragma once

#include <memory>
#include <optional>
#include <utility>

#include "agent/core/event_log.h"

namespace cvagent {

/// Prints the events of a subscription as lines for people or as JSON.
class EventPrinter {
public:
    EventPrinter(std::shared_ptr<Subscription> events, bool asJson)
        : events_(std::move(events)), asJson_(asJson) {}

    /// What waits to be printed.
    void printAll() const;
    /// Prints events as they come.
    /// @param seconds for how long; nothing: until a signal to stop comes. Throws Failure.
    void follow(const std::optional<double>& seconds) const;

private:
    std::shared_ptr<Subscription> events_;
    bool asJson_;
};

}  // namespace cvagent
