#pragma once

#include "agent/cli/failure.h"
#include "agent/cli/options.h"

/// The commands. Each prints its answer to standard output and returns the exit status; Failure and
/// Interrupted are thrown for whatever ends a command early.
namespace cvagent::commands {

ExitStatus tree(const Options& options);
ExitStatus get(const Options& options);
ExitStatus set(const Options& options);
ExitStatus watch(const Options& options);
ExitStatus properties(const Options& options);
ExitStatus doctor(const Options& options);

}  // namespace cvagent::commands
