#pragma once

#include <string>

namespace IC {

// Operations on the host's own data that no node offers; ComputerBuilder::vpdUpdate stands beside them.

/// Writes the nine characters ABCDEFGHI of a host's firmware version as AB-CD.EF.GH-I.
/// @param ver_in       nine characters and the zero behind them: ten bytes are read
/// @param size_ver_in  must be 9
/// @param ver_out      receives 14 bytes, the final zero included, once the sizes have passed
/// @param size_ver_out at least 13. A buffer of exactly 13 passes too: the check counts characters, so
///                     whoever says 13 must have the fourteenth byte behind them
/// @return 0, or 1 when a size is wrong (nothing is written) or the text came out shorter or longer than 13
int formatHostFirmwareVersion(char* ver_in, unsigned int size_ver_in, char* ver_out, int size_ver_out);

/// Always the empty text, also when the kernel knows a name. The computer node does not use it: its host name
/// is property 108.
std::string getSystemName();

}  // namespace IC
