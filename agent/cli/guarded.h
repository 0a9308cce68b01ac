#pragma once

#include <functional>

#include "agent/cli/failure.h"

namespace cvagent {

/// Tells what has gone wrong. @return what the program ends with
ExitStatus endWith(const Failure& failure);

/// Runs a command. What it throws is told and is the status; at a stop signal the process ends by it.
ExitStatus guarded(const std::function<ExitStatus()>& command);

}  // namespace cvagent
