#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "agent/core/error_lines.h"

namespace cvagent {

/// Who asks, until when he waits, and the place for the errors of his call. It travels with each call; the
/// agent keeps nothing of it but what a thread needs that still hangs when the caller has gone.
class Request {
public:
    using Clock = std::chrono::steady_clock;

    /// @param caller for the record, events of writes carry it: a user, a connection
    /// @param deadline when the caller wants an answer, whatever it is; the default waits for as long as it
    ///                 takes
    /// @param plan of the change that its writes belong to, as JSON; "" where there is none
    explicit Request(std::string caller, Clock::time_point deadline = Clock::time_point::max(),
                     std::string plan = {})
        : caller_(std::move(caller)), plan_(std::move(plan)), deadline_(deadline) {}

    const std::string& caller() const { return caller_; }
    const std::string& plan() const { return plan_; }
    Clock::time_point deadline() const { return deadline_; }
    /// What the plug-in reported because of this call, and of no other.
    ErrorLines& errors() const { return *errors_; }

private:
    std::string caller_;
    std::string plan_;
    Clock::time_point deadline_;
    std::shared_ptr<ErrorLines> errors_ = std::make_shared<ErrorLines>();
};

}  // namespace cvagent
