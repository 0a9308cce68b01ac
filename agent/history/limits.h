#pragma once

#include <chrono>
#include <cstdint>
#include <ctime>
#include <string>

#include "agent/history/database.h"

namespace cvagent {

/// How much a history keeps. It is written in the file, so all who use the file keep to the same.
struct HistoryLimits {
    std::chrono::seconds age = std::chrono::hours(24 * 400);  ///< entries that are older go
    std::uint64_t bytes = std::uint64_t{64} << 20;            ///< of the file; the oldest entries go
};

HistoryLimits limitsOf(const Database& database);
/// One number that is kept under a name.
void setFactOf(const Database& database, const std::string& name, std::int64_t value);
void setLimitsOf(const Database& database, const HistoryLimits& limits);

/// Removes what is beyond the limits, the oldest first, in steps that hold up no other writer for long, and
/// gives the room back to the disk. Much is left for the next call. Throws HistoryError.
void trim(const Database& database, const HistoryLimits& limits, std::time_t now);

}  // namespace cvagent
