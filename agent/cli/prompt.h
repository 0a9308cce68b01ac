#pragma once

#include <string>

namespace cvagent {

/// Asks on the terminal whether the host is to be stopped. Throws Failure when the answer is no or when
/// nobody is there to ask, and Interrupted when a stop signal comes first.
/// @param what "restart" or "halt"
void confirm(const std::string& what);

}  // namespace cvagent
