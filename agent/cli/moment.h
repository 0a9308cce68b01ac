#pragma once

#include <cstdint>
#include <ctime>
#include <optional>
#include <string>

#include "agent/core/event.h"

namespace cvagent {

/// A place in the history as people name it: by the number of an event or by a time.
struct Moment {
    std::optional<std::uint64_t> number;
    std::time_t time = 0;  ///< where there is no number
};

/// "57", "2026-11-20" (its beginning, local time), "2026-11-20T21:03:00Z" and the like, "90s", "30m", "2h" or
/// "7d" ago. Nothing for any other text.
std::optional<Moment> momentNamed(const std::string& text);
/// Nothing for a word that names none.
std::optional<Event::Kind> kindNamed(const std::string& text);

// Why a word of the command line is none of these; "" when it is one.

std::string problemOfMoment(const std::string& text);
std::string problemOfKind(const std::string& text);

}  // namespace cvagent
