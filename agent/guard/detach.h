#pragma once

#include <functional>

namespace cvagent::guard {

/// Runs the work in a process that nothing ties to the caller: another session, no terminal, no open file of
/// his, and one above it that runs it again when somebody kills it. Signals that end a session pass it by.
/// @return in the caller: 0, or an errno when it cannot be had
int runDetached(const std::function<int()>& work);

/// Has the kernel choose others when memory runs out.
void stayWhenMemoryIsShort();

}  // namespace cvagent::guard
