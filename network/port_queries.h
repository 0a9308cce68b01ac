#pragma once

#include <string>

namespace IC {

// What a port can do, from `ethtool`. Asked once, when its node is made.

/// The first link mode the port supports, without the duplex: "1000baseT"; "" when the tool tells none.
std::string getSupportedLinkMode(const std::string& name);

struct WakeOnLan {
    bool supported = false;  ///< a "Supports Wake-on" line was printed
    bool enabled = false;    ///< another "Wake-on" line was printed
};
WakeOnLan getWakeOnLan(const std::string& name);

namespace parse {

/// What stands before the slash of "1000baseT/Full", line break cut.
std::string linkMode(const std::string& line);
/// 1000 of "1000baseT"; 0 for a mode that is no baseT.
unsigned int baseTSpeed(const std::string& mode);

}  // namespace parse
}  // namespace IC
