#pragma once

#include <string>

namespace IC {

/// The logger component of the processor nodes.
extern std::string loggerOsHwMICpu;

}  // namespace IC
