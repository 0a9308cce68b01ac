#pragma once

#include <string>

#include "framework/export.h"

namespace QX {

/// A point in time with a resolution of one second.
class CORVISTA_API DateTime {
public:
    /// @param text   the time
    /// @param format 3: ISO 8601 ("2026-11-20T21:03:00Z", an offset as +05:30 or +05, or local time without
    /// one). Date and time stand in the extended form with four digits of year and a capital T; the seconds
    /// may be left out. Refused are what the clock cannot hold (a fraction, second 60, hour 24) and dates
    /// that do not exist. A local time that the switch to daylight saving skips or repeats means what mktime
    /// makes of it. Throws std::invalid_argument for a text that is no time, or another format.
    DateTime(const std::string& text, unsigned int format);

    /// Seconds since 1970-01-01 UTC. Throws std::out_of_range when a long of this platform cannot hold them.
    operator long() const;
    long long seconds() const { return seconds_; }

private:
    long long seconds_;
};

}  // namespace QX
