#pragma once

#include <string>
#include <string_view>

namespace IC {

/// The first line of `text` behind its leading `delim` characters; every newline from there to the end
/// becomes a NUL.
/// @return a pointer into `text`
char* strget(char* text, char delim);

/// Replaces `from` by `to`, beginning with the second character: callers keep a leading separator. Stops at
/// the end of the text, and right after a replacement by NUL.
/// @return `text`
char* strreplace(char* text, char from, char to);

/// `text` without the `unwanted` characters at its end.
std::string trimEnd(std::string text, char unwanted = '\n');
/// `text` without the `unwanted` characters at its start.
std::string trimStart(std::string text, char unwanted = ' ');

/// The decimal number at the start of a text as `strtol` reads it, with blanks and a sign before it; 0 when
/// there is none, the nearest there is for one that does not fit. Sizes that fdisk prints are no such
/// numbers: they are read as floating point.
/// @param rest receives what stands behind it: all of the text when there is no number
long long leadingDecimal(const std::string& text, std::string* rest = nullptr);

/// A number as "%d" prints it: what an int does not hold comes out negative, as the readers of these files
/// have always found it.
inline std::string signedDecimal(unsigned int number) {
    return std::to_string(static_cast<int>(number));
}

/// `text` with its control characters, and `also`, spelt out (\x1b): it stays on one line and steers nothing.
std::string printable(std::string_view text, char also = '\x7f');

inline bool contains(std::string_view text, std::string_view part) {
    return text.find(part) != std::string_view::npos;
}

}  // namespace IC
