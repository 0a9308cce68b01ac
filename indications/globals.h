#pragma once

#include <atomic>
#include <string>

#include "framework/ic/error.h"
#include "mi/log.h"

namespace IC {

namespace OSHWMI_IND {

/// What sending an alert gives when nobody listens.
extern Error myerr;
/// Whether the last read of the state file found one.
extern std::atomic<bool> datFileAvailable;
/// The logger component of the indications.
extern std::string loggerOsHwMIInd;

}  // namespace OSHWMI_IND

extern const LogSource indicationsLogSource;  ///< "OsHwMIInd_ix86"

/// A log line of the indications; leave the last two arguments out.
inline LogLine logInd(int level, const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) {
    return {indicationsLogSource, level, Operation::nameOr(function), line};
}

}  // namespace IC
