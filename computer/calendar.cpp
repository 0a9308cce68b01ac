#include "computer/calendar.h"

#include <algorithm>
#include <iterator>
#include <limits>
#include <string_view>

#include "mi/log.h"

namespace IC {

namespace {

constexpr int kFirstYear = 1900;  // of struct tm
constexpr time_t kNoTime = -1;

/// By month number; no month has the name at 0.
constexpr const char* kMonths[] = {"   ", "Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                   "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

/// 1 to 12, or 0 for a name that is no month's.
int monthNumber(const char* name) {
    if (name == nullptr) {
        return 0;
    }
    const auto* found = std::find(std::begin(kMonths) + 1, std::end(kMonths), std::string_view(name));
    return found == std::end(kMonths) ? 0 : static_cast<int>(found - std::begin(kMonths));
}

}  // namespace

time_t to_time_t(int year, const char* month, int day, int weekday, int hour, int minute, int second,
                 int isdst) {
    const LogScope scope;
    const int number = monthNumber(month);
    // A month that was not named has no right value to stand for it: the caller gets what mktime itself says
    // of a time that does not exist.
    if (number == 0 || year < std::numeric_limits<int>::min() + kFirstYear) {
        return kNoTime;
    }
    tm fields{};
    fields.tm_year = year - kFirstYear;
    fields.tm_mon = number - 1;
    fields.tm_mday = day;
    fields.tm_wday = weekday;
    fields.tm_hour = hour;
    fields.tm_min = minute;
    fields.tm_sec = second;
    fields.tm_isdst = isdst;
    return mktime(&fields);
}

time_t ito_time_t(int year, int month, int day, int weekday, int hour, int minute, int second, int isdst) {
    const LogScope scope;
    const bool known = month >= 0 && month < static_cast<int>(std::size(kMonths));
    return to_time_t(year, kMonths[known ? month : 0], day, weekday, hour, minute, second, isdst);
}

}  // namespace IC
