#include "framework/qx/date_time.h"

#include <chrono>
#include <ctime>
#include <limits>
#include <optional>
#include <stdexcept>
#include <string_view>

namespace QX {
namespace {

constexpr unsigned int kIso8601 = 3;

/// Reads a text from the left; what does not fit makes the whole text wrong.
class Reader {
public:
    explicit Reader(std::string_view text) : rest_(text) {}

    /// Exactly `digits` decimal digits.
    int number(int digits) {
        int value = 0;
        for (; digits > 0; --digits) {
            require(!rest_.empty() && rest_.front() >= '0' && rest_.front() <= '9');
            value = value * 10 + (rest_.front() - '0');
            rest_.remove_prefix(1);
        }
        return value;
    }
    bool take(char character) {
        if (rest_.empty() || rest_.front() != character) {
            return false;
        }
        rest_.remove_prefix(1);
        return true;
    }
    bool atEnd() const { return rest_.empty(); }
    static void require(bool holds) {
        if (!holds) {
            throw std::invalid_argument("not a time");
        }
    }

private:
    std::string_view rest_;
};

struct TimeOfDay {
    int hour = 0;
    int minute = 0;
    int second = 0;
    long long seconds() const { return (hour * 60LL + minute) * 60 + second; }
};

std::chrono::year_month_day readDate(Reader& reader) {
    const std::chrono::year year(reader.number(4));
    Reader::require(reader.take('-'));
    const std::chrono::month month(static_cast<unsigned int>(reader.number(2)));
    Reader::require(reader.take('-'));
    const std::chrono::day day(static_cast<unsigned int>(reader.number(2)));
    const std::chrono::year_month_day date(year, month, day);
    Reader::require(date.ok());
    return date;
}

TimeOfDay readTimeOfDay(Reader& reader) {
    TimeOfDay time;
    time.hour = reader.number(2);
    Reader::require(reader.take(':'));
    time.minute = reader.number(2);
    if (reader.take(':')) {
        time.second = reader.number(2);
    }
    Reader::require(time.hour < 24 && time.minute < 60 && time.second < 60);
    return time;
}

/// Seconds east of UTC; nothing for local time.
std::optional<long long> readOffset(Reader& reader) {
    if (reader.take('Z')) {
        return 0;
    }
    const bool west = reader.take('-');
    if (!west && !reader.take('+')) {
        return {};
    }
    TimeOfDay offset;
    offset.hour = reader.number(2);
    if (reader.take(':')) {
        offset.minute = reader.number(2);
    }
    Reader::require(offset.hour < 24 && offset.minute < 60);
    return west ? -offset.seconds() : offset.seconds();
}

long long localToUtc(const std::chrono::year_month_day& date, const TimeOfDay& time) {
    static_assert(sizeof(time_t) == sizeof(long long), "local times after January 2038 need 64 bits");
    tm local{};
    local.tm_year = static_cast<int>(date.year()) - 1900;
    local.tm_mon = static_cast<int>(static_cast<unsigned int>(date.month())) - 1;
    local.tm_mday = static_cast<int>(static_cast<unsigned int>(date.day()));
    local.tm_hour = time.hour;
    local.tm_min = time.minute;
    local.tm_sec = time.second;
    local.tm_isdst = -1;
    return mktime(&local);
}

long long parse(const std::string& text) {
    Reader reader(text);
    const auto date = readDate(reader);
    Reader::require(reader.take('T'));
    const TimeOfDay time = readTimeOfDay(reader);
    const auto offset = readOffset(reader);
    Reader::require(reader.atEnd());
    if (!offset) {
        return localToUtc(date, time);
    }
    const auto midnight = std::chrono::sys_days(date).time_since_epoch();
    return std::chrono::duration_cast<std::chrono::seconds>(midnight).count() + time.seconds() - *offset;
}

}  // namespace

DateTime::DateTime(const std::string& text, unsigned int format) : seconds_(0) {
    if (format != kIso8601) {
        throw std::invalid_argument("no such time format: " + std::to_string(format));
    }
    try {
        seconds_ = parse(text);
    } catch (const std::invalid_argument&) {
        throw std::invalid_argument("not an ISO 8601 time: \"" + text + "\"");
    }
}

DateTime::operator long() const {
    if (seconds_ < std::numeric_limits<long>::min() || seconds_ > std::numeric_limits<long>::max()) {
        throw std::out_of_range("time does not fit: " + std::to_string(seconds_) + " s");
    }
    return static_cast<long>(seconds_);
}

}  // namespace QX
