#pragma once

#include <ctime>
#include <string>

namespace cvagent {

/// Control characters, line and paragraph separators, and those that turn the direction of writing.
bool isControl(char32_t character);
/// The text with such characters, and bytes that are no UTF-8, spelt out, so that a name from the host
/// cannot steer the terminal.
std::string printable(const std::string& text);
/// The same, cut after some 60 characters, for messages that quote what was given.
std::string inQuotes(const std::string& text);

/// "2026-11-20T21:03:00Z"
std::string timeText(std::time_t time);

}  // namespace cvagent
