#pragma once

#include <string>

#include "mi/log.h"

namespace IC {

/// The logger component of the processor nodes.
extern std::string loggerOsHwMICpu;
extern const LogSource processorsLogSource;  ///< "OsHwMICpu_ix86"

/// A log line of the processors; leave the last two arguments out.
inline LogLine logCpu(int level, const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) {
    return {processorsLogSource, level, Operation::nameOr(function), line};
}

}  // namespace IC
