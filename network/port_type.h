#pragma once

namespace IC {

/// The code of a port-type text such as "1000Base-LX", compared without regard to case.
/// @return 0 for a text that stands for none
unsigned int getPortType(const char* text);

}  // namespace IC
