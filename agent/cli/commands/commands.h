#pragma once

#include "agent/cli/failure.h"
#include "agent/cli/options.h"
#include "agent/cli/remote/service.h"
#include "agent/cli/session.h"

/// The commands. Each prints its answer to standard output and returns the exit status; Failure, Problem and
/// Interrupted are thrown for whatever ends a command early.
namespace cvagent::commands {

ExitStatus tree(Session& session, const Options& options);
ExitStatus get(Session& session, const Options& options);
ExitStatus set(Session& session, const Options& options);
ExitStatus watch(Session& session, const Options& options);
ExitStatus plan(Session& session, const Options& options);
ExitStatus apply(Session& session, const Options& options);
ExitStatus exportChanges(Session& session, const Options& options);
ExitStatus diff(Session& session, const Options& options);
/// doctor --verify
ExitStatus verifyTree(Session& session, const Options& options);
// These need no agent.
ExitStatus properties(const Options& options);
/// @param service as it was found with the caller's environment
ExitStatus doctor(const Options& options, const remote::ServiceReport& service);
ExitStatus history(const Options& options);
ExitStatus confirmChange(const Options& options);
ExitStatus rollback(const Options& options);
/// history --changes
ExitStatus listChanges(const Options& options);

}  // namespace cvagent::commands
