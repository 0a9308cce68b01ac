#pragma once

#include <string>

namespace cvagent::change {

/// What keeps the clock in step with other clocks: a program that is at work ("chronyd"), or "something" when
/// only the kernel tells that the clock is steered. "" when nobody is known to.
std::string clockSteeredBy();

}  // namespace cvagent::change
