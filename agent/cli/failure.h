#pragma once

#include <stdexcept>
#include <string>

#include "agent/core/problem.h"

namespace cvagent {

/// How the program ends; scripts rely on the numbers.
enum class ExitStatus {
    done = 0,
    failed = 1,    ///< the plug-in or the host failed
    usage = 2,     ///< the command line makes no sense
    notFound = 3,  ///< no such node or property
    refused = 4,   ///< the value is not one the property accepts
    busy = 5,      ///< another agent, or another write, is in the way
};

/// Ends the command: the text goes to standard error and says what to do next.
class Failure : public std::runtime_error {
public:
    Failure(ExitStatus status, const std::string& text) : std::runtime_error(text), status_(status) {}
    /// What the agent could not do, with the command line's advice.
    explicit Failure(const Problem& problem);
    ExitStatus status() const { return status_; }

private:
    ExitStatus status_;
};

/// A stop signal came in place of the answer to a question.
struct Interrupted {};

}  // namespace cvagent
