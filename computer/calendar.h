#pragma once

#include <ctime>

namespace IC {

/// Seconds since 1970-01-01 UTC of a local time.
/// @param year    in full, 2026
/// @param month   "Jan" to "Dec", exactly so
/// @param day     of the month, from 1
/// @param weekday days since Sunday; the calendar decides, not this
/// @param isdst   1 when the time is daylight-saving time, 0 when not, negative when that is not known
/// @return -1 for any other month name, and for a time that a time_t of this platform cannot hold (on 32 bits
///         those from 2038-01-19 03:14:08 UTC on)
time_t to_time_t(int year, const char* month, int day, int weekday, int hour, int minute, int second,
                 int isdst);

/// The same with the month as a number, 1 to 12; -1 for any other.
time_t ito_time_t(int year, int month, int day, int weekday, int hour, int minute, int second, int isdst);

}  // namespace IC
