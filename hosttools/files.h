#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace hosttools {

/// A whole file, as files of /proc, /sys and /run are read. @return nothing when it cannot be opened or read
std::optional<std::string> readFile(const std::string& path);
/// The first line of such a file without its newline; "" when there is none.
std::string readFirstLine(const std::string& path);
/// The decimal number that a file begins with. @return fallback when there is no such file or no number in it
std::uint64_t readNumber(const std::string& path, std::uint64_t fallback = 0);
/// Takes the number that a text begins with off its front, in base 10 or 16 (with or without "0x"). @return
/// nothing when there is none or it is too large
std::optional<std::uint64_t> takeNumber(std::string_view& text, int base = 10);
/// The same, whatever follows it.
std::optional<std::uint64_t> parseNumber(std::string_view text, int base = 10);
/// The names in a directory but for "." and "..", in no order; none when it cannot be read.
std::vector<std::string> listDirectory(const std::string& path);

/// Takes the next line off the front of text; the line comes without its newline.
std::string_view takeLine(std::string_view& text);
/// Takes the next word (blanks and tabs separate) off the front of text; empty when there is none left.
std::string_view takeWord(std::string_view& text);

}  // namespace hosttools
