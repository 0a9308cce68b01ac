#pragma once

#include <atomic>
#include <string>
#include <vector>

#include "framework/ic/error.h"

namespace IC::OSHWMI_IND {

/// What sending an alert gives when nobody listens.
extern Error myerr;
/// Member ports of all bonds, as one pass of the network monitor finds them. The monitor thread's alone.
extern std::vector<std::string> slaves;
/// The interfaces of this pass about which a command was ended by force. The monitor thread's alone.
extern std::vector<std::string> untold;
/// Whether the last read of the state file found one.
extern std::atomic<bool> datFileAvailable;
/// The logger component of the indications.
extern std::string loggerOsHwMIInd;

}  // namespace IC::OSHWMI_IND
