#pragma once

#include <cstdint>
#include <string>

namespace cvagent::undo {

/// Milliseconds since the start of the host, those of its sleep among them; nobody can set this clock.
std::uint64_t bootMilliseconds();
/// Which start of the host this is; "" where nobody knows.
std::string bootId();

}  // namespace cvagent::undo
