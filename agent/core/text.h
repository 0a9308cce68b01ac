#pragma once

#include <charconv>
#include <ctime>
#include <optional>
#include <string>

namespace cvagent {

/// Control characters, line and paragraph separators, and those that turn the direction of writing.
bool isControl(char32_t character);
/// The text with such characters, and bytes that are no UTF-8, spelt out, so that a name from the host
/// cannot steer the terminal.
std::string printable(const std::string& text);
/// The same, cut after some 60 characters, for messages that quote what was given.
std::string inQuotes(const std::string& text);
/// The number that is the whole of a text: decimal digits and, where the type has one, a minus. Nothing when
/// it is anything else or too large.
template <class Number>
std::optional<Number> wholeNumber(const std::string& text) {
    Number number{};
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end ? std::optional(number) : std::nullopt;
}

/// "2026-11-20T21:03:00Z"
std::string timeText(std::time_t time);

}  // namespace cvagent
