#pragma once

#include <optional>

#include "agent/cli/failure.h"
#include "agent/cli/options.h"
#include "agent/cli/session.h"

namespace cvagent {

/// A command that needs an agent.
using Question = ExitStatus (*)(Session& session, const Options& options);

/// What the process needs before it asks a service.
using Preparation = void (*)(Options& options);

/// Has the service answer. One that ends in the middle of an answer is mostly started again and is asked once
/// more, where the command only reads: an agent of this process would be in its way.
/// @param prepare null: nothing, and who asks leaves it to somebody else to tell why there is no service
/// @return nothing: there is no service, or none any more
std::optional<ExitStatus> askService(Question ask, Options& options, Preparation prepare);

}  // namespace cvagent
