#include "agent/cli/moment.h"

#include <algorithm>
#include <array>
#include <limits>
#include <stdexcept>

#include "agent/core/text.h"
#include "framework/qx/date_time.h"
#include "framework/qx/whole_number.h"

namespace cvagent {

namespace {

struct TimeUnit {
    char letter;
    std::int64_t seconds;
};

constexpr std::array kUnits = {TimeUnit{'s', 1}, TimeUnit{'m', 60}, TimeUnit{'h', 3600},
                               TimeUnit{'d', 86400}};

/// The nearest one that there is: 32 bits end in 2038.
std::time_t asTime(std::int64_t seconds) {
    using Limits = std::numeric_limits<std::time_t>;
    return static_cast<std::time_t>(std::clamp<std::int64_t>(seconds, Limits::min(), Limits::max()));
}

std::optional<std::time_t> longAgo(const std::string& text) {
    const auto* const unit =
        std::ranges::find_if(kUnits, [&text](const TimeUnit& each) { return text.ends_with(each.letter); });
    const auto count = QX::wholeNumber<std::uint32_t>(text.substr(0, text.empty() ? 0 : text.size() - 1));
    if (unit == kUnits.end() || !count) {
        return std::nullopt;
    }
    return asTime(std::time(nullptr) - *count * unit->seconds);
}

std::optional<std::time_t> timeNamed(const std::string& text) {
    const bool isDay = text.find('T') == std::string::npos;
    try {
        return asTime(QX::DateTime(isDay ? text + "T00:00:00" : text, 3).seconds());
    } catch (const std::invalid_argument&) {
        return std::nullopt;
    }
}

}  // namespace

std::optional<Moment> momentNamed(const std::string& text) {
    if (!text.empty() && text.find_first_not_of("0123456789") == std::string::npos) {
        const auto number = QX::wholeNumber<std::int64_t>(text);  // as the history counts
        return number ? std::optional(Moment{static_cast<std::uint64_t>(*number)}) : std::nullopt;
    }
    auto time = longAgo(text);
    if (!time) {
        time = timeNamed(text);
    }
    return time ? std::optional(Moment{std::nullopt, *time}) : std::nullopt;
}

std::optional<Event::Kind> kindNamed(const std::string& text) {
    for (std::size_t place = 0; place < kEventKinds; ++place) {
        const auto kind = static_cast<Event::Kind>(place);
        if (text == eventName(kind)) {
            return kind;
        }
    }
    return std::nullopt;
}

std::string problemOfMoment(const std::string& text) {
    return momentNamed(text)
               ? std::string()
               : inQuotes(text) +
                     " is no number, no time as 2026-11-20T21:03:00Z and not how long ago, as 2h";
}

std::string problemOfKind(const std::string& text) {
    return kindNamed(text) ? std::string()
                           : inQuotes(text) + " is none of: alert, changed, published, withdrawn, written";
}

}  // namespace cvagent
