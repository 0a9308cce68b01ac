#pragma once

#include "agent/bus/message.h"
#include "agent/core/error_lines.h"
#include "agent/core/problem.h"

namespace cvagent::remote {

/// A Problem that the service has answered with, and what the plug-in reported on the way.
class ServiceProblem : public Problem {
public:
    ServiceProblem(const Problem& problem, std::vector<std::string> errors)
        : Problem(problem), errors_(std::move(errors)) {}
    void addErrorsTo(ErrorLines& lines) const {
        for (const std::string& error : errors_) {
            lines.add(error);
        }
    }

private:
    std::vector<std::string> errors_;
};

/// The kind that the last part of an error's name stands for; failed for one that is not known.
Problem::Kind kindNamed(const std::string& name);
/// What an error in place of an answer stands for: throws ServiceProblem, Failure or ServiceGone.
/// @return false for an error of a service that does not know the call
bool throwAnswer(const bus::Message& answer);

}  // namespace cvagent::remote
