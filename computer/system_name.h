#pragma once

#include <string>

namespace IC {

/// Always the empty text, also when the kernel knows a name. The computer node does not use it: its host name
/// is property 108.
std::string getSystemName();

}  // namespace IC
