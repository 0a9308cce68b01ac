#pragma once

#include <string>
#include <vector>

#include "agent/change/plan.h"
#include "agent/cli/print.h"

namespace cvagent {

/// A plan for people: each file as a unified diff, the commands in their order, what the kernel holds
/// afterwards, and what nobody can foresee. Whatever comes from the host is spelt out where it is not
/// printable.
std::string planText(const change::Plan& plan, const Style& style);

}  // namespace cvagent
